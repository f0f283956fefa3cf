// The part of the file that is taken is mapped, and every position is checked against its size.
#include "account_file.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <unordered_set>

#include <sys/mman.h>
#include <unistd.h>

namespace recorder {
namespace {

std::uint64_t Value(const Counter& counter) { return counter.load(std::memory_order_relaxed); }

// Rows that are valid, but no more than fit.
// Pairs with the library's stores of counts, which follow those of the rows.
template <class Table>
std::uint64_t CountOf(const Table& table) {
    return std::min<std::uint64_t>(table.count.load(std::memory_order_acquire),
                                   Table::kRows);  // pairs with its release
}

std::uint64_t Difference(std::uint64_t large, std::uint64_t small) {
    return large > small ? large - small : 0;
}

}  // namespace

AccountFile::AccountFile() {
    mnDescriptor = memfd_create("zanbase-record", MFD_CLOEXEC);
    if (mnDescriptor < 0 || ftruncate(mnDescriptor, static_cast<off_t>(kFileBytes)) != 0)
        throw std::runtime_error(std::string("cannot make a file in memory: ") + std::strerror(errno));
    mnBytes = (sizeof(Control) + kPageBytes - 1) / kPageBytes * kPageBytes;
    void* const image = mmap(nullptr, mnBytes, PROT_READ | PROT_WRITE, MAP_SHARED, mnDescriptor, 0);
    if (image == MAP_FAILED)
        throw std::runtime_error(std::string("cannot map a file: ") + std::strerror(errno));
    mpcImage = static_cast<char*>(image);
    control().magic = kMagic;
    control().end = mnBytes;
}

AccountFile::~AccountFile() {
    if (mnDescriptor < 0) return;
    munmap(mpcImage, mnBytes);
    close(mnDescriptor);
}

void AccountFile::Refresh() {
    const std::uint64_t taken = mnBytes < sizeof(Control) ? 0 : std::min(Value(control().end), kFileBytes);
    if (mnDescriptor < 0 || taken <= mnBytes) return;
    void* const image = mremap(mpcImage, mnBytes, taken, MREMAP_MAYMOVE);
    if (image == MAP_FAILED) return;
    mpcImage = static_cast<char*>(image);
    mnBytes = taken;
}

template <class Object>
Object* AccountFile::At(Position position, std::uint64_t count) {
    if (position == 0 || position % alignof(Object) != 0 || position > mnBytes ||
        count > (mnBytes - position) / sizeof(Object))
        return nullptr;
    return reinterpret_cast<Object*>(mpcImage + position);
}

template <class Table>
typename Table::Row* AccountFile::RowOf(const Table& table, std::uint64_t row) {
    using Row = typename Table::Row;
    if (row >= Table::kRows) return nullptr;
    // Pairs with the library's Make.
    const Position chunk = table.chunks[row / Table::kChunkRows].load(std::memory_order_acquire);
    Row* const rows = At<Row>(chunk, Table::kChunkRows);
    return rows == nullptr ? nullptr : &rows[row % Table::kChunkRows];
}

std::string AccountFile::TextAt(const TextPlace& place) {
    const char* const text = At<const char>(place.position, place.bytes);
    return text == nullptr ? std::string() : std::string(text, place.bytes);
}

std::vector<Position> AccountFile::Accounts() {
    std::vector<Position> positions;
    std::unordered_set<Position> seen;
    Refresh();
    if (mnBytes < sizeof(Control)) return positions;
    // Pairs with the library's AddAccount.
    Position position = control().newest.load(std::memory_order_acquire);
    for (const Account* account = nullptr;
         (account = At<Account>(position)) != nullptr && seen.insert(position).second;) {
        positions.push_back(position);
        position = account->previous;
    }
    std::reverse(positions.begin(), positions.end());
    return positions;
}

void AccountFile::ReadStacks(Position position, ProcessAccount& account) {
    Refresh();
    Account* const from = At<Account>(position);
    if (from == nullptr) return;
    account.process = from->process;
    // In this order: a node refers to an address that was added before, and that to a module.
    const std::uint64_t nodes = CountOf(from->nodes);
    const std::uint64_t addresses = CountOf(from->addresses);
    const std::uint64_t modules = CountOf(from->modules);
    for (std::uint64_t i = account.modules.size(); i < modules; ++i) {
        const ModuleRow* const row = RowOf(from->modules, i);
        account.modules.emplace_back();
        if (row == nullptr) continue;
        const auto* const id = reinterpret_cast<const char*>(row->build_id.data());
        account.modules.back() = {
            row->start, row->bias, TextAt(row->path),
            std::string(id, std::min<std::size_t>(row->build_id_bytes, row->build_id.size()))};
    }
    for (std::uint64_t i = account.addresses.size(); i < addresses; ++i) {
        const AddressRow* const row = RowOf(from->addresses, i);
        account.addresses.emplace_back();
        if (row != nullptr) account.addresses.back() = {row->offset, row->module < modules ? row->module : 0};
    }
    for (std::uint64_t i = account.nodes.size(); i < nodes; ++i) {
        const NodeRow* const row = RowOf(from->nodes, i);
        account.nodes.emplace_back();
        if (row != nullptr && row->parent < i && row->address < addresses)
            account.nodes.back() = {row->parent, row->address};
    }
}

void AccountFile::ReadUsage(const Account& from, ProcessAccount& account) {
    const std::uint64_t stamp = Value(from.stamp);
    std::vector<StackUsage> sums(std::max<std::size_t>(account.nodes.size(), 1));
    for (const auto& shard : from.usage) {
        for (std::size_t node = 0; node < sums.size(); ++node) {
            const UsageCounters* const row = RowOf(shard, node);
            if (row == nullptr) {  // nor are the others of its chunk
                node |= shard.kChunkRows - 1;
                continue;
            }
            // Frees first: those of a block that is allocated meanwhile are then not seen without it.
            StackUsage& sum = sums[node];
            sum.frees += row->frees.load(std::memory_order_acquire);
            const std::uint64_t freed = row->freed.load(std::memory_order_acquire);
            const std::uint64_t allocated = Value(row->allocated);
            sum.freed += freed;
            sum.allocated += allocated;
            sum.allocations += Value(row->allocations);
            sum.temporary += Value(row->temporary);
            sum.at_peak += Value(row->stamp) == stamp ? Value(row->at_peak) : Difference(allocated, freed);
        }
    }
    account.usage.clear();
    for (std::size_t node = 0; node < sums.size(); ++node) {
        sums[node].node = static_cast<NodeId>(node);
        if (sums[node].allocations != 0) account.usage.push_back(sums[node]);
    }
}

void AccountFile::ReadFiles(const Account& from, ProcessAccount& account) {
    const std::uint64_t count = CountOf(from.files);
    account.files.clear();
    for (std::uint64_t i = 0; i < count; ++i) {
        const FileRow* const row = RowOf(from.files, i);
        if (row == nullptr) continue;
        account.files.push_back({TextAt(row->name), {}});
        for (std::size_t kind = 0; kind < kDiskOperations; ++kind) {
            const OperationCounters& counters = row->counters[kind];
            account.files.back().sums[kind] = {Value(counters.count), Value(counters.nanoseconds),
                                               Value(counters.bytes)};
        }
    }
}

void AccountFile::Read(Position position, ProcessAccount& account) {
    ReadStacks(position, account);
    const Account* const from = At<Account>(position);
    if (from == nullptr) return;
    account.parent = from->parent;
    account.started = from->started;
    account.end = from->end.load(std::memory_order_acquire);
    account.ended = from->ended;
    account.status = from->status;
    account.streams_unseen = from->streams_unseen != 0;
    account.arguments.clear();
    const std::size_t bytes =
        std::min<std::size_t>(from->argument_bytes.load(std::memory_order_acquire), from->arguments.size());
    for (std::size_t at = 0; at < bytes;) {
        const std::size_t length = strnlen(from->arguments.data() + at, bytes - at);
        account.arguments.emplace_back(from->arguments.data() + at, length);
        at += length + 1;
    }
    account.total = Value(from->total);
    account.peak = Value(from->peak);
    account.lost_blocks = Value(from->lost_blocks);
    account.lost_files = Value(from->lost_files);
    ReadUsage(*from, account);
    ReadFiles(*from, account);
}

void AccountFile::MarkStop(Position position, NodeId node) {
    Account* const account = At<Account>(position);
    NodeRow* const row = account == nullptr ? nullptr : RowOf(account->nodes, node);
    if (row != nullptr) row->rule.fetch_or(kStop, std::memory_order_relaxed);
}

}  // namespace recorder

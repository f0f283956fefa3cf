// The layout of what the preload library counts: one file in memory, which the library and the command both
// map.
//
// The file begins with a Control; each recorded process takes an Account and the pages of its tables from the
// rest. Positions are offsets in the file, 0 for none. Rows never move, and a row is written before the count
// that makes it valid (release; the reader loads the count with acquire). So a reader finds whole rows only,
// also when the process was killed between any two instructions. Everything in the file may be wrong: the
// program could have written there.
#ifndef ZANBASE_RECORD_ACCOUNT_H
#define ZANBASE_RECORD_ACCOUNT_H

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>

namespace recorder {

using Position = std::uint64_t;
using Counter = std::atomic<std::uint64_t>;
static_assert(Counter::is_always_lock_free, "counters are shared between processes");

constexpr std::uint64_t kMagic = 0x326472637a6e617a;          // "zanzcrd2", changed with the layout
constexpr std::uint64_t kFileBytes = std::uint64_t{1} << 40;  // sparse; memory is taken as it is written
constexpr std::size_t kPageBytes = 4096;

// The names of the variables of the environment that bring the library into a process and lead it to the
// file.
constexpr char kPreloadVariable[] = "LD_PRELOAD";
constexpr char kFileVariable[] = "ZANBASE_RECORD";  // descriptor, inode

// Bits of what is recorded.
constexpr std::uint32_t kMemory = 1;
constexpr std::uint32_t kDisk = 2;
constexpr std::uint32_t kFollow = 4;

// A text in the file.
struct TextPlace {
    Position position;
    std::uint64_t bytes;
};

// What the command passes to the library, and where the accounts are.
struct Control {
    std::uint64_t magic;
    std::uint32_t wanted;            // bits, as above
    std::uint32_t callers;           // frames that are recorded beyond the one that is credited
    std::int32_t process;            // the one to record, unless others are followed
    std::int32_t command;            // the command's own process
    std::int32_t file;               // the command's descriptor of this file
    Counter end;                     // bytes of the file that are taken
    std::atomic<Position> newest;    // the account that was added last; each leads to the one before it
    std::array<char, 4096> library;  // of the environment: LD_PRELOAD with the recorder
    std::array<char, 4096> other_preloads;  // and without it; empty for none
};

// Rows of one kind, in chunks that are taken when they are needed.
template <class RowType, std::size_t kRowsOfChunk, std::size_t kChunkLimit>
struct Table {
    using Row = RowType;
    static constexpr std::size_t kChunkRows = kRowsOfChunk;
    static constexpr std::size_t kChunks = kChunkLimit;
    static constexpr std::size_t kRows = kRowsOfChunk * kChunkLimit;

    Counter count;  // rows that are valid
    std::array<std::atomic<Position>, kChunkLimit> chunks;
};

// A file that is mapped as code.
struct ModuleRow {
    std::uint64_t start;
    std::uint64_t end;
    std::uint64_t bias;  // an address in memory less that in the file
    TextPlace path;      // absolute in the program's own root
    std::uint32_t build_id_bytes;
    std::array<std::uint8_t, 36> build_id;
};

// A return address.
struct AddressRow {
    std::uint64_t offset;  // in the module's file, or in memory if it is in none
    std::uint32_t module;  // 0 for none
    std::uint32_t padding;
    std::uint64_t rule;  // the step to the caller; see frame_rule.h
};

// A stack: the frames of `parent`, which are nearer to the allocator, and then `address`. Row 0 is the empty
// stack, and a parent's number is below that of its children.
struct NodeRow {
    std::uint32_t parent;
    std::uint32_t address;
    std::atomic<std::uint64_t> rule;  // that of the address; the command sets kStop in it
};

// In a node's rule: its last frame is the one that is credited, so that the walk of a stack can end here.
constexpr std::uint64_t kStop = 4;

// What the allocations of one stack came to, as seen by one shard of the memory account. A thread that
// changes it holds the shard's lock. Live bytes at the peak are `at_peak` if `stamp` is the account's, else
// those that are live now.
struct alignas(64) UsageCounters {
    Counter allocations;
    Counter allocated;  // bytes
    Counter frees;
    Counter freed;      // bytes
    Counter temporary;  // blocks that were freed before their thread allocated again
    Counter at_peak;
    Counter stamp;
};

enum class DiskOperation { kOpen, kClose, kSeek, kRead, kWrite };
constexpr std::size_t kDiskOperations = 5;

// Every addition is atomic: programs may read and write in a signal handler.
struct OperationCounters {
    Counter count;
    Counter nanoseconds;
    Counter bytes;
};

struct FileRow {
    TextPlace name;
    std::array<OperationCounters, kDiskOperations> counters;
};

// How a process ended, as far as the library saw it.
enum class End : std::uint32_t { kNone, kExited, kReplaced };

constexpr std::size_t kShards = 64;

// One process, or what a process did before another program took its place.
struct Account {
    Position previous;  // the account that was added before this one
    std::int32_t process;
    std::int32_t parent;
    std::int64_t started;             // nanoseconds since 1970
    std::atomic<std::int64_t> ended;  // the same; 0 while it runs and if the end was not seen
    std::atomic<End> end;
    std::atomic<std::int32_t> status;
    std::atomic<std::uint32_t> streams_unseen;  // the C library's streams can't be recorded
    std::atomic<std::uint32_t> argument_bytes;  // valid once not 0
    std::array<char, 4096> arguments;           // each ends with a 0; cut if they are longer

    alignas(128) Counter total;        // live bytes
    Counter peak;                      // the highest total
    Counter stamp;                     // counts how often there was a higher total than ever before
    alignas(128) Counter lost_blocks;  // not recorded, because memory ran out
    Counter lost_files;

    Table<ModuleRow, 64, 64> modules;
    Table<AddressRow, 2048, 512> addresses;
    Table<NodeRow, 2048, 2048> nodes;
    Table<FileRow, 128, 32768> files;
    std::array<Table<UsageCounters, 1024, 4096>, kShards> usage;  // by node; counts are not used
};

using NodeId = std::uint32_t;
constexpr unsigned int kNodeBits = 22;
static_assert(decltype(Account::nodes)::kRows == std::size_t{1} << kNodeBits);
static_assert(decltype(Account::usage)::value_type::kRows == decltype(Account::nodes)::kRows);

}  // namespace recorder

#endif

// Stacks as a tree whose root is the allocator: a stack is that of its frames but the last, and an address.
// One table holds the steps from a stack and an address to the longer stack, and also the addresses
// themselves.
//
// The table is read without a lock: open hashing with linear probing, where a slot's step is written before
// its address, and never changes. What a full table holds is copied to a larger one; the old one stays, since
// a reader may still be in it.
#include "stack_nodes.h"

#include <cstring>

#include <dlfcn.h>
#include <elf.h>
#include <fcntl.h>
#include <link.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "frame_rule.h"
#include "recording.h"
#include "shared_memory.h"
#include "spin_lock.h"
#include "unwind.h"

namespace recorder {
namespace {

constexpr unsigned int kDeepestWalk = 64;
constexpr unsigned int kFirstBits = 11;
constexpr std::uintptr_t kRetired = 1;     // the address of a slot that leads nowhere any more
constexpr std::uint32_t kAddresses = ~0U;  // in place of a stack: the step leads to the address's number

struct Slot {
    std::atomic<std::uintptr_t> pc;   // 0 for none; its release store pairs with the acquire load in FindStep
    std::atomic<std::uint64_t> step;  // the stack in the high half, what the step leads to in the low one
};

struct StepTable {
    unsigned int bits;  // of the number of slots
    std::size_t count;  // of slots that are used
    Slot* slots;        // behind the table
};

// Guards everything here that is written, but for the slots, which are read without it.
SpinLock gLock;
std::atomic<StepTable*> gSteps{nullptr};
TableRows<decltype(Account::modules)> gModules;
TableRows<decltype(Account::addresses)> gAddresses;
TableRows<decltype(Account::nodes)> gNodes;

std::array<char, 4096> gProgramPath{};

// Beside each module's row, what shows whether it is still loaded.
struct LoadedModule {
    const void* link_map;  // null if it is not
    std::uintptr_t start;
    std::uintptr_t end;
};
std::array<LoadedModule, decltype(Account::modules)::kRows> gLoaded{};

std::size_t HomeOf(const StepTable& table, std::uint32_t from, std::uintptr_t pc) {
    return (pc ^ std::uint64_t{from} << 40 ^ from) * 0x9e3779b97f4a7c15 >> (64 - table.bits);
}
std::size_t MaskOf(const StepTable& table) { return (std::size_t{1} << table.bits) - 1; }

// What the step leads to; 0 if it was not made yet.
std::uint32_t FindStep(std::uint32_t from, std::uintptr_t pc) {
    // The loads pair with the stores of the table and, in Put, of a step's pc.
    const StepTable* const table = gSteps.load(std::memory_order_acquire);
    if (table == nullptr) return 0;
    for (std::size_t slot = HomeOf(*table, from, pc);; slot = (slot + 1) & MaskOf(*table)) {
        const std::uintptr_t found = table->slots[slot].pc.load(std::memory_order_acquire);
        if (found == 0) return 0;
        const std::uint64_t step = table->slots[slot].step.load(std::memory_order_relaxed);
        if (found == pc && step >> 32 == from) return static_cast<std::uint32_t>(step);
    }
}

void Put(StepTable& table, std::uintptr_t pc, std::uint64_t step) {
    std::size_t slot = HomeOf(table, static_cast<std::uint32_t>(step >> 32), pc);
    while (table.slots[slot].pc.load(std::memory_order_relaxed) != 0) slot = (slot + 1) & MaskOf(table);
    table.slots[slot].step.store(step, std::memory_order_relaxed);
    table.slots[slot].pc.store(pc, std::memory_order_release);  // pairs with FindStep
    ++table.count;
}

// A table with room for another step, or null if memory ran out.
StepTable* TableWithRoom() {
    StepTable* const old = gSteps.load(std::memory_order_relaxed);
    if (old != nullptr && old->count < (MaskOf(*old) + 1) / 2) return old;
    const unsigned int bits = old == nullptr ? kFirstBits : old->bits + 1;
    auto* const table = static_cast<StepTable*>(MapPages(sizeof(StepTable) + (sizeof(Slot) << bits)));
    if (table == nullptr) return nullptr;
    table->bits = bits;
    table->slots = reinterpret_cast<Slot*>(table + 1);
    for (std::size_t slot = 0; old != nullptr && slot <= MaskOf(*old); ++slot) {
        const std::uintptr_t pc = old->slots[slot].pc.load(std::memory_order_relaxed);
        if (pc > kRetired) Put(*table, pc, old->slots[slot].step.load(std::memory_order_relaxed));
    }
    gSteps.store(table, std::memory_order_release);  // pairs with FindStep
    return table;
}

std::uint32_t PutStep(std::uint32_t from, std::uintptr_t pc, std::uint64_t to) {
    StepTable* const table = TableWithRoom();
    if (table == nullptr) return 0;
    Put(*table, pc, std::uint64_t{from} << 32 | to);
    return static_cast<std::uint32_t>(to);
}

// The absolute path of a module, which the loader knows as the program named it; the program itself has no
// name there.
TextPlace KeepPath(const char* name) {
    if (name[0] == 0) name = gProgramPath.data();
    const std::size_t bytes = std::strlen(name);
    if (name[0] == '/' || gIsConfined) return KeepText(name, bytes);
    std::array<char, 8192> path{};
    const long folder = syscall(SYS_getcwd, path.data(), path.size() / 2);  // with the zero at its end
    if (folder <= 0 || bytes > path.size() / 2) return {};
    path[static_cast<std::size_t>(folder) - 1] = '/';
    std::memcpy(path.data() + folder, name, bytes);
    return KeepText(path.data(), static_cast<std::size_t>(folder) + bytes);
}

// The number that the linker gave the file, from the notes in memory.
void ReadBuildId(std::uintptr_t image, std::uintptr_t bias, ModuleRow& module) {
    Elf64_Ehdr header;
    std::memcpy(&header, reinterpret_cast<const void*>(image), sizeof header);
    if (std::memcmp(header.e_ident, ELFMAG, SELFMAG) != 0 ||
        header.e_phoff + header.e_phnum * sizeof(Elf64_Phdr) > kPageBytes)
        return;
    for (unsigned int i = 0; i < header.e_phnum; ++i) {
        Elf64_Phdr segment;
        std::memcpy(&segment, reinterpret_cast<const void*>(image + header.e_phoff + i * sizeof segment),
                    sizeof segment);
        if (segment.p_type != PT_NOTE) continue;
        for (std::uint64_t at = 0; at + sizeof(Elf64_Nhdr) <= segment.p_memsz;) {
            Elf64_Nhdr note;
            const auto* const place = reinterpret_cast<const char*>(bias + segment.p_vaddr + at);
            std::memcpy(&note, place, sizeof note);
            const std::uint64_t name_bytes = (note.n_namesz + 3U) & ~3U;
            if (note.n_type == NT_GNU_BUILD_ID && note.n_namesz == 4 &&
                note.n_descsz <= module.build_id.size()) {
                std::memcpy(module.build_id.data(), place + sizeof note + name_bytes, note.n_descsz);
                module.build_id_bytes = note.n_descsz;
                return;
            }
            at += sizeof note + name_bytes + ((note.n_descsz + 3U) & ~3U);
        }
    }
}

// The number of the module that `found` describes, or 0 if there is no room for it.
std::uint32_t ModuleOf(Account& account, const dl_find_object& found) {
    const auto start = reinterpret_cast<std::uintptr_t>(found.dlfo_map_start);
    const std::uint64_t count = account.modules.count.load(std::memory_order_relaxed);
    for (std::uint64_t i = 1; i < count; ++i)
        if (gLoaded[i].link_map == found.dlfo_link_map && gLoaded[i].start == start)
            return static_cast<std::uint32_t>(i);
    const std::uint64_t number = count == 0 ? 1 : count;
    ModuleRow* const module = gModules.Make(account.modules, number);
    if (module == nullptr) return 0;
    module->start = start;
    module->end = reinterpret_cast<std::uintptr_t>(found.dlfo_map_end);
    module->bias = found.dlfo_link_map->l_addr;
    module->path = KeepPath(found.dlfo_link_map->l_name);
    ReadBuildId(start, module->bias, *module);
    gLoaded[number] = {found.dlfo_link_map, start, module->end};
    account.modules.count.store(number + 1, std::memory_order_release);  // pairs with the command's CountOf
    return static_cast<std::uint32_t>(number);
}

// The number of an address, whose row is made if need be; 0 if there is no room for it. A return address is
// that of the next instruction, which may belong to the next function.
std::uint32_t AddressOf(Account& account, std::uintptr_t pc) {
    const std::uint32_t known = FindStep(kAddresses, pc);
    if (known != 0) return known;
    const std::uint64_t count = account.addresses.count.load(std::memory_order_relaxed);
    const std::uint64_t number = count == 0 ? 1 : count;
    AddressRow* const address = gAddresses.Make(account.addresses, number);
    if (address == nullptr) return 0;
    dl_find_object found{};
    *address = {pc, 0, 0, 0};
    if (_dl_find_object(reinterpret_cast<void*>(pc - 1), &found) == 0) {
        address->module = ModuleOf(account, found);
        address->offset = pc - found.dlfo_link_map->l_addr;
        if (found.dlfo_eh_frame != nullptr) address->rule = PackRule(RuleAt(pc - 1, found.dlfo_eh_frame));
    }
    account.addresses.count.store(number + 1, std::memory_order_release);  // pairs with the command's CountOf
    return PutStep(kAddresses, pc, number);
}

NodeId MakeNode(Account& account, NodeId parent, std::uintptr_t pc) {
    const SpinLockScope lock(gLock);
    const std::uint32_t made = FindStep(parent, pc);  // by another thread meanwhile
    if (made != 0) return made;
    const std::uint32_t address = AddressOf(account, pc);
    const std::uint64_t count = account.nodes.count.load(std::memory_order_relaxed);
    const std::uint64_t number = count == 0 ? 1 : count;
    const AddressRow* const row = address == 0 ? nullptr : gAddresses.Find(address);
    NodeRow* const node = row == nullptr ? nullptr : gNodes.Make(account.nodes, number);
    if (node == nullptr) return 0;
    node->parent = parent;
    node->address = address;
    node->rule.store(row->rule, std::memory_order_relaxed);
    account.nodes.count.store(number + 1, std::memory_order_release);  // pairs with the command's CountOf
    return PutStep(parent, pc, number);
}

bool IsLoaded(const LoadedModule& module) {
    dl_find_object found{};
    return _dl_find_object(reinterpret_cast<void*>(module.start), &found) == 0 &&
           found.dlfo_link_map == module.link_map &&
           found.dlfo_map_start == reinterpret_cast<void*>(module.start);
}

}  // namespace

void KeepProgramPath() {
    const long length =
        syscall(SYS_readlinkat, AT_FDCWD, "/proc/self/exe", gProgramPath.data(), gProgramPath.size() - 1);
    if (length <= 0) gProgramPath[0] = 0;
}

NodeId NodeOfCaller(Account& account, const Frame& caller, unsigned int callers) {
    NodeId node = 0;
    Frame frame = caller;
    for (unsigned int left = kDeepestWalk; left > 0 && frame.pc > kRetired; --left) {
        NodeId next = FindStep(node, frame.pc);
        if (next == 0) next = MakeNode(account, node, frame.pc);
        if (next == 0) break;
        node = next;
        const PackedRule rule = gNodes.Find(node)->rule.load(std::memory_order_relaxed);
        if ((rule & kStop) != 0 && left > callers + 1) left = callers + 1;
        if ((rule & kLeadsOn) == 0 || left == 1) break;
        frame = CallerOf(frame, rule);
    }
    return node;
}

void RetireUnmappedModules(Account& account) {
    const SpinLockScope lock(gLock);
    StepTable* const table = gSteps.load(std::memory_order_relaxed);
    const std::uint64_t count = account.modules.count.load(std::memory_order_relaxed);
    for (std::uint64_t i = 1; table != nullptr && i < count; ++i) {
        LoadedModule& module = gLoaded[i];
        if (module.link_map == nullptr || IsLoaded(module)) continue;
        module.link_map = nullptr;
        for (std::size_t slot = 0; slot <= MaskOf(*table); ++slot) {
            std::atomic<std::uintptr_t>& pc = table->slots[slot].pc;
            if (pc > module.start && pc <= module.end) pc = kRetired;
        }
    }
}

void ResetNodes(const Account& parent) {
    gModules.Reset(parent.modules.count);
    gAddresses.Reset(parent.addresses.count);
    gNodes.Reset(parent.nodes.count);
    gLoaded.fill({});
    gSteps = nullptr;  // not copied to the child
    gLock.Release();
}

}  // namespace recorder

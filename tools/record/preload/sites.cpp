// Call sites. Every return address is looked at once, under a lock; its answer goes to a table that is read
// without one. The answer is a site, or the rule that leads to the caller's frame, or that the climb ends.
#include "sites.h"

#include <array>
#include <atomic>
#include <unordered_map>
#include <unordered_set>

#include "frame_rule.h"
#include "modules.h"
#include "names.h"
#include "pool.h"
#include "source_lines.h"
#include "spin_lock.h"

namespace recorder {
namespace {

// The lock guards everything here but the reading of answers; it is held while files are read.
SpinLock gLock;
bool gReadsModules = false;

// An answer in one word: a tag in the low bits, and above it a site's number or a packed rule.
constexpr std::uint64_t kSiteTag = 1;
constexpr std::uint64_t kRuleTag = 2;
constexpr std::uint64_t kEndTag = 3;
constexpr std::uint64_t kTagMask = 3;

std::uint64_t PackRule(const FrameRule& rule) {
    constexpr std::int32_t kLimit = 1 << 28;
    if (!rule.known || rule.cfa_offset < 0 || rule.cfa_offset >= kLimit || rule.frame_pointer_offset > 0 ||
        rule.frame_pointer_offset <= -kLimit)
        return kEndTag;
    return kRuleTag | (rule.from_frame_pointer ? 4U : 0U) | (rule.saves_frame_pointer ? 8U : 0U) |
           static_cast<std::uint64_t>(rule.cfa_offset) << 4 |
           static_cast<std::uint64_t>(-rule.frame_pointer_offset) << 36;
}

FrameRule UnpackRule(std::uint64_t answer) {
    constexpr std::uint64_t kOffsetMask = 0xfffffff;
    return {true, (answer & 4) != 0, (answer & 8) != 0, static_cast<std::int32_t>(answer >> 4 & kOffsetMask),
            -static_cast<std::int32_t>(answer >> 36)};
}

// The answers by return address. Readers take no lock: a slot's answer is written before its key, and a key
// is never replaced by another one. A full table is replaced; the old one stays, since a reader may still be
// in it.
struct Slot {
    std::atomic<std::uintptr_t> key;
    std::atomic<std::uint64_t> answer;
};

struct AnswerTable {
    unsigned int bits;
    std::size_t count;
    Slot* slots;
};

constexpr std::uintptr_t kRetiredKey = 1;  // no return address; matches nothing
constexpr std::uintptr_t kEndOfClimb = std::uintptr_t{1}
                                       << 63;  // added to a caller that no climb leads away from
std::array<Slot, 1024> gFirstSlots;
AnswerTable gFirstTable{10, 0, gFirstSlots.data()};
std::atomic<AnswerTable*> gAnswers{&gFirstTable};

Slot& SlotOf(const AnswerTable& table, std::uintptr_t key) {
    constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;
    const std::size_t mask = (std::size_t{1} << table.bits) - 1;
    for (std::size_t slot = key * kGoldenRatio >> (64 - table.bits);; slot = (slot + 1) & mask) {
        const std::uintptr_t found = table.slots[slot].key.load(std::memory_order_acquire);
        if (found == key || found == 0) return table.slots[slot];
    }
}

// 0 if there is none.
std::uint64_t AnswerFor(std::uintptr_t key) {
    const Slot& slot = SlotOf(*gAnswers.load(std::memory_order_acquire), key);
    return slot.key.load(std::memory_order_acquire) == key ? slot.answer.load(std::memory_order_relaxed) : 0;
}

void Put(AnswerTable& table, std::uintptr_t key, std::uint64_t answer) {
    Slot& slot = SlotOf(table, key);
    slot.answer.store(answer, std::memory_order_relaxed);
    slot.key.store(key, std::memory_order_release);
    ++table.count;
}

bool GrowAnswers() {
    const AnswerTable& old = *gAnswers;
    const std::size_t slots = std::size_t{1} << old.bits;
    auto* const table = static_cast<AnswerTable*>(TakeFromPool(sizeof(AnswerTable)));
    auto* const fresh = static_cast<Slot*>(MapPages(2 * slots * sizeof(Slot)));
    if (table == nullptr || fresh == nullptr) return false;
    *table = {old.bits + 1, 0, fresh};
    for (std::size_t i = 0; i < slots; ++i)
        if (old.slots[i].key > kRetiredKey) Put(*table, old.slots[i].key, old.slots[i].answer);
    gAnswers.store(table, std::memory_order_release);
    return true;
}

// An answer that finds no room is worked out again the next time.
void Remember(std::uintptr_t key, std::uint64_t answer) {
    const AnswerTable& table = *gAnswers;
    if (table.count < (std::size_t{1} << table.bits) / 2 || GrowAnswers()) Put(*gAnswers, key, answer);
}

struct Site {
    std::uintptr_t pc;
    const Module* module;  // null if it was not looked for, or if the address is in none
    const char* file;      // null as long as the site is just an address
    int line;
};

// Made at first use and never destroyed.
std::vector<Site>& Sites() {
    static auto* const sites = new std::vector<Site>;
    return *sites;
}

const char* Intern(std::string text) {
    static auto* const texts = new std::unordered_set<std::string>;
    return texts->insert(std::move(text)).first->c_str();
}

// Sites beyond the largest number share it.
SiteId AddSite(const Site& site) {
    if (Sites().size() < kSites) Sites().push_back(site);
    return static_cast<SiteId>(Sites().size() - 1);
}

bool IsSkipped(const Module& module, std::uint64_t address) {
    for (const auto& [first, end] : module.skipped)
        if (address >= first && address < end) return true;
    return false;
}

// A return address is that of the next instruction, which may belong to the next line or function.
std::uint64_t WorkOut(std::uintptr_t pc) {
    const auto site = [](const Site& found) { return kSiteTag | std::uint64_t{AddSite(found)} << 2; };
    Module* const module = FindModule(pc);
    if (module == nullptr || module->lines == nullptr) return site({pc, module, nullptr, 0});
    const std::uint64_t address = pc - 1 - module->bias;
    if (!module->runtime && !IsSkipped(*module, address)) {
        SourcePlace place = module->lines->Find(address);
        if (place.kind == SourcePlace::Kind::kProgram)
            return site({pc, module, Intern(std::move(place.file)), static_cast<int>(place.line)});
        if (place.kind == SourcePlace::Kind::kUnknown) return site({pc, module, nullptr, 0});
    }
    return PackRule(module->lines->RuleAt(address));
}

std::uint64_t Answer(std::uintptr_t pc) {
    const std::uint64_t known = AnswerFor(pc);
    if (known != 0) return known;
    const SpinLockScope lock(gLock);
    const std::uint64_t answer = AnswerFor(pc) != 0 ? AnswerFor(pc) : WorkOut(pc);
    if (AnswerFor(pc) == 0) Remember(pc, answer);
    return answer;
}

// The site of a caller in a runtime library that no code of the program is known to have called.
SiteId SiteOfAddress(std::uintptr_t pc) {
    const std::uint64_t known = AnswerFor(pc | kEndOfClimb);
    if (known != 0) return static_cast<SiteId>(known >> 2);
    const SpinLockScope lock(gLock);
    const std::uint64_t added = AnswerFor(pc | kEndOfClimb);
    if (added != 0) return static_cast<SiteId>(added >> 2);
    const SiteId site = AddSite({pc, gReadsModules ? FindModule(pc) : nullptr, nullptr, 0});
    Remember(pc | kEndOfClimb, kSiteTag | std::uint64_t{site} << 2);
    return site;
}

struct Function {
    std::uint64_t address;
    std::uint64_t end;
    const char* name;
};

std::vector<Function> FunctionsOf(const Module& module) {
    std::vector<Function> functions;
    module.file->ForEachFunction(false, [&](const char* name, std::uint64_t address, std::uint64_t size) {
        functions.push_back({address, address + size, name});
    });
    const auto by_address = [](const Function& one, const Function& other) {
        return one.address < other.address;
    };
    std::sort(functions.begin(), functions.end(), by_address);
    return functions;
}

std::string Describe(const Site& site, const std::vector<Function>& functions) {
    const std::uint64_t address = site.pc - 1 - site.module->bias;
    const auto starts_after = [](std::uint64_t place, const Function& function) {
        return place < function.address;
    };
    auto function = std::upper_bound(functions.begin(), functions.end(), address, starts_after);
    if (function != functions.begin() && (--function)->end > address)
        return site.module->name + "!" + ShortName(function->name);
    std::array<char, 32> offset{};
    std::snprintf(offset.data(), offset.size(), "+0x%llx", static_cast<unsigned long long>(address));
    return site.module->name + offset.data();
}

}  // namespace

SiteId SiteOfCaller(const Frame& caller) {
    constexpr int kDeepestClimb = 64;
    if (!gReadsModules) return SiteOfAddress(caller.pc);
    Frame frame = caller;
    for (int depth = 0; depth < kDeepestClimb && frame.pc != 0; ++depth) {
        const std::uint64_t answer = Answer(frame.pc);
        if ((answer & kTagMask) == kSiteTag) return static_cast<SiteId>(answer >> 2);
        if ((answer & kTagMask) == kEndTag) break;
        frame = CallerOf(frame, UnpackRule(answer));
    }
    return SiteOfAddress(caller.pc);
}

void StartReadingModules() {
    const SpinLockScope lock(gLock);
    gReadsModules = true;
}

void RetireUnmappedSites() {
    const SpinLockScope lock(gLock);
    for (const Module* const module : RefreshModules()) {
        const AnswerTable& table = *gAnswers;
        for (std::size_t slot = 0; slot < std::size_t{1} << table.bits; ++slot) {
            const std::uintptr_t pc = table.slots[slot].key & ~kEndOfClimb;
            if (pc >= module->start && pc < module->end) table.slots[slot].key = kRetiredKey;
        }
    }
}

// Functions are looked up here rather than when a site is met: most programs have far more sites than rows of
// interest at their start, and a runtime library's table is read once for all its sites.
std::vector<SiteText> DescribeSites() {
    const SpinLockScope lock(gLock);
    std::unordered_map<const Module*, std::vector<Function>> functions;
    std::vector<SiteText> texts;
    for (Site& site : Sites()) {
        if (site.file == nullptr) {
            if (site.module == nullptr) site.module = FindModule(site.pc);
            if (site.module == nullptr) {
                site.file = Intern("(code without a file)");
            } else {
                const auto [known, added] = functions.try_emplace(site.module);
                if (added && site.module->file != nullptr && site.module->file->ok())
                    known->second = FunctionsOf(*site.module);
                site.file = Intern(Describe(site, known->second));
            }
        }
        texts.push_back({site.file, site.line});
    }
    return texts;
}

void LockSites() { gLock.Acquire(); }
void UnlockSites() { gLock.Release(); }

}  // namespace recorder

// Call sites. Every return address is looked at once, under a lock; its answer is remembered.
#include "sites.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <map>
#include <tuple>
#include <unordered_map>
#include <unordered_set>

#include "answers.h"
#include "modules.h"
#include "names.h"
#include "source_lines.h"
#include "spin_lock.h"

namespace recorder {
namespace {

// The lock guards everything here, and the writing of answers; it is held while files are read.
SpinLock gLock;
bool gReadsModules = false;

// Added to a caller that no climb leads away from.
constexpr std::uintptr_t kEndOfClimb = std::uintptr_t{1} << 63;

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

// Addresses of one line share a site, as do sites beyond the largest number.
SiteId AddSite(const Site& site) {
    using Key = std::tuple<std::uintptr_t, const Module*, const char*, int>;
    static auto* const known = new std::map<Key, SiteId>;
    const Key key =
        site.file != nullptr ? Key{0, nullptr, site.file, site.line} : Key{site.pc, site.module, nullptr, 0};
    const auto [entry, added] = known->try_emplace(key, static_cast<SiteId>(Sites().size()));
    if (!added) return entry->second;
    if (Sites().size() < kSites) Sites().push_back(site);
    return entry->second = static_cast<SiteId>(Sites().size() - 1);
}

bool IsSkipped(const Module& module, std::uint64_t address) {
    for (const auto& [first, end] : module.skipped)
        if (address >= first && address < end) return true;
    return false;
}

// A return address is that of the next instruction, which may belong to the next line or function.
Answer WorkOut(std::uintptr_t pc) {
    const auto site = [](const Site& found) { return PackSite(AddSite(found)); };
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

Answer AnswerAt(std::uintptr_t pc) {
    const Answer known = AnswerFor(pc);
    if (known != 0) return known;
    const SpinLockScope lock(gLock);
    const Answer answer = AnswerFor(pc) != 0 ? AnswerFor(pc) : WorkOut(pc);
    if (AnswerFor(pc) == 0) Remember(pc, answer);
    return answer;
}

// The site of a caller in a runtime library that no code of the program is known to have called.
SiteId SiteOfAddress(std::uintptr_t pc) {
    const Answer known = AnswerFor(pc | kEndOfClimb);
    if (known != 0) return SiteIn(known);
    const SpinLockScope lock(gLock);
    const Answer added = AnswerFor(pc | kEndOfClimb);
    if (added != 0) return SiteIn(added);
    const SiteId site = AddSite({pc, gReadsModules ? FindModule(pc) : nullptr, nullptr, 0});
    Remember(pc | kEndOfClimb, PackSite(site));
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
        const Answer answer = AnswerAt(frame.pc);
        if ((answer & kTagMask) == kSiteTag) return SiteIn(answer);
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
        RetireAnswers(module->start, module->end);
        RetireAnswers(module->start | kEndOfClimb, module->end | kEndOfClimb);
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

// Lines and unwind rules by libdw. Each module's file is given to it as an image in memory, so no descriptor
// stays open, and units are found by a table of our own: not all compilers write the section that would lead
// to them.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include <dwarf.h>
#include <elfutils/libdw.h>

#include "modules.h"
#include "source_lines.h"

namespace recorder {
namespace {

struct UnitRange {
    Dwarf_Addr first;
    Dwarf_Addr end;
    Dwarf_Off unit;
};

bool IsSystemPath(const std::string& path) {
    return path.empty() || path[0] == '<' || path.compare(0, 13, "/usr/include/") == 0 ||
           path.compare(0, 9, "/usr/lib/") == 0 || path.compare(0, 19, "/usr/local/include/") == 0 ||
           path.find("/include/c++/") != std::string::npos || path.find("/sysdeps/") != std::string::npos;
}

// The absolute `path` without empty and "." parts, and without ".." parts and what they undo.
std::string CleanPath(const std::string& path) {
    std::string clean;
    for (std::size_t at = 1; at <= path.size();) {
        const std::size_t end = std::min(path.find('/', at), path.size());
        const std::string part = path.substr(at, end - at);
        at = end + 1;
        if (part.empty() || part == ".") continue;
        if (part == "..") {
            clean.erase(std::min(clean.rfind('/'), clean.size()));
        } else {
            clean += "/" + part;
        }
    }
    return clean;
}

std::string PathIn(Dwarf_Die* unit, const char* path) {
    if (path == nullptr) return {};
    Dwarf_Attribute attribute;
    const char* const folder =
        path[0] == '/' ? nullptr : dwarf_formstring(dwarf_attr(unit, DW_AT_comp_dir, &attribute));
    const std::string whole = folder != nullptr ? std::string(folder) + "/" + path : path;
    return whole[0] == '/' ? CleanPath(whole) : whole;
}

// Adds the functions below `parent` that hold `address`, outermost first: the one that has the code, then
// those that were inlined there. Namespaces hold functions, but have no addresses of their own.
void CollectFunctions(Dwarf_Die* parent, Dwarf_Addr address, std::vector<Dwarf_Die>& functions) {
    Dwarf_Die child;
    for (int more = dwarf_child(parent, &child); more == 0; more = dwarf_siblingof(&child, &child)) {
        const int tag = dwarf_tag(&child);
        const bool is_function = tag == DW_TAG_subprogram || tag == DW_TAG_inlined_subroutine;
        const bool is_block =
            tag == DW_TAG_lexical_block || tag == DW_TAG_try_block || tag == DW_TAG_catch_block;
        if (tag == DW_TAG_namespace) {
            CollectFunctions(&child, address, functions);
            if (!functions.empty()) return;
        } else if ((is_function || is_block) && dwarf_haspc(&child, address) > 0) {
            if (is_function) functions.push_back(child);
            CollectFunctions(&child, address, functions);
            return;
        }
    }
}

std::vector<Dwarf_Die> FunctionsAt(Dwarf_Die* unit, Dwarf_Addr address) {
    std::vector<Dwarf_Die> functions;
    CollectFunctions(unit, address, functions);
    std::reverse(functions.begin(), functions.end());
    return functions;
}

bool IsSkipped(Dwarf_Die* function) {
    if (!HasSkippedNames()) return false;
    Dwarf_Attribute attribute;
    const char* name = nullptr;
    for (const unsigned int kind : {DW_AT_linkage_name, DW_AT_name})
        if (name == nullptr) name = dwarf_formstring(dwarf_attr_integrate(function, kind, &attribute));
    return name != nullptr && IsSkippedFunction(name);
}

unsigned int NumberOf(Dwarf_Die* die, unsigned int kind) {
    Dwarf_Attribute attribute;
    Dwarf_Word number = 0;
    dwarf_formudata(dwarf_attr(die, kind, &attribute), &number);
    return static_cast<unsigned int>(number);
}

SourcePlace CallOf(Dwarf_Die* unit, Dwarf_Die* inlined) {
    Dwarf_Files* files = nullptr;
    std::size_t count = 0;
    const unsigned int number = NumberOf(inlined, DW_AT_call_file);
    if (dwarf_getsrcfiles(unit, &files, &count) != 0 || number >= count) return {};
    return {SourcePlace::Kind::kProgram, PathIn(unit, dwarf_filesrc(files, number, nullptr, nullptr)),
            NumberOf(inlined, DW_AT_call_line)};
}

}  // namespace

struct SourceLines::Tables {
    Elf* elf = nullptr;
    Dwarf* debug = nullptr;        // null without debug information
    Dwarf_CFI* frames = nullptr;   // owned by elf
    std::vector<UnitRange> units;  // by their first address

    void ListUnits() {
        Dwarf_CU* unit = nullptr;
        Dwarf_Die die;
        while (dwarf_get_units(debug, unit, &unit, nullptr, nullptr, &die, nullptr) == 0) {
            Dwarf_Addr base = 0;
            Dwarf_Addr first = 0;
            Dwarf_Addr end = 0;
            for (std::ptrdiff_t at = 0; (at = dwarf_ranges(&die, at, &base, &first, &end)) > 0;)
                units.push_back({first, end, dwarf_dieoffset(&die)});
        }
        std::sort(units.begin(), units.end(),
                  [](const auto& one, const auto& other) { return one.first < other.first; });
    }

    bool FindUnit(Dwarf_Addr address, Dwarf_Die* die) const {
        const auto starts_after = [](Dwarf_Addr place, const UnitRange& range) {
            return place < range.first;
        };
        auto range = std::upper_bound(units.begin(), units.end(), address, starts_after);
        if (range == units.begin() || (--range)->end <= address) return false;
        return dwarf_offdie(debug, range->unit, die) != nullptr;
    }
};

SourceLines::SourceLines(const ElfFile& file) : mpoTables(std::make_unique<Tables>()) {
    elf_version(EV_CURRENT);
    mpoTables->elf = elf_memory(file.Image(), file.ImageBytes());
    if (mpoTables->elf == nullptr) return;
    mpoTables->frames = dwarf_getcfi_elf(mpoTables->elf);
    if (!file.HasSection(".debug_line")) return;
    mpoTables->debug = dwarf_begin_elf(mpoTables->elf, DWARF_C_READ, nullptr);
    if (mpoTables->debug != nullptr) mpoTables->ListUnits();
}

SourceLines::~SourceLines() {
    if (mpoTables->debug != nullptr) dwarf_end(mpoTables->debug);
    if (mpoTables->elf != nullptr) elf_end(mpoTables->elf);
}

SourcePlace SourceLines::Find(std::uint64_t address) {
    Dwarf_Die unit;
    if (mpoTables->debug == nullptr || !mpoTables->FindUnit(address, &unit)) return {};
    Dwarf_Line* const line = dwarf_getsrc_die(&unit, address);
    if (line == nullptr) return {};
    int number = 0;
    dwarf_lineno(line, &number);
    SourcePlace place{SourcePlace::Kind::kProgram, PathIn(&unit, dwarf_linesrc(line, nullptr, nullptr)),
                      static_cast<unsigned int>(number)};
    if (!IsSystemPath(place.file) && !HasSkippedNames())
        return place;                                          // most are; spares the search for functions
    for (Dwarf_Die& function : FunctionsAt(&unit, address)) {  // innermost first
        if (!IsSystemPath(place.file) && !IsSkipped(&function)) return place;
        if (dwarf_tag(&function) == DW_TAG_subprogram) break;
        place = CallOf(&unit, &function);
    }
    return {SourcePlace::Kind::kSystem, {}, 0};
}

namespace {

#if defined(__x86_64__)
constexpr int kStackPointer = 7;
constexpr int kFramePointer = 6;
#elif defined(__aarch64__)
constexpr int kStackPointer = 31;
constexpr int kFramePointer = 29;
#endif

}  // namespace

// Rules other than a register plus an offset are found in hand-written code only.
FrameRule SourceLines::RuleAt(std::uint64_t address) {
    Dwarf_Frame* found = nullptr;
    if (mpoTables->frames == nullptr || dwarf_cfi_addrframe(mpoTables->frames, address, &found) != 0)
        return {};
    const std::unique_ptr<Dwarf_Frame, decltype(&std::free)> frame(found, &std::free);
    FrameRule rule{};
    Dwarf_Op* operations = nullptr;
    std::size_t count = 0;
    if (dwarf_frame_cfa(found, &operations, &count) != 0 || count != 1) return {};
    const int base = operations[0].atom == DW_OP_bregx ? static_cast<int>(operations[0].number)
                                                       : operations[0].atom - DW_OP_breg0;
    const Dwarf_Word offset =
        operations[0].atom == DW_OP_bregx ? operations[0].number2 : operations[0].number;
    if (base != kStackPointer && base != kFramePointer) return {};
    rule.from_frame_pointer = base == kFramePointer;
    rule.cfa_offset = static_cast<std::int32_t>(offset);

    Dwarf_Op memory[3];
    if (dwarf_frame_register(found, kFramePointer, memory, &operations, &count) != 0) return {};
    if (count != 0) {  // saved: the CFA plus an offset
        if (operations[0].atom != DW_OP_call_frame_cfa || count > 2) return {};
        rule.saves_frame_pointer = true;
        rule.frame_pointer_offset = count == 2 ? static_cast<std::int32_t>(operations[1].number) : 0;
    }
    rule.known = true;
    return rule;
}

bool CanReadLines() { return true; }

}  // namespace recorder

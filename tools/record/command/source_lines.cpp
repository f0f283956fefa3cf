// Functions and lines by libdw. Units are found by a table of our own: not all compilers write the section
// that would lead to them.
#include "source_lines.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include <dwarf.h>
#include <elfutils/libdwfl.h>
#include <unistd.h>

#include "names.h"

namespace recorder {
namespace {

struct UnitRange {
    Dwarf_Addr first;
    Dwarf_Addr end;
    Dwarf_Off unit;
};

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

// The name that the linker knows, or else that of the source; null if there is none.
const char* NameOf(Dwarf_Die* function) {
    Dwarf_Attribute attribute;
    const char* name = nullptr;
    for (const unsigned int kind : {DW_AT_linkage_name, DW_AT_name})
        if (name == nullptr) name = dwarf_formstring(dwarf_attr_integrate(function, kind, &attribute));
    return name;
}

unsigned int NumberOf(Dwarf_Die* die, unsigned int kind) {
    Dwarf_Attribute attribute;
    Dwarf_Word number = 0;
    dwarf_formudata(dwarf_attr(die, kind, &attribute), &number);
    return static_cast<unsigned int>(number);
}

// Where the inlined function was called.
SourcePlace CallOf(Dwarf_Die* unit, Dwarf_Die* inlined) {
    Dwarf_Files* files = nullptr;
    std::size_t count = 0;
    const unsigned int number = NumberOf(inlined, DW_AT_call_file);
    SourcePlace place;
    if (dwarf_getsrcfiles(unit, &files, &count) != 0 || number >= count) return place;
    place.file = PathIn(unit, dwarf_filesrc(files, number, nullptr, nullptr));
    place.line = NumberOf(inlined, DW_AT_call_line);
    return place;
}

void NamePlace(SourcePlace& place, const char* name, const SkipRule& skips) {
    if (name == nullptr || *name == 0) return;
    place.function = ReadableName(name);
    place.is_skipped = skips(name);
}

// Finds debug information where distributions put it, by build-id or by the name in the file; on servers if
// the environment lists some. libdw itself would load its client for servers, with some thirty libraries, for
// each file without debug information.
int FindDebugFile(Dwfl_Module* module, void** user, const char* name, Dwarf_Addr base, const char* path,
                  const char* link, GElf_Word checksum, char** found) {
    const int file = dwfl_build_id_find_debuginfo(module, user, name, base, path, link, checksum, found);
    if (file >= 0) return file;
    bool is_there = std::getenv("DEBUGINFOD_URLS") != nullptr;
    if (link != nullptr && path != nullptr) {
        const std::string folder = std::string(path).substr(0, std::string(path).rfind('/') + 1);
        for (const std::string& place : {folder, folder + ".debug/", "/usr/lib/debug" + folder})
            is_there = is_there || access((place + link).c_str(), R_OK) == 0;
    }
    return is_there ? dwfl_standard_find_debuginfo(module, user, name, base, path, link, checksum, found)
                    : -1;
}

const Dwfl_Callbacks kCallbacks = {dwfl_build_id_find_elf, FindDebugFile, dwfl_offline_section_address,
                                   nullptr};

bool HasBuildId(Dwfl_Module* module, const std::string& build_id) {
    const unsigned char* bits = nullptr;
    GElf_Addr address = 0;
    const int length = dwfl_module_build_id(module, &bits, &address);
    return length == static_cast<int>(build_id.size()) &&
           std::memcmp(bits, build_id.data(), build_id.size()) == 0;
}

}  // namespace

struct SourceLines::Tables {
    Dwfl* session = nullptr;
    Dwfl_Module* module = nullptr;  // owned by session, as are all below; null if the file is missing
    GElf_Addr bias = 0;             // of the module's addresses in the session
    Dwarf* debug = nullptr;         // null without debug information
    Dwarf_Addr debug_bias = 0;
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

    // The symbol that covers `address`, without its version; empty if there is none.
    std::string SymbolAt(std::uint64_t address) const {
        GElf_Off offset = 0;
        GElf_Sym symbol{};
        const char* const name =
            dwfl_module_addrinfo(module, address + bias, &offset, &symbol, nullptr, nullptr, nullptr);
        if (name == nullptr || (symbol.st_size != 0 && offset >= symbol.st_size)) return {};
        return std::string(name).substr(0, std::strcspn(name, "@"));
    }
};

SourceLines::SourceLines(const std::string& path, const std::string& build_id, bool with_lines)
    : mpoTables(std::make_unique<Tables>()) {
    Tables& tables = *mpoTables;
    tables.session = dwfl_begin(&kCallbacks);
    Dwfl_Module* const module = dwfl_report_offline(tables.session, path.c_str(), path.c_str(), -1);
    dwfl_report_end(tables.session, nullptr, nullptr);
    if (module == nullptr || dwfl_module_getelf(module, &tables.bias) == nullptr) return;
    if (!build_id.empty() && !HasBuildId(module, build_id)) return;
    tables.module = module;
    if (with_lines) tables.debug = dwfl_module_getdwarf(module, &tables.debug_bias);
    if (tables.debug != nullptr) tables.ListUnits();
}

SourceLines::~SourceLines() { dwfl_end(mpoTables->session); }

bool SourceLines::IsOpen() const { return mpoTables->module != nullptr; }

bool SourceLines::HasLines() const { return !mpoTables->units.empty(); }

std::vector<SourcePlace> SourceLines::PlacesAt(std::uint64_t address, const SkipRule& skips) const {
    const Tables& tables = *mpoTables;
    std::vector<SourcePlace> places(1);
    if (!IsOpen()) return places;
    const Dwarf_Addr place = address + tables.bias - tables.debug_bias;
    Dwarf_Die unit;
    Dwarf_Line* const line =
        tables.debug != nullptr && tables.FindUnit(place, &unit) ? dwarf_getsrc_die(&unit, place) : nullptr;
    if (line != nullptr) {
        int number = 0;
        dwarf_lineno(line, &number);
        places.back().file = PathIn(&unit, dwarf_linesrc(line, nullptr, nullptr));
        places.back().line = static_cast<unsigned int>(number);
        for (Dwarf_Die& function : FunctionsAt(&unit, place)) {
            NamePlace(places.back(), NameOf(&function), skips);
            dwarf_decl_line(&function, &places.back().function_line);
            if (dwarf_tag(&function) == DW_TAG_subprogram) break;
            places.push_back(CallOf(&unit, &function));
        }
    }
    if (places.back().function.empty()) NamePlace(places.back(), tables.SymbolAt(address).c_str(), skips);
    return places;
}

bool IsSystemPath(const std::string& path) {
    const auto starts = [&](const char* start) { return path.compare(0, std::strlen(start), start) == 0; };
    const auto contains = [&](const char* part) { return path.find(part) != std::string::npos; };
    return path.empty() || path[0] == '<' || starts("/usr/include/") || starts("/usr/lib/") ||
           starts("/usr/local/include/") || starts("/rustc/") || contains("/include/c++/") ||
           contains("/.cargo/registry/") || contains("/cargo/registry/");
}

}  // namespace recorder

// Which frame of a stack is credited, and how it is named.
#include "sites.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>

#include <fnmatch.h>
#include <unistd.h>

#include "names.h"

namespace recorder {
namespace {

bool IsRuntime(const std::string& name) {
    for (const char* start : {"libc.so", "libc-", "ld-linux", "libstdc++.so", "libc++.so", "libc++abi.so",
                              "libgcc_s.so", "libm.so", "libpthread", "libdl.so", "libdl-", "librt.so",
                              "libjemalloc", "libtcmalloc", "libmimalloc", "libzanbase-preload.so"})
        if (name.compare(0, std::strlen(start), start) == 0) return true;
    return false;
}

std::string HexText(std::uint64_t number) {
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "+0x%llx", static_cast<unsigned long long>(number));
    return text.data();
}

// The loader and the functions of the C library that allocate for as long as the process lives.
bool IsRuntimeOwner(const AddressInfo& info) {
    for (const char* name : {"libc.so.6!_IO_file_doallocate", "libc.so.6!_IO_wfile_doallocate"})
        if (info.name == name) return true;
    return info.name.compare(0, 8, "ld-linux") == 0;
}

bool Matches(const std::vector<std::string>& patterns, const std::string& name) {
    return !name.empty() && std::any_of(patterns.begin(), patterns.end(), [&](const std::string& pattern) {
        return fnmatch(("*" + pattern + "*").c_str(), name.c_str(), 0) == 0;
    });
}

}  // namespace

// The file of a module, opened when something of it is to be named.
struct Symbolizer::ModuleFile {
    std::string name;         // the path's last part
    bool is_runtime = false;  // part of the C or C++ runtime: a site is looked for in its callers
    bool opened = false;
    std::unique_ptr<SourceLines> lines;  // null if there is no such file
    std::unordered_map<std::uint64_t, AddressInfo> known;
};

Symbolizer::Symbolizer(std::vector<std::string> skipped)
    : maSkipped(std::move(skipped)), moNoModule{std::vector<SourcePlace>(1), 0, "(code without a file)"} {}

Symbolizer::~Symbolizer() = default;

// The runtime's operator new may be linked into the program, or be one of the program's own.
bool Symbolizer::IsSkipped(const char* linker_name) const {
    if (std::strncmp(linker_name, "_Znw", 4) == 0 || std::strncmp(linker_name, "_Zna", 4) == 0) return true;
    if (maSkipped.empty()) return false;
    const std::string name = ReadableName(linker_name);
    return std::any_of(maSkipped.begin(), maSkipped.end(), [&](const std::string& pattern) {
        return pattern == linker_name || pattern == name || fnmatch(pattern.c_str(), name.c_str(), 0) == 0;
    });
}

Symbolizer::ModuleFile& Symbolizer::FileOf(const Module& module) {
    auto& file = moFiles[{module.path, module.build_id}];
    if (file == nullptr) {
        file = std::make_unique<ModuleFile>();
        file->name = module.path.substr(module.path.rfind('/') + 1);
        file->is_runtime = IsRuntime(file->name);
    }
    return *file;
}

// The process may have another root than the command; that can be reached as long as it lives.
void Symbolizer::Open(ModuleFile& file, const Module& module, int process) {
    file.opened = true;
    for (const std::string& root : {std::string(), "/proc/" + std::to_string(process) + "/root"}) {
        if (access((root + module.path).c_str(), R_OK) != 0) continue;
        file.lines = std::make_unique<SourceLines>(root + module.path, module.build_id, !file.is_runtime);
        if (file.lines->IsOpen()) return;
        file.lines.reset();
    }
}

AddressInfo Symbolizer::Symbolize(const ModuleFile& file, std::uint64_t address) {
    AddressInfo info{std::vector<SourcePlace>(1), 0, file.name + HexText(address)};
    if (file.lines == nullptr) return info;
    info.places = file.lines->PlacesAt(address, [this](const char* name) { return IsSkipped(name); });
    if (!info.places.back().function.empty()) info.name = file.name + "!" + info.places.back().function;
    const auto is_credited = [](const SourcePlace& place) {
        return !place.is_skipped && !IsSystemPath(place.file);
    };
    const auto credited = std::find_if(info.places.begin(), info.places.end(), is_credited);
    info.credited = static_cast<std::size_t>(credited - info.places.begin());
    const bool has_lines = !info.places.front().file.empty();
    if (file.is_runtime) info.credited = info.places.size();
    if (!has_lines && !file.is_runtime) {
        info.credited = info.places.back().is_skipped ? 1 : 0;
        if (!file.lines->HasLines()) moWithoutLines.insert(file.name);
    }
    return info;
}

const AddressInfo& Symbolizer::InfoOf(const ProcessAccount& account, std::uint32_t address) {
    const Address& place = account.addresses[address];
    if (place.module == 0) return moNoModule;
    ModuleFile& file = FileOf(account.modules[place.module]);
    if (!file.opened) Open(file, account.modules[place.module], account.process);
    const auto [known, added] = file.known.try_emplace(place.offset);
    // A return address is that of the next instruction, which may belong to the next line or function.
    if (added) known->second = Symbolize(file, place.offset - 1);
    return known->second;
}

bool Symbolizer::IsCredited(const ProcessAccount& account, std::uint32_t address) {
    const std::uint32_t module = account.addresses[address].module;
    if (module != 0 && FileOf(account.modules[module]).is_runtime) return false;
    const AddressInfo& info = InfoOf(account, address);
    return info.credited < info.places.size();
}

std::vector<NodeId> StackSites::Update(const ProcessAccount& account, Symbolizer& symbolizer) {
    std::vector<NodeId> ends;
    for (std::size_t i = maCredited.size(); i < account.nodes.size(); ++i) {
        const Node& node = account.nodes[i];
        const auto id = static_cast<NodeId>(i);
        maFirst.push_back(node.parent == 0 ? id : maFirst[node.parent]);
        maCredited.push_back(i == 0 ? 0 : maCredited[node.parent]);
        if (i == 0 || maCredited.back() != 0 || !symbolizer.IsCredited(account, node.address)) continue;
        maCredited.back() = id;
        ends.push_back(id);
    }
    return ends;
}

Site StackSites::SiteOf(NodeId node, const ProcessAccount& account, Symbolizer& symbolizer) const {
    if (node == 0 || node >= maCredited.size()) return {"(memory ran out)", 0, {}, 0};
    const bool is_credited = maCredited[node] != 0;
    const NodeId site = is_credited ? maCredited[node] : maFirst[node];
    const AddressInfo& info = symbolizer.InfoOf(account, account.nodes[site].address);
    if (!is_credited || info.places[info.credited].file.empty()) return {info.name, 0, {}, 0};
    const SourcePlace& place = info.places[info.credited];
    return {place.file, static_cast<int>(place.line), place.function, place.function_line};
}

bool StackSites::IsKept(NodeId node, const ProcessAccount& account, Symbolizer& symbolizer,
                        const std::vector<std::string>& suppressed) const {
    const NodeId credited = CreditedNode(node);
    if (credited == 0) return true;
    for (NodeId at = node; at != 0; at = account.nodes[at].parent) {
        const AddressInfo& info = symbolizer.InfoOf(account, account.nodes[at].address);
        if (at < credited && IsRuntimeOwner(info)) return true;
        if (Matches(suppressed, info.name)) return true;
        for (const SourcePlace& place : info.places)
            if (Matches(suppressed, place.function) || Matches(suppressed, place.file)) return true;
    }
    return false;
}

}  // namespace recorder

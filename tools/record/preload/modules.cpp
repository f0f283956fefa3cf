// The modules, from the kernel's list of mappings. The loader is never asked: its lock may be held by a
// thread that waits for the recorder.
#include "modules.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "names.h"
#include "source_lines.h"

namespace recorder {
namespace {

using ModuleList = std::vector<std::unique_ptr<Module>>;

// Never destroyed: the program may call until its last instruction.
ModuleList& Modules() {
    static auto* const modules = new ModuleList;
    return *modules;
}

std::vector<std::string>& SkippedNames() {
    static auto* const names = new std::vector<std::string>;
    return *names;
}

std::string ReadMappings() {
    std::string text;
    const auto file =
        static_cast<int>(syscall(SYS_openat, AT_FDCWD, "/proc/self/maps", O_RDONLY | O_CLOEXEC));
    if (file < 0) return text;
    constexpr std::size_t kStep = 16384;
    std::size_t used = 0;
    for (long got = 1; got > 0; used += static_cast<std::size_t>(std::max(got, 0L))) {
        text.resize(used + kStep);
        got = syscall(SYS_read, file, &text[used], kStep);
    }
    syscall(SYS_close, file);
    text.resize(used);
    return text;
}

bool StartsWith(const std::string& text, const char* start) {
    return text.compare(0, std::strlen(start), start) == 0;
}

bool IsRuntime(const std::string& name) {
    for (const char* start : {"libc.so", "libc-", "ld-linux", "libstdc++.so", "libc++.so", "libc++abi.so",
                              "libgcc_s.so", "libm.so", "libpthread", "libdl.so", "libdl-", "librt.so",
                              "libjemalloc", "libtcmalloc", "libmimalloc", "libzanbase-preload.so"})
        if (StartsWith(name, start)) return true;
    return false;
}

// In nanoseconds; 0 if there is no such file.
std::int64_t ChangeTime(const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0) return 0;
    return status.st_ctim.tv_sec * 1000000000 + status.st_ctim.tv_nsec;
}

void Open(Module& module) {
    module.opened = true;
    module.changed = ChangeTime(module.path);
    module.bias = module.start - module.offset;
    module.file = std::make_unique<ElfFile>(module.path.c_str());
    if (!module.file->ok()) return;
    module.bias = module.file->Bias(module.start, module.offset);
    module.lines = std::make_unique<SourceLines>(*module.file);
    if (module.runtime) return;
    module.file->ForEachFunction(false, [&](const char* name, std::uint64_t address, std::uint64_t size) {
        if (IsSkippedFunction(name)) module.skipped.emplace_back(address, address + size);
    });
}

// One line of the list: "first-end rwxp offset device inode   path". Lines of other mappings than code give
// nothing.
void ReadMapping(const char* line, const char* line_end, ModuleList& found) {
    char* rest = nullptr;
    const std::uintptr_t start = std::strtoul(line, &rest, 16);
    const std::uintptr_t end = std::strtoul(rest + 1, &rest, 16);
    if (rest[3] != 'x') return;
    const std::uint64_t offset = std::strtoul(rest + 5, &rest, 16);
    const auto* const path =
        static_cast<const char*>(std::memchr(rest, '/', static_cast<std::size_t>(line_end - rest)));
    if (path == nullptr) return;
    auto module = std::make_unique<Module>();
    module->start = start;
    module->end = end;
    module->offset = offset;
    module->identity.assign(static_cast<const char*>(rest), line_end);
    module->path.assign(path, line_end);
    module->name = module->path.substr(module->path.rfind('/') + 1);
    module->runtime = IsRuntime(module->name);
    found.push_back(std::move(module));
}

bool IsSame(const Module& known, const Module& found) {
    return known.start == found.start && known.end == found.end && known.offset == found.offset &&
           known.identity == found.identity &&
           (known.loaded || !known.opened || known.changed == ChangeTime(known.path));
}

Module* Find(std::uintptr_t pc) {
    for (const auto& module : Modules())
        if (module->loaded && pc >= module->start && pc < module->end) return module.get();
    return nullptr;
}

}  // namespace

Module::Module() = default;
Module::~Module() = default;

Module* FindModule(std::uintptr_t pc) {
    Module* module = Find(pc);
    if (module == nullptr) {
        RefreshModules();
        module = Find(pc);
    }
    if (module != nullptr && !module->opened) Open(*module);
    return module;
}

std::vector<const Module*> RefreshModules() {
    ModuleList found;
    const std::string text = ReadMappings();
    for (const char* line = text.data(); line < text.data() + text.size();) {
        const char* const line_end = std::find(line, text.data() + text.size(), '\n');
        ReadMapping(line, line_end, found);
        line = line_end + 1;
    }
    std::vector<const Module*> gone;
    if (found.empty()) return gone;
    for (const auto& module : Modules()) {
        const bool was_loaded = module->loaded;
        const auto same = std::find_if(found.begin(), found.end(),
                                       [&](const auto& other) { return IsSame(*module, *other); });
        module->loaded = same != found.end();
        if (module->loaded) {
            found.erase(same);
        } else if (was_loaded) {
            gone.push_back(module.get());
        }
    }
    for (auto& module : found) Modules().push_back(std::move(module));
    return gone;
}

void SkipFunction(const std::string& name) { SkippedNames().push_back(name); }

bool HasSkippedNames() { return !SkippedNames().empty(); }

// The runtime's operator new may be linked into the program, or be one of the program's own.
bool IsSkippedFunction(const char* linkerName) {
    if (std::strncmp(linkerName, "_Znw", 4) == 0 || std::strncmp(linkerName, "_Zna", 4) == 0) return true;
    const auto is_named = [linkerName](const std::string& name) {
        if (name == linkerName) return true;
        const std::string last = name.substr(name.rfind(':') + 1);
        return std::strstr(linkerName, last.c_str()) != nullptr && ReadableName(linkerName) == name;
    };
    return std::any_of(SkippedNames().begin(), SkippedNames().end(), is_named);
}

}  // namespace recorder

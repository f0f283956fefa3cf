// What can be known of a program before it runs: whether the loader will load the recorder, and what
// allocates.
#include "checks.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>

#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "elf_file.h"

namespace recorder {
namespace {

// Why the file at `path` can't be run; empty if it can.
std::string ReasonAgainst(const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0) return path + ": " + std::strerror(errno);
    if (S_ISDIR(status.st_mode)) return path + " is a directory";
    if (!S_ISREG(status.st_mode)) return path + " is not a regular file";
    return access(path.c_str(), X_OK) == 0 ? "" : path + ": " + std::strerror(errno);
}

// The loader ignores preloaded libraries where the process gets more rights than its caller has.
bool GainsRights(const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0) return false;
    const bool other_user = (status.st_mode & S_ISUID) != 0 && status.st_uid != getuid();
    const bool other_group = (status.st_mode & S_ISGID) != 0 && status.st_gid != getgid();
    const bool capable = getuid() != 0 && getxattr(path.c_str(), "security.capability", nullptr, 0) > 0;
    return other_user || other_group || capable;
}

// The interpreter of a script, or an empty text.
std::string InterpreterOf(const std::string& path) {
    std::ifstream file(path);
    std::string line;
    if (!std::getline(file, line) || line.compare(0, 2, "#!") != 0) return {};
    const std::size_t first = line.find_first_not_of(" \t", 2);
    return first == std::string::npos ? "" : line.substr(first, line.find_first_of(" \t", first) - first);
}

bool Defines(const ElfFile& file, const char* function) {
    bool found = false;
    file.ForEachFunction(true, [&](const char* name, std::uint64_t /*address*/, std::uint64_t /*size*/) {
        found = found || std::strcmp(name, function) == 0;
    });
    return found;
}

// The sign of a sanitizer in the program, or an empty text.
std::string SanitizerOf(const ElfFile& file) {
    for (const std::string& library : file.NeededLibraries()) {
        for (const char* name : {"libasan", "libtsan", "liblsan", "libhwasan", "libclang_rt"})
            if (library.compare(0, std::strlen(name), name) == 0) return library;
    }
    for (const char* entry : {"__asan_init", "__tsan_init", "__msan_init", "__lsan_init", "__hwasan_init"})
        if (Defines(file, entry)) return entry;
    return {};
}

}  // namespace

FoundProgram FindProgram(const std::string& name) {
    if (name.find('/') != std::string::npos) {
        const std::string reason = ReasonAgainst(name);
        return {reason.empty() ? name : "", reason, access(name.c_str(), F_OK) == 0};
    }
    const char* const folders = std::getenv("PATH");
    std::string rest = folders != nullptr ? folders : "/usr/local/bin:/usr/bin:/bin";
    FoundProgram found{{}, "no such program: " + name, false};
    while (!rest.empty()) {
        const std::size_t end = std::min(rest.find(':'), rest.size());
        const std::string path = (end != 0 ? rest.substr(0, end) : ".") + "/" + name;
        const std::string reason = ReasonAgainst(path);
        if (reason.empty()) return {path, {}, true};
        if (!found.exists && access(path.c_str(), F_OK) == 0) found = {{}, reason, true};
        rest.erase(0, end + 1);
    }
    return found;
}

Recordable CheckProgram(const std::string& path) {
    const std::string interpreter = InterpreterOf(path);
    const std::string program = interpreter.empty() ? path : interpreter;
    const ElfFile file(program.c_str());
    if (!file.ok()) return {program + " is not a program of this machine's kind", {}};
    if (!file.HasInterpreter())
        return {program + " is linked statically: no library can be loaded into it", {}};
    if (GainsRights(program))
        return {program + " gains rights when it runs: the loader refuses the recorder", {}};
    const std::string sanitizer = SanitizerOf(file);
    if (!sanitizer.empty()) {
        return {program + " is a sanitizer build (" + sanitizer + "): its runtime replaces the allocators",
                {}};
    }
    if (Defines(file, "malloc")) return {{}, program + " has an allocator of its own (it defines malloc)"};
    return {};
}

}  // namespace recorder

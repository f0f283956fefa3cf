// The program's modules: the files that are mapped as code, by address. All functions require the lock of the
// sites.
#ifndef ZANBASE_RECORD_MODULES_H
#define ZANBASE_RECORD_MODULES_H

#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "common/elf_file.h"

namespace recorder {

class SourceLines;

struct Module {
    std::uintptr_t start;
    std::uintptr_t end;
    std::uint64_t offset;  // in the file, of the byte at `start`
    std::string identity;  // device, inode and path as the kernel lists them
    std::string path;
    std::int64_t changed = 0;  // when the file last changed, as of `opened`
    std::string name;          // the path's last part
    bool runtime = false;      // part of the C or C++ runtime: a site is looked for in its callers
    bool loaded = true;        // false once it was unmapped

    // What follows is read at the first use.
    bool opened = false;
    std::uint64_t bias = 0;  // an address in memory less that in the file
    std::unique_ptr<ElfFile> file;
    std::unique_ptr<SourceLines> lines;
    std::vector<std::pair<std::uint64_t, std::uint64_t>> skipped;  // functions that are no sites: first, end

    Module();
    ~Module();
};

// The module at `pc`, opened, or null. Reads the list of mappings again if none is known there.
Module* FindModule(std::uintptr_t pc);

// Reads the list of mappings again; returns the modules that have gone since. One that comes back to its old
// place is the same again, unless its file was written anew.
std::vector<const Module*> RefreshModules();

// Adds the name of a function whose calls are credited to its caller.
void SkipFunction(const std::string& name);
bool IsSkippedFunction(const char* linkerName);
bool HasSkippedNames();

}  // namespace recorder

#endif

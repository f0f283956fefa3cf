// What a module's debug information and unwind tables tell of an address. Built in two ways: over libdw, or,
// without it, as one that knows nothing, so that sites are named by functions. Requires the lock of the
// sites.
#ifndef ZANBASE_RECORD_SOURCE_LINES_H
#define ZANBASE_RECORD_SOURCE_LINES_H

#include <cstdint>
#include <memory>
#include <string>

#include "common/elf_file.h"
#include "frame_rule.h"

namespace recorder {

// A place in the program's source.
struct SourcePlace {
    enum class Kind { kUnknown, kSystem, kProgram };
    Kind kind;         // kSystem: the code comes from system headers and skipped functions only
    std::string file;  // absolute if the debug information knows the folder
    unsigned int line;
};

class SourceLines {
public:
    // `file` must outlive the object.
    explicit SourceLines(const ElfFile& file);
    ~SourceLines();
    SourceLines(const SourceLines&) = delete;
    SourceLines& operator=(const SourceLines&) = delete;

    // The innermost line at `address` of the file that lies outside of system headers and skipped functions,
    // where the functions that were inlined there count one by one.
    SourcePlace Find(std::uint64_t address);

    // How the frame of the code at `address` leads to that of its caller; a rule without meaning if it can't
    // be told.
    FrameRule RuleAt(std::uint64_t address);

private:
    struct Tables;
    std::unique_ptr<Tables> mpoTables;
};

// True if this build can read lines.
bool CanReadLines();

}  // namespace recorder

#endif

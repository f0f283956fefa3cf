// What the file of a module says of its addresses: functions from its symbols, and lines from its debug
// information, which may be in a file of its own.
#ifndef ZANBASE_RECORD_SOURCE_LINES_H
#define ZANBASE_RECORD_SOURCE_LINES_H

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace recorder {

// A place in the program's source. Without debug information it has a function at most.
struct SourcePlace {
    std::string function;  // as people read it; empty if it is not known
    std::string file;      // absolute if the debug information knows the folder; empty if it is not known
    unsigned int line = 0;
    int function_line = 0;    // where the function is declared; 0 if that is not known
    bool is_skipped = false;  // what the function allocates is credited to its caller
};

// True for a function that is credited to its caller; takes the name that the linker knows.
using SkipRule = std::function<bool(const char*)>;

class SourceLines {
public:
    // Opens the file at `path`, and its debug information if `with_lines`. If it has not the number
    // `build_id`, unless this is empty, it counts as missing.
    SourceLines(const std::string& path, const std::string& build_id, bool with_lines);
    ~SourceLines();
    SourceLines(const SourceLines&) = delete;
    SourceLines& operator=(const SourceLines&) = delete;

    bool IsOpen() const;
    bool HasLines() const;

    // The places of the code at `address` of the file: the function that has it comes last, before it those
    // that were inlined there, innermost first. One without a file if there are no lines for it.
    std::vector<SourcePlace> PlacesAt(std::uint64_t address, const SkipRule& skips) const;

private:
    struct Tables;
    std::unique_ptr<Tables> mpoTables;
};

// True for code that is part of a compiler, its runtime or a system library.
bool IsSystemPath(const std::string& path);

}  // namespace recorder

#endif

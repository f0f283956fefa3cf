// What can be known of a program before it runs.
#ifndef ZANBASE_RECORD_CHECKS_H
#define ZANBASE_RECORD_CHECKS_H

#include <string>

namespace recorder {

struct FoundProgram {
    std::string path;    // empty if there is none that can be run
    std::string reason;  // why not
    bool exists;         // a file of the name was found
};

// The file that a shell would run for `name`.
FoundProgram FindProgram(const std::string& name);

struct Recordable {
    std::string refusal;         // why nothing of the program can be recorded; empty if something can
    std::string memory_missing;  // why its memory can't be recorded; empty if it can
};

// Looks at the file at `path`, and for a script at its interpreter.
Recordable CheckProgram(const std::string& path);

}  // namespace recorder

#endif

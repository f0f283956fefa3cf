// Names of functions as people read them.
#ifndef ZANBASE_RECORD_NAMES_H
#define ZANBASE_RECORD_NAMES_H

#include <string>

namespace recorder {

// The demangled name without its parameters, or the name itself if it is no C++ name.
std::string ReadableName(const char* linker_name);

}  // namespace recorder

#endif

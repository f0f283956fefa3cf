// Names of functions as people read them.
#include "names.h"

#include <cstdlib>
#include <cstring>

#include <cxxabi.h>

namespace recorder {
namespace {

// Where the parameters of a demangled name start: the last parenthesis that opens outside of all brackets.
std::size_t FindParameters(const std::string& name) {
    int depth = 0;
    for (std::size_t i = name.size(); i-- > 0;) {
        if (name[i] == ')' || name[i] == '>') ++depth;
        if (name[i] == '(' || name[i] == '<') --depth;
        if (depth == 0 && name[i] == '(') return i;
    }
    return std::string::npos;
}

}  // namespace

std::string ReadableName(const char* linker_name) {
    if (std::strncmp(linker_name, "_Z", 2) != 0) return linker_name;
    int status = 0;
    char* const text = abi::__cxa_demangle(linker_name, nullptr, nullptr, &status);
    if (text == nullptr) return linker_name;
    std::string name = text;
    std::free(text);
    if (name.find("operator") == std::string::npos) name = name.substr(0, FindParameters(name));
    return name;
}

}  // namespace recorder

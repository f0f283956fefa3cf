// The command line of zanbase-record.
#ifndef ZANBASE_RECORD_OPTIONS_H
#define ZANBASE_RECORD_OPTIONS_H

#include <stdexcept>
#include <string>
#include <vector>

#include "common/settings.h"

namespace recorder {

// What is wrong with a command line, in a line.
struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct RunOptions {
    Settings settings;
    std::vector<std::string> program;  // with its arguments; empty only for help
    bool help = false;
};

// Reads the words after the command's name. Throws UsageError.
RunOptions ReadRunOptions(const std::vector<std::string>& words);

struct CompareOptions {
    std::string earlier;
    std::string later;
    double tolerance = 0;  // percent
};

// Reads the words after "compare". Throws UsageError.
CompareOptions ReadCompareOptions(const std::vector<std::string>& words);

// The text of --help.
extern const char kHelp[];

}  // namespace recorder

#endif

// The command line of zanbase-record.
#ifndef ZANBASE_RECORD_OPTIONS_H
#define ZANBASE_RECORD_OPTIONS_H

#include <stdexcept>
#include <string>
#include <vector>

namespace recorder {

// What is wrong with a command line, in a line.
struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

enum class Format { kTables, kJson, kCsv, kFolded };

// Limits of a run; a negative one is none.
struct Budgets {
    long long leaked_bytes = -1;
    long long peak_bytes = -1;
    long long allocations = -1;
    long long read_bytes = -1;
    long long opens = -1;

    bool IsSet() const {
        return leaked_bytes >= 0 || peak_bytes >= 0 || allocations >= 0 || read_bytes >= 0 || opens >= 0;
    }
};

struct RunOptions {
    std::vector<std::string> program;  // with its arguments; empty only for help and version
    std::string output;                // absolute, with %p still in it; empty for standard error
    Format format = Format::kTables;
    bool memory = true;
    bool disk = true;
    bool follow = false;
    bool debuginfod = false;
    int callers = 0;                      // that are recorded behind each call site
    int signal = 0;                       // at which a report is made; SIGUSR1 if it is 0
    double every = 0;                     // seconds between reports; 0 for none
    std::vector<std::string> skipped;     // functions that are credited to their callers
    std::vector<std::string> suppressed;  // functions, files or modules whose leaks are meant
    Budgets budgets;
    bool help = false;
    bool version = false;
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
std::string HelpText();

}  // namespace recorder

#endif

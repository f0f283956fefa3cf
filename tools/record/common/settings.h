// What the command tells the preload library: the settings of a run, as text in one variable of the
// environment.
#ifndef ZANBASE_RECORD_SETTINGS_H
#define ZANBASE_RECORD_SETTINGS_H

#include <string>
#include <vector>

namespace recorder {

constexpr char kSettingsVariable[] = "ZANBASE_RECORD";

// The name of the file in memory by which the library tells the command what it did.
constexpr char kResultName[] = "zanbase-record";

// What the library writes there once a report was made; lines about broken budgets follow.
constexpr char kReportedLine[] = "reported\n";

enum class Format { kTables, kJson, kCsv, kFolded };

// Limits of a run; a negative one is none.
struct Budgets {
    long long leaked_bytes = -1;
    long long peak_bytes = -1;
    long long allocations = -1;
    long long read_bytes = -1;
    long long opens = -1;
};

struct Settings {
    std::string output;          // absolute, with %p still in it; empty for standard error
    std::string other_preloads;  // what LD_PRELOAD holds without the recorder
    std::vector<std::string> skipped_functions;
    Format format = Format::kTables;
    Budgets budgets;
    bool memory = true;
    bool disk = true;
    bool follow = false;
    int signal = 0;   // 0 for none
    int process = 0;  // the one to record, unless children are followed
    int result_descriptor =
        -1;  // where the library tells the command that it reported, and which budgets broke
};

std::string SettingsText(const Settings& settings);

// The settings in `text`; what is not known in it is left out.
Settings ReadSettings(const char* text);

}  // namespace recorder

#endif

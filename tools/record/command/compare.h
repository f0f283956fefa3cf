// Two reports in JSON beside each other.
#ifndef ZANBASE_RECORD_COMPARE_H
#define ZANBASE_RECORD_COMPARE_H

#include <string>
#include <vector>

#include "options.h"
#include "zanbase/snapshot.h"

namespace recorder {

// Both accounts of one report.
struct Accounts {
    HMemorySnapshot memory;
    std::vector<std::string> places;  // of memory's rows: file, function and line in it; empty if not known
    HDiskIOSnapshot disk;
    std::string run;  // what the report says of the program; may be empty
};

// Reads a report. Throws std::runtime_error, whose text names the file.
Accounts ReadAccounts(const std::string& path);

struct Comparison {
    std::string text;  // what grew, shrank, is new and is gone, by file and line, then the totals
    bool grew;         // a total grew by more than the tolerance
};

// `tolerance` is in percent of the earlier total.
Comparison Compare(const Accounts& earlier, const Accounts& later, double tolerance);

// Prints the comparison; returns the exit status of the command.
int RunCompare(const CompareOptions& options);

}  // namespace recorder

#endif

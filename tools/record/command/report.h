// Reports: accounts of processes as snapshots, and from there the library's own tables or forms for other
// programs.
#ifndef ZANBASE_RECORD_REPORT_H
#define ZANBASE_RECORD_REPORT_H

#include <string>
#include <vector>

#include "account_file.h"
#include "options.h"
#include "sites.h"
#include "zanbase/snapshot.h"

namespace recorder {

// One process and what is known of its end.
struct RecordedProcess {
    ProcessAccount account;
    StackSites stacks;
    bool waited = false;  // `wait_status` is what waitpid gave
    int wait_status = 0;
    bool is_gone = false;  // it has ended, whether or not that was seen
};

// What a stack or all stacks of a call site came to.
struct StackFigures {
    long long live = 0;       // bytes
    long long allocated = 0;  // bytes
    long long calls = 0;
    long long at_peak = 0;    // bytes that were live when the total was highest
    long long temporary = 0;  // blocks that were freed before their thread allocated again

    void Add(const StackUsage& usage);
};

// What a row has beside what the library's snapshot of it has.
struct RowDetails {
    Site site;
    StackFigures figures;
};

// The frames of a stack from the one that is credited on, its callers after it.
struct ReportedStack {
    std::vector<std::string> frames;
    StackFigures figures;
};

struct Report {
    std::vector<const RecordedProcess*> processes;  // more than one for a sum
    HMemorySnapshot memory;
    HDiskIOSnapshot disk;
    std::vector<RowDetails> sites;  // beside the rows of `memory`
    std::vector<ReportedStack> stacks;
    HMemorySnapshot leaks;  // `memory` without what stays allocated on purpose
    std::vector<std::string> notes;
};

// The report of one process, or the sum of several: their peaks are added up, so that of a sum is an upper
// bound.
Report MakeReport(const std::vector<const RecordedProcess*>& processes, const RunOptions& options,
                  Symbolizer& symbolizer);

// The report in the form that `options` ask for.
std::string ReportText(const Report& report, const RunOptions& options);

// Several reports of one form in one text: in JSON those of the processes are members of the last, which is
// their sum; CSV and folded stacks have the last only.
std::string ReportsText(const std::vector<Report>& reports, const RunOptions& options);

}  // namespace recorder

#endif

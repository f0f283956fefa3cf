// A run: what the command does from the program's start until its last report.
#ifndef ZANBASE_RECORD_SESSION_H
#define ZANBASE_RECORD_SESSION_H

#include <map>
#include <memory>
#include <vector>

#include "account_file.h"
#include "launch.h"
#include "report.h"

namespace recorder {

class Session {
public:
    Session(const RunOptions& options, AccountFile& file);

    // Waits for the program and, if they are followed, for all processes that it started; makes the reports.
    // Returns the exit status of the command.
    int Run(pid_t program, const HeldSignals& signals);

private:
    using Clock = std::int64_t;  // milliseconds of a clock that never goes back

    void Handle(int signal, const siginfo_t& information);
    void Reap();
    void Look();
    bool MakeReports();
    bool WriteReports(const std::vector<Report>& reports);
    bool IsComplete();
    int Conclude();

    const RunOptions& moOptions;
    AccountFile& moFile;
    Symbolizer moSymbolizer;
    std::map<Position, std::unique_ptr<RecordedProcess>> moProcesses;
    std::vector<RecordedProcess*> maOrder;  // in which they began
    std::map<pid_t, int> moStatuses;        // of the processes that were waited for
    pid_t mnProgram = 0;
    bool mbEnded = false;    // the program, and all that are followed
    bool mbHasNews = false;  // stacks that were not seen before
    std::string moBroken;    // budgets, a line for each
};

}  // namespace recorder

#endif

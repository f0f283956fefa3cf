// A run. The command looks at the accounts from time to time, since the library walks stacks only as far as
// needed once it knows which frames are credited; and it finds files of modules while the program still has
// them.
#include "session.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <sstream>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "budgets.h"

namespace recorder {
namespace {

constexpr std::int64_t kShortestPause = 2;  // milliseconds
constexpr std::int64_t kLongestPause = 100;

std::int64_t NowInMilliseconds() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return std::int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1000000;
}

bool WriteAll(int file, const std::string& text) {
    for (std::size_t written = 0; written < text.size();) {
        const ssize_t step = write(file, text.data() + written, text.size() - written);
        if (step < 0 && errno == EINTR) continue;
        if (step <= 0) return false;
        written += static_cast<std::size_t>(step);
    }
    return true;
}

// A file holds the newest report only. What failed is said.
bool WriteReport(const std::string& path, const std::string& text) {
    if (path.empty()) {
        if (WriteAll(STDERR_FILENO, text)) return true;
        Say(std::string("cannot write the report: ") + std::strerror(errno));
        return false;
    }
    const int file = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    bool written = file >= 0 && WriteAll(file, text);
    int error = errno;
    if (file >= 0 && close(file) != 0 && written) {
        written = false;
        error = errno;
    }
    if (!written) Say("cannot write " + path + ": " + std::strerror(error));
    return written;
}

std::string WithNumber(std::string path, const std::string& number) {
    for (std::size_t at = path.find("%p"); at != std::string::npos; at = path.find("%p", at + number.size()))
        path.replace(at, 2, number);
    return path;
}

}  // namespace

Session::Session(const RunOptions& options, AccountFile& file)
    : moOptions(options), moFile(file), moSymbolizer(options.skipped) {}

int Session::Run(pid_t program, const HeldSignals& signals) {
    mnProgram = program;
    const auto interval = static_cast<std::int64_t>(moOptions.every * 1000);
    std::int64_t next_report = NowInMilliseconds() + interval;
    for (std::int64_t pause = kShortestPause; !mbEnded;) {
        std::int64_t wait = pause;
        if (interval > 0) wait = std::max<std::int64_t>(0, std::min(wait, next_report - NowInMilliseconds()));
        const timespec limit{wait / 1000, wait % 1000 * 1000000};
        siginfo_t information{};
        const int signal = sigtimedwait(&signals.waited(), &information, &limit);
        if (signal > 0) Handle(signal, information);
        mbHasNews = false;
        Look();
        pause = mbHasNews ? kShortestPause : std::min(pause * 2, kLongestPause);
        if (interval == 0 || NowInMilliseconds() < next_report || mbEnded) continue;
        MakeReports();
        next_report += interval;
    }
    return Conclude();
}

// A terminal sends its signals to the program as well; those of a process are passed on.
void Session::Handle(int signal, const siginfo_t& information) {
    if (signal == SIGCHLD) {
        Reap();
    } else if (signal == SIGTERM || signal == SIGHUP || signal == SIGINT || signal == SIGQUIT) {
        if (information.si_code > 0) return;
        if (moStatuses.count(mnProgram) == 0) kill(mnProgram, signal);
        for (const RecordedProcess* const process : maOrder)
            if (moOptions.follow && process->account.process != mnProgram && process->account.ended == 0)
                kill(process->account.process, signal);
    } else {
        Look();
        MakeReports();
    }
}

void Session::Reap() {
    for (;;) {
        int status = 0;
        const pid_t process = waitpid(-1, &status, WNOHANG);
        if (process > 0) {
            moStatuses[process] = status;
            continue;
        }
        if (process < 0 && errno == EINTR) continue;
        mbEnded = moOptions.follow ? process < 0 : moStatuses.count(mnProgram) != 0;
        return;
    }
}

void Session::Look() {
    for (const Position position : moFile.Accounts()) {
        auto& process = moProcesses[position];
        if (process == nullptr) {
            process = std::make_unique<RecordedProcess>();
            maOrder.push_back(process.get());
        }
        moFile.ReadStacks(position, process->account);
        for (const NodeId node : process->stacks.Update(process->account, moSymbolizer)) {
            moFile.MarkStop(position, node);
            mbHasNews = true;
        }
    }
}

// Of processes with one number the last has its status: the others were replaced.
bool Session::MakeReports() {
    std::vector<const RecordedProcess*> processes;
    for (const auto& [position, process] : moProcesses) {
        moFile.Read(position, process->account);
        process->stacks.Update(process->account, moSymbolizer);
    }
    for (RecordedProcess* const process : maOrder) {
        const auto status = moStatuses.find(process->account.process);
        process->waited = status != moStatuses.end();
        if (process->waited) process->wait_status = status->second;
        process->is_gone = mbEnded;
        processes.push_back(process);
    }
    if (processes.empty()) return false;
    std::vector<Report> reports;
    if (processes.size() > 1)
        for (const RecordedProcess* const process : processes)
            reports.push_back(MakeReport({process}, moOptions, moSymbolizer));
    reports.push_back(MakeReport(processes, moOptions, moSymbolizer));
    if (mbEnded) moBroken = BrokenBudgets(moOptions.budgets, reports.back().leaks, reports.back().disk);
    return WriteReports(reports);
}

bool Session::WriteReports(const std::vector<Report>& reports) {
    if (moOptions.output.find("%p") == std::string::npos)
        return WriteReport(moOptions.output, ReportsText(reports, moOptions));
    bool written = true;
    std::map<int, int> parts;  // of a process that was replaced by further programs
    for (const Report& report : reports) {
        std::string number = "sum";
        if (report.processes.size() == 1) {
            number = std::to_string(report.processes.front()->account.process);
            const int part = ++parts[report.processes.front()->account.process];
            if (part > 1) number += "." + std::to_string(part);
        }
        written = WriteReport(WithNumber(moOptions.output, number), ReportText(report, moOptions)) && written;
    }
    return written;
}

// Says what of the program was not recorded; true if nothing.
bool Session::IsComplete() {
    if (maOrder.empty()) {
        Say(moOptions.program.front() + " was not recorded: the loader did not load the recorder into it");
        return false;
    }
    bool is_complete = true;
    for (std::size_t i = 0; i < maOrder.size(); ++i) {
        const ProcessAccount& account = maOrder[i]->account;
        const auto continues = [&](const RecordedProcess* other) {
            return other->account.process == account.process;
        };
        if (account.lost_blocks != 0 || account.lost_files != 0) is_complete = false;
        if (account.end != End::kReplaced) continue;
        if (std::any_of(maOrder.begin() + static_cast<std::ptrdiff_t>(i) + 1, maOrder.end(), continues))
            continue;
        Say("process " + std::to_string(account.process) +
            " was replaced by another program (exec), which was not recorded" +
            (moOptions.follow ? "" : "; --follow records such programs"));
        is_complete = false;
    }
    return is_complete;
}

int Session::Conclude() {
    const bool is_written = MakeReports();
    const int status = moStatuses[mnProgram];
    const int exit_status = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
    if (maOrder.empty() && (exit_status == kCannotRun || exit_status == kCannotRecord)) return exit_status;
    const bool is_complete = IsComplete();
    std::istringstream lines(moBroken);
    for (std::string line; std::getline(lines, line);) Say(line);
    if (WIFSIGNALED(status))
        Say(moOptions.program.front() + " was ended by signal " + std::to_string(WTERMSIG(status)) + " (" +
            strsignal(WTERMSIG(status)) + ")");
    if (exit_status != 0) return exit_status;
    if (!moBroken.empty()) return kBudgetBroke;
    return is_written && (is_complete || !moOptions.budgets.IsSet()) ? 0 : kReportMissing;
}

}  // namespace recorder

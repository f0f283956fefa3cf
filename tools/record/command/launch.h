// Starting a program with the preload library in it.
#ifndef ZANBASE_RECORD_LAUNCH_H
#define ZANBASE_RECORD_LAUNCH_H

#include <csignal>
#include <string>

#include <sys/types.h>

#include "account_file.h"
#include "options.h"

namespace recorder {

// What the command returns where that is not the program's status.
constexpr int kBudgetBroke = 3;
constexpr int kReportMissing = 4;
constexpr int kCannotRecord = 125;
constexpr int kCannotRun = 126;
constexpr int kNotFound = 127;

// Prints a line on standard error.
void Say(const std::string& text);

// The preload library as LD_PRELOAD can name it, with a link in a folder of its own if its path has blanks or
// colons.
class PreloadLibrary {
public:
    PreloadLibrary();  // throws std::runtime_error
    ~PreloadLibrary();
    PreloadLibrary(const PreloadLibrary&) = delete;
    PreloadLibrary& operator=(const PreloadLibrary&) = delete;
    const std::string& path() const { return moPath; }

private:
    std::string moPath;
    std::string moFolder;  // of the link; empty if there is none
};

// Holds back the signals that the command waits for, and undoes that in the program.
class HeldSignals {
public:
    explicit HeldSignals(int report_signal);
    const sigset_t& waited() const { return moWaited; }
    void Release() const;

private:
    sigset_t moWaited{};
    sigset_t moBefore{};
    struct sigaction moChildBefore {};
    struct sigaction moPipeBefore {};
    struct sigaction moSizeBefore {};
};

// Starts the file at `path` in a new process, with what it is to record in `file`. Throws std::runtime_error.
pid_t StartProgram(const std::string& path, const RunOptions& options, const PreloadLibrary& library,
                   const HeldSignals& signals, AccountFile& file);

}  // namespace recorder

#endif

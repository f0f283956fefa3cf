// Running a program with the recorder in it.
#include "run.h"

#include <csignal>
#include <cstdlib>

#include "account_file.h"
#include "checks.h"
#include "launch.h"
#include "session.h"

namespace recorder {
namespace {

// True if nothing of the program can be recorded, which is said.
bool IsRefused(const std::string& path, RunOptions& options) {
    const Recordable recordable = CheckProgram(path);
    if (!recordable.refusal.empty()) Say(recordable.refusal);
    if (!recordable.memory_missing.empty() && options.memory) {
        Say(recordable.memory_missing + ", so memory is not recorded");
        options.memory = false;
    }
    return !recordable.refusal.empty() || (!options.memory && !options.disk);
}

}  // namespace

int RunRecorded(RunOptions options) {
    const FoundProgram found = FindProgram(options.program.front());
    if (found.path.empty()) {
        Say(found.reason);
        return found.exists ? kCannotRun : kNotFound;
    }
    if (IsRefused(found.path, options)) return kCannotRecord;
    if (!options.debuginfod) unsetenv("DEBUGINFOD_URLS");
    const PreloadLibrary library;
    const HeldSignals signals(options.signal != 0 ? options.signal : SIGUSR1);
    AccountFile file;
    const pid_t program = StartProgram(found.path, options, library, signals, file);
    return Session(options, file).Run(program, signals);
}

}  // namespace recorder

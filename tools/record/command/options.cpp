// The command line of zanbase-record.
#include "options.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <utility>

#include <unistd.h>

namespace recorder {

const char kHelp[] =
    "usage: zanbase-record [OPTIONS] [--] PROGRAM [ARGS...]\n"
    "       zanbase-record compare [--tolerance PERCENT] EARLIER.json LATER.json\n"
    "\n"
    "Runs PROGRAM and reports its memory by file and line and its disk operations by file.\n"
    "\n"
    "  --memory, --disk     record only this account\n"
    "  --output FILE        write the report to FILE instead of standard error; %p is the process number\n"
    "  --json, --csv, --folded\n"
    "                       write the report as JSON, CSV or folded stacks (allocated bytes)\n"
    "  --follow             record the processes that PROGRAM starts too\n"
    "  --signal NAME        also report when PROGRAM gets this signal (USR1, HUP, a number...)\n"
    "  --skip FUNCTION      credit what FUNCTION allocates to its caller; can be repeated\n"
    "  --max-leaked BYTES, --max-peak BYTES, --max-calls COUNT, --max-read BYTES, --max-opens COUNT\n"
    "                       budgets, with K, M and G as units\n"
    "\n"
    "The exit status is PROGRAM's, but 3 if that is 0 and a budget broke; 125 if PROGRAM can't be recorded, "
    "126 or\n"
    "127 if it can't be run, 128 and the signal's number if a signal ended it. That of compare is 1 if a "
    "total grew\n"
    "by more than PERCENT (0 without the option), 2 if a report can't be read.\n";

namespace {

long long ReadAmount(const std::string& option, const std::string& text) {
    constexpr std::array<std::pair<const char*, int>, 4> kUnits{{{"", 0}, {"K", 10}, {"M", 20}, {"G", 30}}};
    char* rest = nullptr;
    errno = 0;
    const long long amount = std::strtoll(text.c_str(), &rest, 10);
    const bool is_number = rest != text.c_str() && errno == 0 && amount >= 0;
    for (const auto& [unit, shift] : kUnits) {
        if (is_number && std::strcmp(rest, unit) == 0 &&
            amount <= std::numeric_limits<long long>::max() >> shift)
            return amount << shift;
    }
    throw UsageError(option + " takes a number, such as 4096 or 4K, not '" + text + "'");
}

int ReadSignal(const std::string& text) {
    const std::string name = text.compare(0, 3, "SIG") == 0 ? text.substr(3) : text;
    for (int number = 1; number < SIGRTMIN; ++number) {
        const char* const known = sigabbrev_np(number);
        const bool is_meant = (known != nullptr && name == known) || text == std::to_string(number);
        if (is_meant && number != SIGKILL && number != SIGSTOP) return number;
    }
    throw UsageError("--signal takes a signal that a program can catch, not '" + text + "'");
}

// The program may change its folder before it ends.
std::string AbsolutePath(const std::string& path) {
    if (path.empty()) throw UsageError("--output takes the name of a file");
    if (path[0] == '/') return path;
    char* const folder = getcwd(nullptr, 0);
    const std::string absolute = folder != nullptr ? std::string(folder) + "/" + path : path;
    std::free(folder);
    return absolute;
}

// The options without a value. False if `word` is none of them.
bool ReadFlag(const std::string& word, RunOptions& options) {
    Settings& settings = options.settings;
    if (word == "--memory") {
        settings.memory = true;
    } else if (word == "--disk") {
        settings.disk = true;
    } else if (word == "--json") {
        settings.format = Format::kJson;
    } else if (word == "--csv") {
        settings.format = Format::kCsv;
    } else if (word == "--folded") {
        settings.format = Format::kFolded;
    } else if (word == "--follow") {
        settings.follow = true;
    } else if (word == "--help" || word == "-h") {
        options.help = true;
    } else {
        return false;
    }
    return true;
}

void ReadSetting(const std::string& word, const std::string& value, Settings& settings) {
    Budgets& budgets = settings.budgets;
    const std::array<std::pair<const char*, long long*>, 5> limits{{{"--max-leaked", &budgets.leaked_bytes},
                                                                    {"--max-peak", &budgets.peak_bytes},
                                                                    {"--max-calls", &budgets.allocations},
                                                                    {"--max-read", &budgets.read_bytes},
                                                                    {"--max-opens", &budgets.opens}}};
    for (const auto& [option, limit] : limits) {
        if (word != option) continue;
        *limit = ReadAmount(word, value);
        return;
    }
    if (word == "--output") {
        settings.output = AbsolutePath(value);
    } else if (word == "--skip") {
        settings.skipped_functions.push_back(value);
    } else if (word == "--signal") {
        settings.signal = ReadSignal(value);
    } else {
        throw UsageError("unknown option " + word + "; try --help");
    }
}

}  // namespace

RunOptions ReadRunOptions(const std::vector<std::string>& words) {
    RunOptions options;
    options.settings.memory = false;
    options.settings.disk = false;
    std::size_t at = 0;
    while (at < words.size() && words[at].size() > 1 && words[at][0] == '-') {
        const std::string& word = words[at++];
        if (word == "--") break;
        if (ReadFlag(word, options)) continue;
        ReadSetting(word, at < words.size() ? words[at] : std::string(), options.settings);
        ++at;
    }
    if (!options.settings.memory && !options.settings.disk) {
        options.settings.memory = true;
        options.settings.disk = true;
    }
    if (at < words.size())
        options.program.assign(words.begin() + static_cast<std::ptrdiff_t>(at), words.end());
    if (options.program.empty() && !options.help) throw UsageError("no program to run; try --help");
    return options;
}

CompareOptions ReadCompareOptions(const std::vector<std::string>& words) {
    CompareOptions options;
    std::vector<std::string> files;
    for (std::size_t at = 0; at < words.size(); ++at) {
        if (words[at] != "--tolerance") {
            files.push_back(words[at]);
            continue;
        }
        const std::string text = ++at < words.size() ? words[at] : std::string();
        char* rest = nullptr;
        options.tolerance = std::strtod(text.c_str(), &rest);
        if (text.empty() || *rest != 0 || !(options.tolerance >= 0))
            throw UsageError("--tolerance takes a percentage, not '" + text + "'");
    }
    if (files.size() != 2) throw UsageError("compare takes two reports in JSON; try --help");
    options.earlier = files[0];
    options.later = files[1];
    return options;
}

}  // namespace recorder

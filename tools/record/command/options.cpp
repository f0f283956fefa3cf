// The command line of zanbase-record: one table of options makes what getopt_long reads and what --help
// prints.
#include "options.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <limits>
#include <utility>

#include <getopt.h>
#include <unistd.h>

namespace recorder {
namespace {

constexpr int kLargestStack = 63;

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
    throw UsageError("--" + option + " takes a number, such as 4096 or 4K, not '" + text + "'");
}

double ReadPositive(const std::string& option, const std::string& text, bool may_be_zero) {
    char* rest = nullptr;
    const double number = std::strtod(text.c_str(), &rest);
    if (rest == text.c_str() || *rest != 0 || !(number >= 0) || !(number <= 1e9) ||
        (number == 0 && !may_be_zero))
        throw UsageError("--" + option + " takes a positive number, not '" + text + "'");
    return number;
}

// The command itself waits for these, so those that report its own faults, stop it or end it can't be chosen.
int ReadSignal(const std::string& text) {
    const std::string name = text.compare(0, 3, "SIG") == 0 ? text.substr(3) : text;
    for (int number = 1; number < SIGRTMIN; ++number) {
        const char* const known = sigabbrev_np(number);
        if ((known == nullptr || name != known) && text != std::to_string(number)) continue;
        for (const int choice : {SIGUSR1, SIGUSR2, SIGWINCH, SIGURG, SIGIO, SIGPWR, SIGALRM, SIGVTALRM})
            if (number == choice) return number;
    }
    throw UsageError("--signal takes USR1, USR2 or another signal that programs leave to their users, not '" +
                     text + "'");
}

// The report is written when the program has ended; `path` is relative to the folder that the command was
// started in.
std::string AbsolutePath(const std::string& path) {
    if (path.empty()) throw UsageError("--output takes the name of a file");
    if (path[0] == '/') return path;
    char* const folder = getcwd(nullptr, 0);
    const std::string absolute = folder != nullptr ? std::string(folder) + "/" + path : path;
    std::free(folder);
    return absolute;
}

// Lines "leak:PATTERN", as the leak sanitizer reads them; "#" begins a comment.
void ReadSuppressions(const std::string& path, std::vector<std::string>& patterns) {
    constexpr char kStart[] = "leak:";
    std::ifstream file(path);
    if (!file) throw UsageError("cannot read " + path);
    for (std::string line; std::getline(file, line);) {
        line.erase(line.find_last_not_of(" \t\r") + 1);
        if (line.empty() || line[0] == '#') continue;
        if (line.compare(0, 5, kStart) != 0 || line.size() == 5)
            throw UsageError(path + " has a line that does not begin with leak: and a name: " + line);
        patterns.push_back(line.substr(5));
    }
}

void SetFormat(RunOptions& options, Format format) {
    if (options.format != Format::kTables && options.format != format)
        throw UsageError("a report has one form: --json, --csv or --folded");
    options.format = format;
}

struct Option {
    const char* name;
    char letter;           // 0 for none
    const char* argument;  // null for none
    const char* help;
    void (*apply)(RunOptions& options, const std::string& value);
};

using Value = const std::string&;

const std::array kOptions{
    Option{"memory", 0, nullptr, "record memory only", [](RunOptions& o, Value) { o.memory = true; }},
    Option{"disk", 0, nullptr, "record disk operations only", [](RunOptions& o, Value) { o.disk = true; }},
    Option{"output", 'o', "FILE",
           "write the report to FILE instead of standard error; %p is the process number",
           [](RunOptions& o, Value value) { o.output = AbsolutePath(value); }},
    Option{"json", 0, nullptr, "write the report as JSON",
           [](RunOptions& o, Value) { SetFormat(o, Format::kJson); }},
    Option{"csv", 0, nullptr, "write the report as CSV",
           [](RunOptions& o, Value) { SetFormat(o, Format::kCsv); }},
    Option{"folded", 0, nullptr, "write the stacks of all allocations, folded, with allocated bytes",
           [](RunOptions& o, Value) { SetFormat(o, Format::kFolded); }},
    Option{"stacks", 0, "COUNT", "report up to COUNT callers behind each call site (63 at most)",
           [](RunOptions& o, Value value) {
               const long long count = ReadAmount("stacks", value);
               if (count > kLargestStack)
                   throw UsageError("--stacks takes a number up to 63, not '" + value + "'");
               o.callers = static_cast<int>(count);
           }},
    Option{"follow", 0, nullptr, "record the processes that PROGRAM starts too",
           [](RunOptions& o, Value) { o.follow = true; }},
    Option{"every", 0, "SECONDS", "also report at this interval",
           [](RunOptions& o, Value value) { o.every = ReadPositive("every", value, false); }},
    Option{"signal", 0, "NAME", "also report when zanbase-record gets this signal (USR1 without the option)",
           [](RunOptions& o, Value value) { o.signal = ReadSignal(value); }},
    Option{"skip", 0, "FUNCTION", "credit what FUNCTION allocates to its caller; * stands for any characters",
           [](RunOptions& o, Value value) { o.skipped.push_back(value); }},
    Option{"debuginfod", 0, nullptr, "get missing debug information from the servers of DEBUGINFOD_URLS",
           [](RunOptions& o, Value) { o.debuginfod = true; }},
    Option{"suppress", 0, "FILE",
           "leave out leaks of the functions, files and modules in FILE (lines leak:NAME)",
           [](RunOptions& o, Value value) { ReadSuppressions(value, o.suppressed); }},
    Option{"max-leaked", 0, "BYTES", "budget for bytes that are not freed, with K, M and G as units",
           [](RunOptions& o, Value value) { o.budgets.leaked_bytes = ReadAmount("max-leaked", value); }},
    Option{"max-peak", 0, "BYTES", "budget for bytes that are live at once",
           [](RunOptions& o, Value value) { o.budgets.peak_bytes = ReadAmount("max-peak", value); }},
    Option{"max-calls", 0, "COUNT", "budget for allocations",
           [](RunOptions& o, Value value) { o.budgets.allocations = ReadAmount("max-calls", value); }},
    Option{"max-read", 0, "BYTES", "budget for bytes that are read",
           [](RunOptions& o, Value value) { o.budgets.read_bytes = ReadAmount("max-read", value); }},
    Option{"max-opens", 0, "COUNT", "budget for files that are opened",
           [](RunOptions& o, Value value) { o.budgets.opens = ReadAmount("max-opens", value); }},
    Option{"help", 'h', nullptr, "print this text", [](RunOptions& o, Value) { o.help = true; }},
    Option{"version", 'V', nullptr, "print the version", [](RunOptions& o, Value) { o.version = true; }},
};

// Calls `apply` with each option's index and value; returns the words that follow the options. Throws
// UsageError.
template <class Options, class Apply>
std::vector<std::string> ReadWords(const std::vector<std::string>& words, const Options& table,
                                   bool stops_at_word, const Apply& apply) {
    constexpr int kFirst = 256;
    std::vector<option> longs;
    std::string letters = stops_at_word ? "+:" : ":";
    for (const auto& entry : table) {
        const int has_argument = entry.argument != nullptr ? required_argument : no_argument;
        longs.push_back({entry.name, has_argument, nullptr, kFirst + static_cast<int>(longs.size())});
        if (entry.letter != 0)
            letters += std::string(1, entry.letter) + (entry.argument != nullptr ? ":" : "");
    }
    longs.push_back({});
    std::vector<std::string> copies = words;
    std::string command = "zanbase-record";
    std::vector<char*> pointers{command.data()};
    for (std::string& word : copies) pointers.push_back(word.data());
    const auto count = static_cast<int>(pointers.size());
    pointers.push_back(nullptr);
    optind = 0;  // starts anew
    for (int found = 0;
         (found = getopt_long(count, pointers.data(), letters.c_str(), longs.data(), nullptr)) != -1;) {
        const std::string word = pointers[static_cast<std::size_t>(optind - 1)];
        if (found == '?') throw UsageError("unknown option " + word + "; try --help");
        if (found == ':') throw UsageError(word + " takes a value; try --help");
        std::size_t index = static_cast<std::size_t>(found - kFirst);
        for (std::size_t i = 0; i < table.size(); ++i)
            if (found == table[i].letter) index = i;
        apply(index, optarg != nullptr ? std::string(optarg) : std::string());
    }
    return {pointers.begin() + optind, pointers.end() - 1};
}

}  // namespace

RunOptions ReadRunOptions(const std::vector<std::string>& words) {
    RunOptions options;
    options.memory = false;
    options.disk = false;
    options.program = ReadWords(words, kOptions, true, [&](std::size_t index, const std::string& value) {
        kOptions[index].apply(options, value);
    });
    if (!options.memory && !options.disk) {
        options.memory = true;
        options.disk = true;
    }
    // A suppressed name may be that of any caller.
    if (options.callers == 0 && (options.format == Format::kFolded || !options.suppressed.empty()))
        options.callers = kLargestStack;
    if (options.program.empty() && !options.help && !options.version)
        throw UsageError("no program to run; try --help");
    return options;
}

CompareOptions ReadCompareOptions(const std::vector<std::string>& words) {
    const std::array kTable{Option{"tolerance", 0, "PERCENT", "", nullptr}};
    CompareOptions options;
    const std::vector<std::string> files =
        ReadWords(words, kTable, false, [&](std::size_t /*index*/, const std::string& value) {
            options.tolerance = ReadPositive("tolerance", value, true);
        });
    if (files.size() != 2) throw UsageError("compare takes two reports in JSON; try --help");
    options.earlier = files[0];
    options.later = files[1];
    return options;
}

std::string HelpText() {
    std::string text =
        "usage: zanbase-record [OPTIONS] [--] PROGRAM [ARGS...]\n"
        "       zanbase-record compare [--tolerance PERCENT] EARLIER.json LATER.json\n"
        "\n"
        "Runs PROGRAM and reports its memory by file and line and its disk operations by file.\n"
        "\n";
    for (const Option& entry : kOptions) {
        std::string line = entry.letter != 0 ? std::string("  -") + entry.letter + ", --" : "      --";
        line += entry.name;
        if (entry.argument != nullptr) line += std::string("=") + entry.argument;
        line.resize(std::max<std::size_t>(line.size() + 2, 28), ' ');
        text += line + entry.help + "\n";
    }
    return text +
           "\n"
           "The exit status is PROGRAM's, or 128 and a signal's number if that ended it. Where this would be "
           "0: 3 if a\n"
           "budget broke, 4 if a report could not be written or a budget could not be checked. 125 if "
           "PROGRAM can't be\n"
           "recorded, 126 or 127 if it can't be run. That of compare is 1 if a total grew by more than "
           "PERCENT (0\n"
           "without the option), 2 if a report can't be read.\n";
}

}  // namespace recorder

// zanbase-record: runs a program and reports its memory and disk accounts, or compares two such reports.
#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "compare.h"
#include "options.h"
#include "run.h"

int main(int argc, char** argv) {
    constexpr int kBadCall = 125;
    constexpr int kCannotCompare = 2;
    const std::vector<std::string> words(argv + 1, argv + argc);
    const bool compares = !words.empty() && words.front() == "compare";
    try {
        if (compares)
            return recorder::RunCompare(recorder::ReadCompareOptions({words.begin() + 1, words.end()}));
        const recorder::RunOptions options = recorder::ReadRunOptions(words);
        if (!options.help && !options.version) return recorder::RunRecorded(options);
        const std::string text = options.help ? recorder::HelpText() : "zanbase-record " ZANBASE_VERSION "\n";
        return std::fputs(text.c_str(), stdout) >= 0 && std::fflush(stdout) == 0 ? 0 : kBadCall;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "zanbase-record: %s\n", error.what());
        return compares ? kCannotCompare : kBadCall;
    }
}

// treescan [--threads N] [--top N] [--leak] DIR
//
// Reads every regular file below DIR on several threads and prints files, bytes and lines by extension, the
// largest files, and then what the library recorded meanwhile: disk operations, memory and time. The adapters
// do all the recording. --leak leaves some blocks behind, so that the leak report has rows.
#include <zanbase/adapters/recorded_file.h>
#include <zanbase/adapters/scope_timer.h>
#include <zanbase/adapters/tracked_memory.h>
#include <zanbase/zanbase.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include <unistd.h>

namespace fs = std::filesystem;

namespace {

struct Options {
    int threads = OMPGetMaxThreads();
    int top = 10;  // rows of the tables by size
    bool leak = false;
    const char* dir = nullptr;
};

using Text = std::basic_string<char, std::char_traits<char>, HTrackedAllocator<char>>;

struct File {
    explicit File(Text name) : path(std::move(name)) {}
    Text path;
    unsigned long long bytes = 0, lines = 0;
};

using Files = std::vector<HTrackedPtr<File>>;

struct Counts {
    unsigned long long files = 0, bytes = 0, lines = 0;
    void Add(const File& file) { Add({1, file.bytes, file.lines}); }
    void Add(const Counts& other) {
        files += other.files;
        bytes += other.bytes;
        lines += other.lines;
    }
};

std::atomic<unsigned long long> unreadable{0};

void TellUnreadable(std::string_view path) {
    ++unreadable;
    std::fprintf(stderr, "treescan: cannot read %.*s\n", static_cast<int>(path.size()), path.data());
}

// Collects the regular files below `dir` into `files`; symbolic links are not followed.
void Walk(const fs::path& dir, Files& files) {
    std::error_code error;
    for (fs::directory_iterator entry(dir, error), end; !error && entry != end; entry.increment(error)) {
        const fs::file_status status = entry->symlink_status(error);
        if (error) {
            TellUnreadable(entry->path().u8string());
            error.clear();
        } else if (fs::is_directory(status)) {
            Walk(entry->path(), files);
        } else if (fs::is_regular_file(status)) {
            const std::string path = entry->path().u8string();  // as recorded files take names
            files.push_back(HMakeTracked<File>(HCallSite::Here(), Text(path.c_str(), HCallSite::Here())));
        }
    }
    if (error) TellUnreadable(dir.u8string());
}

unsigned long long CountLines(const char* text, std::size_t size) {
    unsigned long long lines = 0;
    for (const char* const end = text + size; text != end; ++lines, ++text) {
        text = static_cast<const char*>(std::memchr(text, '\n', static_cast<std::size_t>(end - text)));
        if (text == nullptr) break;
    }
    return lines;
}

using Block = std::array<char, std::size_t{256} * 1024>;

// Reads one file to its end through `block` and fills in what was found.
void Read(File& file, Block& block) {
    std::error_code error;
    HRecordedFile stream = HRecordedFile::Open(file.path.c_str(), "rb", error);
    if (error) return TellUnreadable(file.path);
    std::setvbuf(stream.GetNative(), nullptr, _IONBF, 0);
    std::size_t size = block.size();
    while (size == block.size()) {
        size = stream.Read(block.data(), block.size(), error);
        file.bytes += size;
        file.lines += CountLines(block.data(), size);
    }
    if (error) TellUnreadable(file.path);
}

void ShowProgress(std::size_t done, std::size_t all) {
    static const bool on_terminal = isatty(STDERR_FILENO) == 1;
    if (!on_terminal || (done % 256 != 0 && done != all)) return;
    std::fprintf(stderr, "\r%zu of %zu files%s", done, all, done == all ? "\n" : "");
}

void ReadAll(const Files& files, const Options& options) {
    const OMPThreadCount team(options.threads);
    std::atomic<std::size_t> next{0};
#pragma omp parallel
    {
        HTimedRegion("read");
        HTrackedPtr<Block> block = HMakeTracked<Block>(HCallSite::Here());
        for (std::size_t i = next++; i < files.size(); i = next++) {
            Read(*files[i], *block);
            if (OMPGetThreadNum() == 0) ShowProgress(i, files.size());
        }
        if (options.leak) static_cast<void>(block.release());
    }
    ShowProgress(files.size(), files.size());
}

void PrintExtension(const std::string& extension, const Counts& counts) {
    std::printf("%-20s %12llu %16llu %14llu\n", extension.empty() ? "(none)" : extension.c_str(),
                counts.files, counts.bytes, counts.lines);
}

// Files, bytes and lines of the `top` largest extensions and of all others together; as in the library's
// reports the largest comes last.
void PrintExtensions(const Files& files, std::size_t top) {
    std::map<std::string, Counts> table;
    for (const auto& file : files) table[fs::u8path(file->path.c_str()).extension().u8string()].Add(*file);
    std::vector<std::pair<std::string, Counts>> rows(table.begin(), table.end());
    std::stable_sort(rows.begin(), rows.end(), [](const auto& one, const auto& other) {
        return one.second.bytes < other.second.bytes;
    });
    const std::size_t others = rows.size() - std::min(top, rows.size());
    Counts rest;
    for (std::size_t row = 0; row < others; ++row) rest.Add(rows[row].second);
    std::printf("%-20s %12s %16s %14s\n", "Extension", "Files", "Bytes", "Lines");
    if (others != 0) PrintExtension("(" + std::to_string(others) + " others)", rest);
    for (std::size_t row = others; row < rows.size(); ++row)
        PrintExtension(rows[row].first, rows[row].second);
}

void PrintTotals(const Files& files, std::size_t first_of_largest) {
    std::printf("\nLargest files:\n");
    Counts total;
    for (std::size_t i = 0; i < files.size(); ++i) {
        total.Add(*files[i]);
        if (i >= first_of_largest) std::printf("%16llu %s\n", files[i]->bytes, files[i]->path.c_str());
    }
    std::printf("\nfiles: %llu\nbytes: %llu\nlines: %llu\n\n", total.files, total.bytes, total.lines);
}

// A whole number from 1 to 10000, or 0 if `text` is none.
int Number(const char* text) {
    char* end = nullptr;
    const long number = text != nullptr ? std::strtol(text, &end, 10) : 0;
    return text != nullptr && *end == '\0' && number > 0 && number <= 10000 ? static_cast<int>(number) : 0;
}

bool Parse(char** arguments, Options& options) {
    for (; *arguments != nullptr; ++arguments) {
        const std::string argument = *arguments;
        if (argument == "--leak") {
            options.leak = true;
        } else if (argument == "--threads" || argument == "--top") {
            const int number = Number(*++arguments);
            if (number == 0) return false;
            (argument == "--top" ? options.top : options.threads) = number;
        } else if (argument[0] == '-' || options.dir != nullptr) {
            return false;
        } else {
            options.dir = *arguments;
        }
    }
    return options.dir != nullptr;
}

}  // namespace

int main(int, char** argv) {
    Options options;
    if (!Parse(argv + 1, options)) {
        std::fprintf(stderr, "usage: treescan [--threads N] [--top N] [--leak] DIR\n");
        return 2;
    }
    std::error_code error;
    if (fs::directory_iterator(options.dir, error); error) {
        std::fprintf(stderr, "treescan: cannot read %s: %s\n", options.dir, error.message().c_str());
        return 1;
    }
    OMPSetMaxThreads(options.threads);
    const HTimer stopwatch;
    Files files;
    {
        HTimedRegion("walk");
        Walk(options.dir, files);
    }
    ReadAll(files, options);

    std::stable_sort(files.begin(), files.end(),
                     [](const auto& one, const auto& other) { return one->bytes < other->bytes; });
    const auto top = static_cast<std::size_t>(options.top);
    const std::size_t largest = files.size() - std::min(top, files.size());
    PrintExtensions(files, top);
    PrintTotals(files, largest);
    std::fprintf(stderr, "treescan: %s, %llu entries could not be read\n",
                 stopwatch.GetTimeAsString().c_str(), unreadable.load());

    HDiskIOSummaryReport(stdout);
    for (std::size_t i = largest; i < files.size(); ++i)
        HDiskIOReportFile(stdout, std::string(std::string_view(files[i]->path)));
    for (std::size_t i = largest; options.leak && i < files.size(); ++i)
        static_cast<void>(files[i].release());
    files.clear();
    HMemory::UsageReport(stdout);
    HMemory::LeakReport(stdout);
    std::printf(
        "Seconds over all threads:\n");  // the timers print their lines themselves when the process ends
    return 0;
}

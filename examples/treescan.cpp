// treescan [--threads N] [--top N] [--leak] DIR
//
// Reads every regular file below DIR on several threads and prints files, bytes and lines by extension, the
// largest files, and then what the library recorded meanwhile: disk operations, memory and time. It measures
// each disk operation itself and tells the ledger, and it tells the tracker about each block that it takes;
// --leak leaves some of those behind, so that the leak report has rows.
#include <zanbase/zanbase.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <new>
#include <string>
#include <vector>

#include <unistd.h>

namespace fs = std::filesystem;

namespace {

// Takes a block that never is null and tells the tracker who took it; GiveBack tells it that the block went.
#define TAKE(size) Told(HMalloc(size), (size), __FILE__, __LINE__)
#define TAKE_TEXT(text) static_cast<char*>(Told(HString(text), std::strlen(text) + 1, __FILE__, __LINE__))

void* Told(void* block, std::size_t size, const char* file, int line) {
    HMemory::Alloc(block, size, file, line);
    return block;
}

void GiveBack(void* block) {
    HMemory::Free(block);
    std::free(block);
}

struct Options {
    int threads = OMPGetMaxThreads();
    int top = 10;
    bool leak = false;
    const char* dir = nullptr;
};

struct File {
    char* path;  // owned
    unsigned long long bytes, lines;
};

struct Counts {
    unsigned long long files = 0, bytes = 0, lines = 0;
    void Add(const File& file) { ++files, bytes += file.bytes, lines += file.lines; }
};

// One timer a phase; each thread adds to a row of its own.
struct Phase {
    explicit Phase(unsigned long long id) : timer(id) { GlobalTimer::GetInstance().Toggle(timer); }
    ~Phase() { GlobalTimer::GetInstance().Toggle(timer); }
    const unsigned long long timer;
};

std::atomic<unsigned long long> unreadable{0};

void TellUnreadable(const fs::path& path) {
    ++unreadable;
    std::fprintf(stderr, "treescan: cannot read %s\n", path.string().c_str());
}

// Collects the regular files below `dir` into `files`; symbolic links are not followed.
void Walk(const fs::path& dir, std::vector<File*>& files) {
    std::error_code error;
    for (fs::directory_iterator entry(dir, error), end; !error && entry != end; entry.increment(error)) {
        const fs::file_status status = entry->symlink_status(error);
        if (error) {
            TellUnreadable(entry->path());
            error.clear();
        } else if (fs::is_directory(status)) {
            Walk(entry->path(), files);
        } else if (fs::is_regular_file(status)) {
            const std::string path = entry->path().string();
            files.push_back(new (TAKE(sizeof(File))) File{TAKE_TEXT(path.c_str()), 0, 0});
        }
    }
    if (error) TellUnreadable(dir);
}

// Runs a disk operation and passes the seconds that it took to `record`.
template <class Operation, class Record>
auto Measured(Operation operation, Record record) {
    const auto start = std::chrono::steady_clock::now();
    const auto result = operation();
    record(result, std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
    return result;
}

unsigned long long CountLines(const char* text, std::size_t size) {
    unsigned long long lines = 0;
    for (const char* const end = text + size; text != end; ++lines, ++text) {
        text = static_cast<const char*>(std::memchr(text, '\n', static_cast<std::size_t>(end - text)));
        if (text == nullptr) break;
    }
    return lines;
}

constexpr std::size_t kBlockBytes = 256 * 1024;

// Reads one file to its end through `block`, tells the ledger, and fills in what was found. The handle in the
// ledger is the record's address: unlike the stream's, no other thread can get the same while this one still
// tells.
void Read(File& file, char* block) {
    std::FILE* const stream = Measured([&] { return std::fopen(file.path, "rb"); },
                                       [&](std::FILE* opened, double seconds) {
                                           if (opened != nullptr) HDiskIOOpen(file.path, &file, seconds);
                                       });
    if (stream == nullptr) return TellUnreadable(file.path);
    std::setvbuf(stream, nullptr, _IONBF, 0);
    std::size_t size = kBlockBytes;
    while (size == kBlockBytes) {
        size = Measured([&] { return std::fread(block, 1, kBlockBytes, stream); },
                        [&](std::size_t got, double seconds) { HDiskIORead(&file, got, seconds); });
        file.bytes += size;
        file.lines += CountLines(block, size);
    }
    if (std::ferror(stream) != 0) TellUnreadable(file.path);
    Measured([&] { return std::fclose(stream); }, [&](int, double seconds) { HDiskIOClose(&file, seconds); });
}

void ShowProgress(std::size_t done, std::size_t all) {
    static const bool on_terminal = isatty(STDERR_FILENO) == 1;
    if (!on_terminal || (done % 256 != 0 && done != all)) return;
    std::fprintf(stderr, "\r%zu of %zu files%s", done, all, done == all ? "\n" : "");
}

void ReadAll(const std::vector<File*>& files, const Options& options, unsigned long long timer) {
    const OMPThreadCount team(options.threads);
    std::atomic<std::size_t> next{0};
#pragma omp parallel
    {
        const Phase phase(timer);
        char* const block = static_cast<char*>(TAKE(kBlockBytes));
        for (std::size_t i = next++; i < files.size(); i = next++) {
            Read(*files[i], block);
            if (OMPGetThreadNum() == 0) ShowProgress(i, files.size());
        }
        if (!options.leak) GiveBack(block);
    }
    ShowProgress(files.size(), files.size());
}

// Files, bytes and lines by extension; as in the library's reports the largest comes last.
void PrintExtensions(const std::vector<File*>& files) {
    std::map<std::string, Counts> table;
    for (const File* file : files) table[fs::path(file->path).extension().string()].Add(*file);
    std::vector<std::pair<std::string, Counts>> rows(table.begin(), table.end());
    std::stable_sort(rows.begin(), rows.end(), [](const auto& one, const auto& other) {
        return one.second.bytes < other.second.bytes;
    });
    std::printf("%-20s %12s %16s %14s\n", "Extension", "Files", "Bytes", "Lines");
    for (const auto& [extension, counts] : rows) {
        std::printf("%-20s %12llu %16llu %14llu\n", extension.empty() ? "(none)" : extension.c_str(),
                    counts.files, counts.bytes, counts.lines);
    }
}

// The `count` files with the most bytes, the largest last.
std::vector<File*> TakeLargest(std::vector<File*> files, std::ptrdiff_t count) {
    std::stable_sort(files.begin(), files.end(),
                     [](const File* one, const File* other) { return one->bytes < other->bytes; });
    return {files.end() - std::min(count, files.end() - files.begin()), files.end()};
}

void PrintTotals(const std::vector<File*>& files, const std::vector<File*>& largest) {
    std::printf("\nLargest files:\n");
    for (const File* file : largest) std::printf("%16llu %s\n", file->bytes, file->path);
    Counts total;
    for (const File* file : files) total.Add(*file);
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
    GlobalTimer& timers = GlobalTimer::GetInstance();
    const HTimer stopwatch;
    std::vector<File*> files;
    {
        const Phase phase(timers.RegisterNewTimer("walk"));
        Walk(options.dir, files);
    }
    ReadAll(files, options, timers.RegisterNewTimer("read"));

    PrintExtensions(files);
    const std::vector<File*> largest = TakeLargest(files, options.top);
    PrintTotals(files, largest);
    std::fprintf(stderr, "treescan: %s, %llu entries could not be read\n",
                 stopwatch.GetTimeAsString().c_str(), unreadable.load());

    HDiskIOSummaryReport(stdout);
    for (const File* file : largest) HDiskIOReportFile(stdout, file->path);
    for (File* file : files) {
        if (options.leak && std::find(largest.begin(), largest.end(), file) != largest.end()) continue;
        GiveBack(file->path);
        GiveBack(file);
    }
    HMemory::UsageReport(stdout);
    HMemory::LeakReport(stdout);
    std::printf(
        "Seconds over all threads:\n");  // the timers print their lines themselves when the process ends
    return 0;
}

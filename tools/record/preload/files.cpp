// The disk account. Records are found by device, inode and the spelling of the name, which costs one fstat; a
// record gets its name from the kernel when it is made. Rows of one name are added up in the report.
#include "files.h"

#include <atomic>
#include <climits>
#include <cstdio>
#include <cstring>
#include <ctime>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "pool.h"
#include "recording.h"
#include "spin_lock.h"
#include "thread_state.h"

namespace recorder {
namespace {

constexpr std::size_t kMarksOfPage = 1024;
constexpr std::size_t kMarkPages = 1024;
constexpr std::size_t kChains = 4096;

using Mark = std::atomic<FileRecord*>;  // null: not looked at yet
FileRecord gNoFile{};                   // the mark of what is no regular file
std::array<std::atomic<Mark*>, kMarkPages> gMarks;

SpinLock gLock;  // guards the chains; records never leave them
std::array<FileRecord*, kChains> gChains;

// Null if the number is out of range or memory ran out.
Mark* MarkOf(int descriptor) {
    const auto number = static_cast<std::size_t>(descriptor);
    if (descriptor < 0 || number >= kMarksOfPage * kMarkPages) return nullptr;
    std::atomic<Mark*>& page = gMarks[number / kMarksOfPage];
    Mark* marks = page.load(std::memory_order_acquire);
    if (marks == nullptr) {
        const InsideScope scope;
        auto* const fresh = static_cast<Mark*>(TakeFromPool(kMarksOfPage * sizeof(Mark)));
        if (fresh == nullptr) return nullptr;
        if (page.compare_exchange_strong(marks, fresh, std::memory_order_acq_rel)) marks = fresh;
    }
    return &marks[number % kMarksOfPage];
}

// The C library's fstat looks up an empty path, which takes twice as long.
bool ReadStatus(int descriptor, struct stat& status) { return syscall(SYS_fstat, descriptor, &status) == 0; }

std::uint64_t HashText(const char* text) {
    std::uint64_t hash = 14695981039346656037U;
    for (; text != nullptr && *text != 0; ++text)
        hash = (hash ^ static_cast<unsigned char>(*text)) * 1099511628211U;
    return hash;
}

// The name that the kernel has for `descriptor`, in `name`; empty if it has none.
void ReadName(int descriptor, std::array<char, PATH_MAX>& name) {
    std::array<char, 40> link{};
    std::snprintf(link.data(), link.size(), "/proc/self/fd/%d", descriptor);
    const long length = syscall(SYS_readlinkat, AT_FDCWD, link.data(), name.data(), name.size() - 1);
    name[length < 0 ? 0 : static_cast<std::size_t>(length)] = 0;
}

FileRecord* MakeRecord(int descriptor, const char* path) {
    std::array<char, PATH_MAX> name{};
    ReadName(descriptor, name);
    if (std::strncmp(name.data(), "/memfd:", 7) == 0) return nullptr;  // no disk behind it
    const char* const text = name[0] != 0 || path == nullptr ? name.data() : path;
    const std::size_t bytes = std::strlen(text) + 1;
    auto* const record = static_cast<FileRecord*>(TakeFromPool(sizeof(FileRecord)));
    auto* const kept = static_cast<char*>(TakeFromPool(bytes));
    if (record == nullptr || kept == nullptr) return nullptr;
    std::memcpy(kept, text, bytes);
    record->name = kept;
    return record;
}

// The record of the regular file that is open as `descriptor`, or null.
FileRecord* FindRecord(int descriptor, const char* path) {
    struct stat status {};
    if (!ReadStatus(descriptor, status) || !S_ISREG(status.st_mode)) return nullptr;
    const std::uint64_t spelling = HashText(path);
    FileRecord*& chain = gChains[(status.st_ino * 31 + spelling) % kChains];
    const SpinLockScope lock(gLock);
    for (FileRecord* file = chain; file != nullptr; file = file->next)
        if (file->inode == status.st_ino && file->device == status.st_dev && file->spelling == spelling)
            return file;
    FileRecord* const file = MakeRecord(descriptor, path);
    if (file == nullptr) return nullptr;
    file->device = status.st_dev;
    file->inode = status.st_ino;
    file->spelling = spelling;
    file->next = chain;
    chain = file;
    return file;
}

FileRecord* LookAt(int descriptor, Mark& mark, const char* path) {
    const InsideScope scope;
    FileRecord* const file = FindRecord(descriptor, path);
    if (!IsVforkChild()) mark.store(file != nullptr ? file : &gNoFile, std::memory_order_release);
    return file;
}

}  // namespace

FileRecord* FileOf(int descriptor) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr) return nullptr;
    FileRecord* file = mark->load(std::memory_order_acquire);
    if (file == nullptr) {
        file = LookAt(descriptor, *mark, nullptr);
        // An open that is under way counts itself.
        const bool counts = !gThread.opening && !IsVforkChild();
        if (file != nullptr && counts) CountOperation(*file, DiskOperation::kOpen, 0, 0);
    }
    return file == &gNoFile ? nullptr : file;
}

void CountOperation(FileRecord& file, DiskOperation operation, std::uint64_t bytes,
                    std::uint64_t nanoseconds) {
    OperationCounters& counters = file.counters[static_cast<std::size_t>(operation)];
    counters.count.fetch_add(1, std::memory_order_relaxed);
    counters.nanoseconds.fetch_add(nanoseconds, std::memory_order_relaxed);
    if (bytes != 0) counters.bytes.fetch_add(bytes, std::memory_order_relaxed);
}

void CountOpen(int descriptor, const char* path, std::uint64_t nanoseconds) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr) return;
    FileRecord* const file = LookAt(descriptor, *mark, path);
    if (file != nullptr) CountOperation(*file, DiskOperation::kOpen, 0, nanoseconds);
}

FileRecord* ForgetDescriptor(int descriptor) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr || mark->load(std::memory_order_acquire) == nullptr) return nullptr;
    if (IsVforkChild()) return nullptr;
    FileRecord* const file = mark->exchange(nullptr, std::memory_order_acq_rel);
    return file == &gNoFile ? nullptr : file;
}

void CopyDescriptor(int descriptor, int copy) {
    FileRecord* const file = FileOf(descriptor);
    Mark* const mark = MarkOf(copy);
    if (mark == nullptr || IsVforkChild()) return;
    mark->store(file != nullptr ? file : &gNoFile, std::memory_order_release);
}

// The first numbers cover what programs are started with in practice; a look costs less than reading the
// folder.
void MarkInheritedDescriptors() {
    constexpr int kLooked = 10;
    for (int descriptor = 0; descriptor < kLooked; ++descriptor) {
        Mark* const mark = MarkOf(descriptor);
        struct stat status {};
        if (mark == nullptr || mark->load() != nullptr || !ReadStatus(descriptor, status)) continue;
        LookAt(descriptor, *mark, nullptr);
    }
}

std::uint64_t Now() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::uint64_t>(now.tv_sec) * 1000000000U + static_cast<std::uint64_t>(now.tv_nsec);
}

std::vector<NamedSums> ListFiles() {
    std::vector<NamedSums> files;
    const SpinLockScope lock(gLock);
    for (FileRecord* const chain : gChains) {
        for (FileRecord* file = chain; file != nullptr; file = file->next) {
            files.push_back({file->name, {}});
            for (std::size_t i = 0; i < kDiskOperations; ++i) {
                const OperationCounters& counters = file->counters[i];
                files.back().sums[i] = {counters.count, counters.nanoseconds, counters.bytes};
            }
        }
    }
    return files;
}

void ResetFilesInChild() {
    gLock.Release();
    for (FileRecord* const chain : gChains) {
        for (FileRecord* file = chain; file != nullptr; file = file->next) {
            for (OperationCounters& counters : file->counters) {
                counters.count = 0;
                counters.nanoseconds = 0;
                counters.bytes = 0;
            }
        }
    }
}

}  // namespace recorder

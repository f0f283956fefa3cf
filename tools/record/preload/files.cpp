// The disk account. Rows are found by device, inode and the name that was opened, which costs one fstat; a
// row gets its name from the kernel when it is made. Rows of one name are added up in the report.
#include "files.h"

#include <climits>
#include <cstdio>
#include <cstring>
#include <ctime>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "recording.h"
#include "shared_memory.h"
#include "spin_lock.h"

namespace recorder {
namespace {

constexpr std::size_t kMarksOfPage = 1024;
constexpr std::size_t kMarkPages = 1024;
constexpr unsigned int kFirstBits = 9;

using Mark = std::atomic<std::uint32_t>;  // a row's number and 2, or one of these
constexpr std::uint32_t kUnknown = 0;
constexpr std::uint32_t kNoFile = 1;
constexpr std::uint32_t kFirstMark = 2;
std::array<std::atomic<Mark*>, kMarkPages> gMarks;

struct Key {
    std::uint64_t device;
    std::uint64_t inode;
    std::uint64_t name;  // a hash of what was opened
    std::uint64_t mark;  // 0 in an empty slot
};

// Open hashing with linear probing; guarded by gLock, as is the adding of rows.
SpinLock gLock;
Key* gKeys = nullptr;
unsigned int gKeyBits = 0;
using Rows = TableRows<decltype(Account::files)>;
std::array<Rows, 2> gTables;
Rows* gRows = gTables.data();  // a forked child takes the other one, which is empty

// Null if the number is out of range or memory ran out.
Mark* MarkOf(int descriptor) {
    const auto number = static_cast<std::size_t>(descriptor);
    if (descriptor < 0 || number >= kMarksOfPage * kMarkPages) return nullptr;
    std::atomic<Mark*>& page = gMarks[number / kMarksOfPage];
    Mark* marks = page.load(std::memory_order_acquire);  // pairs with the exchange below
    if (marks == nullptr) {
        const RecursionGuard guard;
        auto* const fresh = static_cast<Mark*>(MapPages(kMarksOfPage * sizeof(Mark), true));
        if (fresh == nullptr) return nullptr;
        if (page.compare_exchange_strong(marks, fresh, std::memory_order_acq_rel)) marks = fresh;
    }
    return &marks[number % kMarksOfPage];
}

FileRow* RowOf(std::uint32_t mark) { return mark < kFirstMark ? nullptr : gRows->Find(mark - kFirstMark); }

std::uint64_t HashText(const char* text) {
    std::uint64_t hash = 14695981039346656037U;
    for (; text != nullptr && *text != 0; ++text)
        hash = (hash ^ static_cast<unsigned char>(*text)) * 1099511628211U;
    return hash;
}

Key& SlotOf(const Key& key) {
    const std::size_t mask = (std::size_t{1} << gKeyBits) - 1;
    const std::uint64_t hash = (key.inode * 31 + key.device) ^ key.name;
    for (std::size_t slot = hash * 0x9e3779b97f4a7c15 >> (64 - gKeyBits);; slot = (slot + 1) & mask) {
        const Key& found = gKeys[slot];
        if (found.mark == 0 ||
            (found.inode == key.inode && found.device == key.device && found.name == key.name))
            return gKeys[slot];
    }
}

bool HasRoom(std::uint64_t rows) {
    if (gKeys != nullptr && rows < (std::uint64_t{1} << gKeyBits) / 2) return true;
    const Key* const old = gKeys;
    const std::size_t old_slots = old == nullptr ? 0 : std::size_t{1} << gKeyBits;
    const unsigned int bits = old == nullptr ? kFirstBits : gKeyBits + 1;
    auto* const keys = static_cast<Key*>(MapPages(sizeof(Key) << bits));
    if (keys == nullptr) return gKeys != nullptr && rows + 1 < old_slots;
    gKeys = keys;
    gKeyBits = bits;
    for (std::size_t slot = 0; slot < old_slots; ++slot)
        if (old[slot].mark != 0) SlotOf(old[slot]) = old[slot];
    if (old != nullptr) UnmapPages(const_cast<Key*>(old), old_slots * sizeof(Key));
    return true;
}

// The name that the kernel has for `descriptor`, or else the one that it was opened by. Empty if there is no
// disk behind it.
TextPlace KeepName(int descriptor, const char* path) {
    std::array<char, PATH_MAX> name{};
    std::array<char, 40> link{};
    long length = 0;
    if (!gIsConfined) {
        std::snprintf(link.data(), link.size(), "/proc/self/fd/%d", descriptor);
        length = syscall(SYS_readlinkat, AT_FDCWD, link.data(), name.data(), name.size());
    }
    if (length > 0 && std::strncmp(name.data(), "/memfd:", 7) == 0) return {};
    if (length > 0) return KeepText(name.data(), static_cast<std::size_t>(length));
    return path == nullptr ? TextPlace{} : KeepText(path, std::strlen(path));
}

// Adds a row; the mark that leads to it, or kNoFile. Requires: the lock.
std::uint32_t AddRow(const TextPlace& name) {
    Account& account = *gAccount;
    const std::uint64_t number = account.files.count.load(std::memory_order_relaxed);
    FileRow* const row = gRows->Make(account.files, number);
    if (row == nullptr) {
        AddTo(account.lost_files, std::uint64_t{1});
        return kNoFile;
    }
    row->name = name;
    account.files.count.store(number + 1, std::memory_order_release);  // pairs with the command's CountOf
    return static_cast<std::uint32_t>(number) + kFirstMark;
}

// The C library's fstat takes twice as long, because it looks up an empty path; but its system call is the
// one that programs with a filter allow.
bool ReadStatus(int descriptor, struct stat& status) {
    return (gIsConfined ? fstat(descriptor, &status) : syscall(SYS_fstat, descriptor, &status)) == 0;
}

// The mark of the file with that very name in this account, whose row is added if need be.
std::uint32_t MarkFor(const TextPlace& name) {
    const std::uint64_t count = gAccount->files.count;
    for (std::uint64_t row = 0; row < count; ++row) {
        const FileRow* const file = gRows->Find(row);
        if (file != nullptr && file->name.position == name.position)
            return static_cast<std::uint32_t>(row) + kFirstMark;
    }
    return AddRow(name);
}

// The mark for what is open as `descriptor`.
std::uint32_t FindMark(int descriptor, const char* path) {
    struct stat status {};
    if (!ReadStatus(descriptor, status) || !S_ISREG(status.st_mode)) return kNoFile;
    Key key{status.st_dev, status.st_ino, HashText(path), 0};
    const SpinLockScope lock(gLock);
    if (!HasRoom(gAccount->files.count.load(std::memory_order_relaxed))) {
        AddTo(gAccount->lost_files, std::uint64_t{1});
        return kNoFile;
    }
    Key& slot = SlotOf(key);
    if (slot.mark != 0) return static_cast<std::uint32_t>(slot.mark);
    const TextPlace name = KeepName(descriptor, path);
    if (name.bytes == 0) return kNoFile;
    key.mark = AddRow(name);
    if (key.mark != kNoFile) slot = key;
    return static_cast<std::uint32_t>(key.mark);
}

FileRow* LookAt(int descriptor, Mark& mark, const char* path) {
    const RecursionGuard guard;
    const std::uint32_t found = FindMark(descriptor, path);
    if (!gThread.in_vfork) mark.store(found, std::memory_order_release);
    return RowOf(found);
}

}  // namespace

FileRow* FileOf(int descriptor) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr) return nullptr;
    const std::uint32_t known = mark->load(std::memory_order_acquire);  // pairs with every store to a mark
    if (known != kUnknown) return RowOf(known);
    FileRow* const file = LookAt(descriptor, *mark, nullptr);
    // An open that is under way counts itself.
    if (file != nullptr && !gThread.opening && !gThread.in_vfork)
        CountOperation(*file, DiskOperation::kOpen, 0, 0);
    return file;
}

void CountOperation(FileRow& file, DiskOperation operation, std::uint64_t bytes, std::uint64_t nanoseconds) {
    OperationCounters& counters = file.counters[static_cast<std::size_t>(operation)];
    counters.count.fetch_add(1, std::memory_order_relaxed);
    counters.nanoseconds.fetch_add(nanoseconds, std::memory_order_relaxed);
    if (bytes != 0) counters.bytes.fetch_add(bytes, std::memory_order_relaxed);
}

void CountOpen(int descriptor, const char* path, std::uint64_t nanoseconds) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr) return;
    FileRow* const file = LookAt(descriptor, *mark, path);
    if (file != nullptr) CountOperation(*file, DiskOperation::kOpen, 0, nanoseconds);
}

FileRow* ForgetDescriptor(int descriptor) {
    Mark* const mark = MarkOf(descriptor);
    if (mark == nullptr || gThread.in_vfork || mark->load(std::memory_order_acquire) == kUnknown)
        return nullptr;
    return RowOf(mark->exchange(kUnknown, std::memory_order_acq_rel));
}

void CopyDescriptor(int descriptor, int copy) {
    FileOf(descriptor);
    const Mark* const from = MarkOf(descriptor);
    Mark* const to = MarkOf(copy);
    if (from == nullptr || to == nullptr || gThread.in_vfork) return;
    to->store(from->load(std::memory_order_relaxed), std::memory_order_release);
}

// The first numbers cover what programs are started with in practice; a look costs less than reading the
// folder.
void MarkInheritedDescriptors() {
    constexpr int kLooked = 10;
    for (int descriptor = 0; descriptor < kLooked; ++descriptor) {
        Mark* const mark = MarkOf(descriptor);
        struct stat status {};
        if (mark != nullptr && mark->load() == kUnknown && ReadStatus(descriptor, status))
            LookAt(descriptor, *mark, nullptr);
    }
}

std::uint64_t Now() {
    if (gHasNoClock) return 0;
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::uint64_t>(now.tv_sec) * 1000000000U + static_cast<std::uint64_t>(now.tv_nsec);
}

// The child has its own descriptors, and rows for those only; the table of names was not copied to it.
void ResetFiles(const Account& parent) {
    Rows& old = *gRows;
    gRows = &gTables[gRows == gTables.data() ? 1 : 0];
    gKeys = nullptr;
    gLock.Release();
    for (std::atomic<Mark*>& page : gMarks) {
        Mark* const marks = page.load(std::memory_order_relaxed);
        for (std::size_t i = 0; marks != nullptr && i < kMarksOfPage; ++i) {
            const std::uint32_t mark = marks[i].load(std::memory_order_relaxed);
            const FileRow* const file = mark < kFirstMark ? nullptr : old.Find(mark - kFirstMark);
            if (file != nullptr) marks[i] = MarkFor(file->name);
        }
    }
    old.Reset(parent.files.count);
}

}  // namespace recorder

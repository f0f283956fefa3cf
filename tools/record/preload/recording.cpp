// From the environment that the command made, or from the parent's memory after a fork, to an account of the
// process.
#include "recording.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "files.h"
#include "shared_memory.h"
#include "stack_nodes.h"

namespace recorder {

__thread ThreadState gThread __attribute__((tls_model("initial-exec"))) = {};
ForkPage gForkPage;
Account* gAccount = nullptr;
Control* gControl = nullptr;
std::atomic<bool> gIsConfined{false};
std::atomic<bool> gHasNoClock{false};
int gOwnDescriptor = -1;

namespace {

std::uint64_t gFileNumber = 0;  // the inode of the command's file

// By system calls of its own: the C library's would be recorded, or look up an empty path.
bool IsFile(int descriptor, std::uint64_t inode) {
    struct stat status {};
    return syscall(SYS_fstat, descriptor, &status) == 0 && status.st_ino == inode;
}

// The command's file, as `value` leads to it: by the descriptor that was inherited, or by way of the
// command's own.
int FindFile(const char* value) {
    int descriptor = -1;
    int command = 0;
    int of_command = 0;
    unsigned long inode = 0;
    if (std::sscanf(value, "%d,%lu,%d,%d", &descriptor, &inode, &command, &of_command) != 4) return -1;
    gFileNumber = inode;
    if (IsFile(descriptor, inode)) return descriptor;
    std::array<char, 64> path{};
    std::snprintf(path.data(), path.size(), "/proc/%d/fd/%d", command, of_command);
    const auto opened = static_cast<int>(syscall(SYS_openat, AT_FDCWD, path.data(), O_RDWR | O_CLOEXEC));
    if (opened < 0) return -1;
    const auto high = static_cast<int>(syscall(SYS_fcntl, opened, F_DUPFD, 500));
    syscall(SYS_close, opened);
    return high >= 0 && IsFile(high, inode) ? high : -1;
}

// Adds an account of this process to the file.
bool AddAccount() {
    Position position = 0;
    Account* const account = TakeAccount(position);
    if (account == nullptr) return false;
    account->process = static_cast<std::int32_t>(syscall(SYS_getpid));
    account->parent = static_cast<std::int32_t>(syscall(SYS_getppid));
    account->started = TimeOfDay();
    gAccount = account;
    Position newest = gControl->newest.load(std::memory_order_relaxed);
    do {
        account->previous = newest;
        // Pairs with the command's load of the newest account.
    } while (!gControl->newest.compare_exchange_weak(newest, position, std::memory_order_release));
    return true;
}

std::uint32_t StateFor(bool has_account) {
    return has_account ? (gControl->wanted & (kMemory | kDisk)) | kDecided : kDecided;
}

std::uint32_t DecideAtStart(const char* value) {
    const int file = value != nullptr ? FindFile(value) : -1;
    if (file < 0) return kDecided;
    gControl = MapControl(file);
    const bool is_followed = gControl != nullptr && (gControl->wanted & kFollow) != 0;
    if (!is_followed) syscall(SYS_close, file);
    if (gControl == nullptr || gControl->magic != kMagic) return kDecided;
    if (is_followed) gOwnDescriptor = file;
    if (!is_followed && syscall(SYS_getpid) != gControl->process) return kDecided;
    // Without this a child could not be distinguished from its parent.
    if (madvise(&gForkPage, sizeof gForkPage, MADV_WIPEONFORK) != 0) return kDecided;
    KeepProgramPath();
    return StateFor(AddAccount());
}

std::uint32_t DecideAfterFork() {
    if ((gControl->wanted & kFollow) == 0) return kDecided;
    const Account& parent = *gAccount;
    ResetSharedMemory();
    if (!AddAccount()) return kDecided;
    gAccount->arguments = parent.arguments;
    // Pairs with the command's load.
    gAccount->argument_bytes.store(parent.argument_bytes, std::memory_order_release);
    ResetNodes(parent);
    ResetBlocks(parent.nodes.count);
    ResetFiles(parent);
    return StateFor(true);
}

}  // namespace

std::uint32_t Decide() {
    if (gForkPage.deciding.exchange(true)) return 0;
    const RecursionGuard guard;
    std::uint32_t state = 0;
    if (gControl != nullptr) {
        state = DecideAfterFork();
    } else if (environ != nullptr) {
        state = DecideAtStart(std::getenv(kFileVariable));
    }
    gForkPage.state.store(state, std::memory_order_relaxed);
    gForkPage.deciding = false;
    return state;
}

void RecordBlock(const void* block, std::size_t size, const Frame& caller) {
    const RecursionGuard guard;
    const Frame& origin = gThread.has_request ? gThread.request : caller;
    gThread.has_request = false;
    gThread.newest = block;
    AddBlock(*gAccount, block, size, NodeOfCaller(*gAccount, origin, gControl->callers));
}

void VacateDescriptor() {
    const auto moved = static_cast<int>(syscall(SYS_fcntl, gOwnDescriptor, F_DUPFD, gOwnDescriptor + 1));
    gOwnDescriptor =
        moved >= 0 ? moved : static_cast<int>(syscall(SYS_fcntl, gOwnDescriptor, F_DUPFD, STDERR_FILENO + 1));
}

void WriteFileValue(char* text) {
    std::snprintf(text, kFileValueBytes, "%d,%lu,%d,%d", gOwnDescriptor,
                  static_cast<unsigned long>(gFileNumber), gControl->command, gControl->file);
}

std::int64_t TimeOfDay() {
    if (gHasNoClock) return 0;
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    return std::int64_t{now.tv_sec} * 1000000000 + now.tv_nsec;
}

}  // namespace recorder

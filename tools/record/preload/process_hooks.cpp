// The hooks of calls that start, replace, limit and end a process, and what the recorder does when it is
// loaded.
#include <csignal>
#include <cstdarg>
#include <cstdlib>
#include <cstring>

#include <dlfcn.h>
#include <linux/seccomp.h>
#include <spawn.h>
#include <sys/prctl.h>
#include <unistd.h>

#include "disk_operation.h"
#include "files.h"
#include "next_function.h"
#include "recording.h"
#include "stack_nodes.h"

namespace recorder {
namespace {

bool IsRecorded() { return (gForkPage.state.load(std::memory_order_relaxed) & (kMemory | kDisk)) != 0; }

void NoteEnd(End end, int status) {
    if (!IsRecorded() || gThread.in_vfork) return;
    gAccount->status = status;
    gAccount->ended = end == End::kNone ? 0 : TimeOfDay();
    gAccount->end.store(end, std::memory_order_release);
}

// The environment for a program that this process starts: that of the caller, and the variables that bring
// the recorder into it, whatever the program did to them. Lives on the stack, as a child of vfork must not
// change other memory.
class Environment {
public:
    explicit Environment(char* const* variables) : mpaVariables(variables) {
        if (gControl == nullptr || (gControl->wanted & kFollow) == 0) return;
        std::size_t count = 0;
        for (; variables != nullptr && variables[count] != nullptr && count < maOwn.size() - 3;) ++count;
        if (count == maOwn.size() - 3) return;  // more than there is room for: as it is
        std::strcpy(maFile.data(), kFileVariable);
        std::strcat(maFile.data(), "=");
        WriteFileValue(maFile.data() + std::strlen(maFile.data()));
        std::strcpy(maPreload.data(), kPreloadVariable);
        std::strcat(maPreload.data(), "=");
        std::strncat(maPreload.data(), gControl->library.data(), gControl->library.size());
        std::size_t used = 0;
        for (std::size_t i = 0; i < count; ++i)
            if (!Is(variables[i], maFile.data()) && !Is(variables[i], maPreload.data()))
                maOwn[used++] = variables[i];
        maOwn[used++] = maPreload.data();
        maOwn[used] = maFile.data();
        mpaVariables = maOwn.data();
    }
    Environment(const Environment&) = delete;
    Environment& operator=(const Environment&) = delete;

    char* const* Get() const { return mpaVariables; }

private:
    // True if both have the same name.
    static bool Is(const char* variable, const char* own) {
        return std::strncmp(variable, own, static_cast<std::size_t>(std::strchr(own, '=') - own + 1)) == 0;
    }

    char* const* mpaVariables;
    std::array<char*, 2048> maOwn{};
    std::array<char, kFileValueBytes + 32> maFile{};
    std::array<char, sizeof(Control::library) + 32> maPreload{};
};

// Calls `real`, which replaces this program and gets the environment; returns what it returns if it can't.
template <class Call>
int Replace(char* const* variables, const Call& real) {
    const Environment environment(variables);
    NoteEnd(End::kReplaced, 0);
    const int result = real(environment.Get());
    NoteEnd(End::kNone, 0);
    return result;
}

// The arguments of a call that lists them one by one, as an array, with a null at the end.
#define ZANBASE_LISTED_ARGUMENTS(first, environment)                                             \
    va_list list;                                                                                \
    va_start(list, first);                                                                       \
    std::size_t count = 1;                                                                       \
    while (va_arg(list, const char*) != nullptr) ++count;                                        \
    va_end(list);                                                                                \
    auto** const arguments = static_cast<char**>(__builtin_alloca((count + 1) * sizeof(char*))); \
    va_start(list, first);                                                                       \
    arguments[0] = const_cast<char*>(first);                                                     \
    for (std::size_t i = 1; i <= count; ++i) arguments[i] = va_arg(list, char*);                 \
    char* const* const variables = (environment) ? va_arg(list, char* const*) : environ;         \
    va_end(list);

void KeepArguments(int count, char** words) {
    std::size_t used = 0;
    for (int i = 0; i < count; ++i) {
        const std::size_t bytes = std::strlen(words[i]) + 1;
        if (used + bytes > gAccount->arguments.size()) break;
        std::memcpy(gAccount->arguments.data() + used, words[i], bytes);
        used += bytes;
    }
    gAccount->argument_bytes.store(static_cast<std::uint32_t>(used), std::memory_order_release);
}

// Programs that are not to be recorded find the environment that they would have had.
void RestoreEnvironment() {
    unsetenv(kFileVariable);
    if (gControl->other_preloads[0] == 0) {
        unsetenv(kPreloadVariable);
    } else {
        setenv(kPreloadVariable, gControl->other_preloads.data(), 1);
    }
}

__attribute__((constructor)) void Start(int count, char** words, char** /*variables*/) {
    const RecursionGuard guard;
    if (gForkPage.state.load(std::memory_order_relaxed) == 0) Decide();
    if (gControl == nullptr) return;
    if ((gControl->wanted & kFollow) == 0) RestoreEnvironment();
    if (!IsRecorded()) return;
    KeepArguments(count, words);
    on_exit([](int status, void* /*unused*/) { NoteEnd(End::kExited, status); }, nullptr);
    if ((gControl->wanted & kDisk) == 0) return;
    MarkInheritedDescriptors();
    gAccount->streams_unseen = HookStreams() ? 0 : 1;
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

ZANBASE_HOOK(int, dlclose, (void* library), noexcept) {
    const int result = next::dlclose(library);
    if (Wants(kMemory)) {
        const RecursionGuard guard;
        RetireUnmappedModules(*gAccount);
    }
    return result;
}

// In the kernel's strict mode the processor's counter is forbidden too, and reading a clock ends the program.
ZANBASE_HOOK(int, prctl, (int option, ...), noexcept) {
    va_list list;
    va_start(list, option);
    unsigned long arguments[4];
    for (unsigned long& argument : arguments) argument = va_arg(list, unsigned long);
    va_end(list);
    if (option == PR_SET_SECCOMP || option == PR_SET_NO_NEW_PRIVS) gIsConfined = true;
    if (option == PR_SET_TSC || (option == PR_SET_SECCOMP && arguments[0] == SECCOMP_MODE_STRICT))
        gHasNoClock = true;
    return next::prctl(option, arguments[0], arguments[1], arguments[2], arguments[3]);
}

// Hooks of functions that don't return.
// NOLINTBEGIN(bugprone-macro-parentheses): where a definition states what it throws
#define ZANBASE_EXIT(name, exceptions)            \
    ZANBASE_NEXT(name, void(int))                 \
    extern "C" void name(int status) exceptions { \
        NoteEnd(End::kExited, status);            \
        next::name(status);                       \
        __builtin_unreachable();                  \
    }
// NOLINTEND(bugprone-macro-parentheses)
ZANBASE_EXIT(_exit, )
ZANBASE_EXIT(_Exit, noexcept)

// Hooks of functions that replace the program or start another. `all` is the environment that it gets.
#define ZANBASE_EXEC(name, parameters, environment, ...)                                        \
    ZANBASE_HOOK(int, name, parameters, noexcept) {                                             \
        return Replace(environment, [&](char* const* all) { return next::name(__VA_ARGS__); }); \
    }
#define ZANBASE_EXEC_LISTED(name, parameters, real, path, has_environment) \
    ZANBASE_HOOK(int, name, parameters, noexcept) {                        \
        ZANBASE_LISTED_ARGUMENTS(first, has_environment)                   \
        return real(path, arguments, variables);                           \
    }
#define ZANBASE_SPAWN(name)                                                                             \
    ZANBASE_HOOK(int, name,                                                                             \
                 (pid_t * process, const char* path, const posix_spawn_file_actions_t* actions,         \
                  const posix_spawnattr_t* attributes, char* const* words, char* const* variables), ) { \
        const Environment environment(variables);                                                       \
        return next::name(process, path, actions, attributes, words, environment.Get());                \
    }
ZANBASE_EXEC(execve, (const char* path, char* const* words, char* const* variables), variables, path, words,
             all)
ZANBASE_EXEC(execvpe, (const char* file, char* const* words, char* const* variables), variables, file, words,
             all)
ZANBASE_EXEC(execveat, (int folder, const char* path, char* const* words, char* const* variables, int flags),
             variables, folder, path, words, all, flags)
ZANBASE_EXEC(fexecve, (int file, char* const* words, char* const* variables), variables, file, words, all)
ZANBASE_HOOK(int, execv, (const char* path, char* const* words), noexcept) {
    return execve(path, words, environ);
}
ZANBASE_HOOK(int, execvp, (const char* file, char* const* words), noexcept) {
    return execvpe(file, words, environ);
}
ZANBASE_EXEC_LISTED(execl, (const char* path, const char* first, ...), execve, path, false)
ZANBASE_EXEC_LISTED(execle, (const char* path, const char* first, ...), execve, path, true)
ZANBASE_EXEC_LISTED(execlp, (const char* path, const char* first, ...), execvpe, path, false)
ZANBASE_SPAWN(posix_spawn)
ZANBASE_SPAWN(posix_spawnp)

extern "C" {

// What the kernel returned to the parent.
__attribute__((used)) pid_t ZanbaseEndVfork(long result) {
    gThread.in_vfork = false;
    if (result >= 0) return static_cast<pid_t>(result);
    errno = static_cast<int>(-result);
    return -1;
}

__attribute__((used)) void ZanbaseBeginVfork() { gThread.in_vfork = true; }

}  // extern "C"

// The child returns first, over the parent's own return address on the stack they share; so the parent keeps
// it in a register across the call, as the C library does.
__asm__(R"(
    .globl vfork
    .type vfork, @function
vfork:
    .cfi_startproc
    endbr64
    sub $8, %rsp
    .cfi_adjust_cfa_offset 8
    call ZanbaseBeginVfork
    add $8, %rsp
    .cfi_adjust_cfa_offset -8
    pop %rdi
    .cfi_adjust_cfa_offset -8
    .cfi_register rip, rdi
    mov $58, %eax
    syscall
    push %rdi
    .cfi_adjust_cfa_offset 8
    .cfi_offset rip, -8
    test %eax, %eax
    jz 1f
    mov %rax, %rdi
    jmp ZanbaseEndVfork
1:  ret
    .cfi_endproc
    .size vfork, . - vfork
)");

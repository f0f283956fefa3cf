// What the back end asks of the build: whether the thread sanitizer is on, and fast thread-local storage.
#ifndef ZANBASE_PLATFORM_LINUX_BUILD_H
#define ZANBASE_PLATFORM_LINUX_BUILD_H

// True if the process runs under the thread sanitizer, also if only the program was built with it.
extern "C" __attribute__((weak)) void __tsan_init();
inline bool IsThreadSanitizerOn() noexcept { return __builtin_expect(__tsan_init != nullptr, 0); }

// A thread-local variable at a fixed offset from the thread pointer: reading it calls nothing, so signal
// handlers may use it. Such variables come from a small reserve of the loader; keep them few.
#define ZANBASE_FAST_THREAD_LOCAL __thread __attribute__((tls_model("initial-exec")))

#endif

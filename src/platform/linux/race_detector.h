// What this back end shows to the thread sanitizer of a program that was built with -fsanitize=thread and
// uses the library. The tool sees instrumented code only: neither these locks nor the lines that call them.
//
// Its functions are weak. The loader finds them in such a program (clang) or in the runtime that it loads
// (g++). Elsewhere they are null and IsThreadSanitizerOn() is false: each operation tests one constant.
#ifndef ZANBASE_PLATFORM_LINUX_RACE_DETECTOR_H
#define ZANBASE_PLATFORM_LINUX_RACE_DETECTOR_H

#include "platform/linux/build.h"

extern "C" {
[[gnu::weak]] void __tsan_func_entry(void* caller);
[[gnu::weak]] void __tsan_func_exit();
[[gnu::weak]] void __tsan_acquire(void* object);
[[gnu::weak]] void __tsan_release(void* object);
[[gnu::weak]] void __tsan_mutex_create(void* lock, unsigned int flags);
[[gnu::weak]] void __tsan_mutex_pre_lock(void* lock, unsigned int flags);
[[gnu::weak]] void __tsan_mutex_post_lock(void* lock, unsigned int flags, int levels);
[[gnu::weak]] int __tsan_mutex_pre_unlock(void* lock, unsigned int flags);
[[gnu::weak]] void __tsan_mutex_post_unlock(void* lock, unsigned int flags);
[[gnu::weak]] void __tsan_mutex_pre_divert(void* lock, unsigned int flags);
[[gnu::weak]] void __tsan_mutex_post_divert(void* lock, unsigned int flags);
}

// Their flags: what the lock is, and how an attempt to acquire it is made and ends.
constexpr unsigned int kTsanReentrant = 1 << 1;
constexpr unsigned int kTsanTry = 1 << 4;
constexpr unsigned int kTsanTryFailed = 1 << 5;

#endif

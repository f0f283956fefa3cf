// The lines that call the library, and happens-before edges, for the thread sanitizer.
#include "platform/race_detector.h"

#include "platform/linux/race_detector.h"

// A program built with clang exports these two functions only if it is linked with the library, and not if it
// loads the library later.
CallerFrame::CallerFrame(void* return_address) noexcept {
    if (__tsan_func_entry != nullptr) __tsan_func_entry(return_address);
}

CallerFrame::~CallerFrame() {
    if (__tsan_func_exit != nullptr) __tsan_func_exit();
}

void NoteRelease(const void* object) noexcept {
    if (IsThreadSanitizerOn()) __tsan_release(const_cast<void*>(object));
}

void NoteAcquire(const void* object) noexcept {
    if (IsThreadSanitizerOn()) __tsan_acquire(const_cast<void*>(object));
}

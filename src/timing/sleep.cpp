// The sleep hook and its default routine, which is used until a caller installs another.
#include "zanbase/sleep.h"

#include <algorithm>
#include <atomic>

#include "platform/clock.h"
#include "platform/race_detector.h"

namespace {

// Waits for at least a tenth of the requested time and at least one tick: the single pause is expected to
// take the rest. The difference of two readings is right across the wrap of the tick count too.
void SleepByTicks(int microseconds) {
    const auto amount = static_cast<unsigned int>(microseconds);
    const unsigned int ticks_to_wait = std::max(amount / 10000, 1U);
    const unsigned int start = ReadTicks();
    do {
        SleepFor(amount / 1000);
    } while (ReadTicks() - start < ticks_to_wait);
}

// Never null. The release of InstallUSleepHook pairs with the acquire of USleep, so that what a caller prepared for its routine is there when it runs.
std::atomic<void (*)(int)> mpfnUSleepHook{SleepByTicks};

}  // namespace

void USleep(int microseconds) {
    if (microseconds <= 0) return;
    const auto hook = mpfnUSleepHook.load(std::memory_order_acquire);
    NoteAcquire(&mpfnUSleepHook);
    hook(microseconds);
}

void InstallUSleepHook(void (*hook)(int)) {
    NoteRelease(&mpfnUSleepHook);
    mpfnUSleepHook.store(hook, std::memory_order_release);
}

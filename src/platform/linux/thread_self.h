// What a thread knows about itself, and the shield under which it can't be ended.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_SELF_H
#define ZANBASE_PLATFORM_LINUX_THREAD_SELF_H

#include "platform/linux/restartable.h"  // the thread sanitizer, too
#include "platform/thread.h"

struct FaultFrame;

// One a thread, all zero at its start. Only the thread itself and its signal handlers use it.
struct Self {
    HNativeThread* mpoBlock;          // null on a thread not started here, and from its last step on
    HNativeThread* mpoAwaited;        // whose end it waits for; counted there as a waiter
    FaultFrame* mpoFrame;             // the innermost one
    volatile unsigned int mnShields;  // while not 0 the thread isn't ended, and its faults are ours
    volatile bool mbEndPending;       // somebody asked for the end while a shield was up
    unsigned int mnNumber;            // 0: not asked for yet
    unsigned int mnExitRounds;        // see OnThreadExit
};

extern ZANBASE_FAST_THREAD_LOCAL Self toSelf;

// Makes the signals of machine faults come to the frames, once for the whole process.
void InstallFaultHandlers() noexcept;

// Ends the calling thread at once: nothing of it runs any more. No shield may be up.
[[noreturn]] void ExitKilledThread() noexcept;

// Keeps the calling thread from being ended for a scope; a request that comes meanwhile is met at its end.
class Shield {
public:
    Shield() noexcept { Raise(); }
    ~Shield() { Drop(); }
    Shield(const Shield&) = delete;
    Shield& operator=(const Shield&) = delete;

    static void Raise() noexcept {
        toSelf.mnShields = toSelf.mnShields + 1;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    static void Drop() noexcept {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toSelf.mnShields = toSelf.mnShields - 1;
        if (__builtin_expect(toSelf.mbEndPending, false) && toSelf.mnShields == 0) ExitKilledThread();
    }
};

#endif

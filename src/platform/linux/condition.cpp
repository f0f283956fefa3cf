// The condition of this system: the algorithm of futex_condition.h in the caller's storage.
#include "platform/condition.h"

#include <new>

#include "platform/linux/futex_condition.h"
#include "platform/linux/futex_system.h"
#include "platform/lock.h"

namespace {

using Condition = FutexCondition<FutexSystem>;
static_assert(sizeof(Condition) <= sizeof(HNativeCondition::storage));

Condition& In(HNativeCondition* condition) noexcept {
    return *std::launder(reinterpret_cast<Condition*>(condition->storage));
}

// One level of a lock that the calling thread holds.
struct OneLevel {
    HNativeLock* mpoLock;
    void Release() const noexcept { ReleaseLock(mpoLock); }
    void Acquire() const noexcept { AcquireLock(mpoLock); }
};

}  // namespace

void InitCondition(HNativeCondition* condition) noexcept { new (condition->storage) Condition; }

bool WaitOnCondition(HNativeCondition* condition, HNativeLock* lock, unsigned int limit_ms) noexcept {
    const OneLevel level{lock};
    if (limit_ms == kForever) return In(condition).Wait(level, nullptr);
    if (limit_ms == 0) {
        level.Release();
        level.Acquire();
        return false;
    }
    const timespec deadline = DeadlineIn(limit_ms);
    return In(condition).Wait(level, &deadline);
}

void SignalCondition(HNativeCondition* condition) noexcept { In(condition).Signal(); }

void BroadcastCondition(HNativeCondition* condition) noexcept { In(condition).Broadcast(); }

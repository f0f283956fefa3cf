// The condition of this system: a condition variable on a critical section. It refers to the stacks of its waiters. A
// timeout may come up to a tick of the system's clock early.
#include "platform/condition.h"

#include "platform/windows/critical_section.h"

static_assert(sizeof(CONDITION_VARIABLE) <= sizeof(HNativeCondition));

namespace {
CONDITION_VARIABLE* In(HNativeCondition* condition) noexcept {
    return reinterpret_cast<CONDITION_VARIABLE*>(condition->storage);
}
}  // namespace

void InitCondition(HNativeCondition* condition) noexcept { InitializeConditionVariable(In(condition)); }

bool WaitOnCondition(HNativeCondition* condition, HNativeLock* lock, unsigned int limit_ms) noexcept {
    if (limit_ms != 0) return SleepConditionVariableCS(In(condition), In(lock), limit_ms) != 0;
    // The system would put the thread into the queue, where a wake-up may find it.
    LeaveCriticalSection(In(lock));
    EnterCriticalSection(In(lock));
    return false;
}

void SignalCondition(HNativeCondition* condition) noexcept { WakeConditionVariable(In(condition)); }

void BroadcastCondition(HNativeCondition* condition) noexcept { WakeAllConditionVariable(In(condition)); }

// HCondVar passes every call to the platform's condition, together with the lock inside the mutex.
#include "zanbase/condition_variable.h"

#include <cstdlib>
#include <new>

#include "locks/milliseconds.h"
#include "platform/compiler.h"
#include "platform/condition.h"
#include "platform/race_detector.h"

HCondVar::HCondVar() : mpoCondition(static_cast<HNativeCondition*>(std::malloc(sizeof(HNativeCondition)))) {
    if (mpoCondition == nullptr) throw std::bad_alloc();
    InitCondition(mpoCondition);
}

HCondVar::~HCondVar() { std::free(mpoCondition); }

void HCondVar::Signal() const { SignalCondition(mpoCondition); }

void HCondVar::Broadcast() const { BroadcastCondition(mpoCondition); }

void HCondVar::Wait(const HMutex& mutex) const {
    const CallerFrame caller(ZANBASE_RETURN_ADDRESS());
    // Without a timeout the result is always true.
    static_cast<void>(WaitOnCondition(mpoCondition, mutex.mpoCriticalSection, kForever));
}

bool HCondVar::TryWait(const HMutex& mutex, double seconds) const {
    const CallerFrame caller(ZANBASE_RETURN_ADDRESS());
    return WaitOnCondition(mpoCondition, mutex.mpoCriticalSection, MillisecondsIn(seconds));
}

// HSemaphore passes every call to the platform's semaphore; HSemaphoreLock releases before it acquires.
#include "zanbase/semaphore.h"

#include "locks/milliseconds.h"
#include "platform/semaphore.h"

HSemaphore::HSemaphore(unsigned int count) : mpoHandle(NewSemaphore(count)) {}

HSemaphore::~HSemaphore() { DeleteSemaphore(mpoHandle); }

void HSemaphore::Lock() const {
    static_cast<void>(AcquireUnit(mpoHandle, kForever));  // without a timeout the result is always true
}

bool HSemaphore::TryLock(double seconds) const { return AcquireUnit(mpoHandle, MillisecondsIn(seconds)); }

void HSemaphore::Unlock() const { ReleaseUnit(mpoHandle); }

HSemaphoreLock::HSemaphoreLock(HSemaphore* semaphore) : mpoSemaphore(semaphore) {
    if (mpoSemaphore != nullptr) mpoSemaphore->Lock();
}

HSemaphoreLock::HSemaphoreLock(const HSemaphoreLock& other) : HSemaphoreLock(other.mpoSemaphore) {}

HSemaphoreLock::~HSemaphoreLock() { HSemaphoreLock::Release(); }

HSemaphoreLock& HSemaphoreLock::operator=(const HSemaphoreLock& other) {
    Reset(
        other.mpoSemaphore);  // the argument is read before anything is released, so self-assignment is safe
    return *this;
}

void HSemaphoreLock::Release() { Reset(nullptr); }

void HSemaphoreLock::Reset(HSemaphore* semaphore) {
    if (mpoSemaphore != nullptr) mpoSemaphore->Unlock();
    mpoSemaphore = semaphore;
    if (mpoSemaphore != nullptr) mpoSemaphore->Lock();
}

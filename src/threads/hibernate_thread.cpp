// HHibernateThread: a flag that says whether a signal counts, and a semaphore that counts them.
#include "zanbase/hibernate_thread.h"

#include "threads/reported_body.h"
#include "zanbase/sleep.h"

static_assert(sizeof(std::atomic<bool>) == sizeof(bool));

HHibernateThread::HHibernateThread() = default;

HHibernateThread::~HHibernateThread() {
    mbStop = true;
    moWakeUp.Unlock();
    constexpr int kMicrosecondsBetweenTests = 1000;
    while (IsRunning()) USleep(kMicrosecondsBetweenTests);
}

bool HHibernateThread::Signal() const {
    HMutexLock lock(&moStateMutex);
    const bool accepted = mbHibernating;
    lock.Release();  // first, or the worker wakes up only to wait for it
    if (accepted) moWakeUp.Unlock();
    return accepted;
}

bool HHibernateThread::IsProcessing() const { return !mbHibernating; }

void HHibernateThread::Run() {
    const auto pass = [](void* thread) { static_cast<HHibernateThread*>(thread)->Process(); };
    while (!mbStop) {
        RunReported("HHibernateThread::Run()", pass, this);
        {
            const HMutexLock lock(&moStateMutex);
            mbHibernating = true;
        }
        // A signal from here on leaves its unit in the semaphore, so none is lost before the sleep.
        moWakeUp.Lock();
        const HMutexLock lock(&moStateMutex);
        mbHibernating = false;
    }
}

// HHibernateThread: a flag decides whether a signal is accepted, and a semaphore counts the accepted ones.
#include "zanbase/hibernate_thread.h"

#include "platform/race_detector.h"
#include "threads/reported_body.h"
#include "zanbase/sleep.h"

static_assert(sizeof(std::atomic<bool>) == sizeof(bool));

HHibernateThread::HHibernateThread() = default;

HHibernateThread::~HHibernateThread() {
    mbStop = true;
    moWakeUp.Unlock();
    constexpr int kMicrosecondsBetweenPolls = 1000;
    while (IsRunning()) USleep(kMicrosecondsBetweenPolls);
}

bool HHibernateThread::Signal() const {
    HMutexLock lock(&moStateMutex);
    const bool accepted = mbHibernating;
    lock.Release();  // before the wake-up: the worker would only wait for the mutex
    if (accepted) moWakeUp.Unlock();
    return accepted;
}

bool HHibernateThread::IsProcessing() const {
    const bool is_hibernating = mbHibernating;
    if (is_hibernating) NoteAcquire(&mbHibernating);
    return !is_hibernating;
}

void HHibernateThread::Run() {
    const auto pass = [](void* thread) { static_cast<HHibernateThread*>(thread)->Process(); };
    while (!mbStop) {
        RunReported("HHibernateThread::Run()", pass, this);
        {
            const HMutexLock lock(&moStateMutex);
            NoteRelease(&mbHibernating);
            mbHibernating = true;
        }
        // A signal between the two leaves its unit in the semaphore, so it is not lost.
        moWakeUp.Lock();
        const HMutexLock lock(&moStateMutex);
        mbHibernating = false;
    }
}

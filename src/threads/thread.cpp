// HThread on the threads of the platform layer, with its messages and priorities.
#include "zanbase/thread.h"

#include "platform/compiler.h"
#include "platform/race_detector.h"
#include "platform/thread.h"
#include "threads/print_line.h"
#include "threads/reported_body.h"

static_assert(sizeof(ThreadSlot) == sizeof(void*));

namespace {

constexpr char kRunName[] = "HThread::_Run_()";

// The platform's level for a priority; values beyond the last count as normal.
int LevelOf(HThreadPriority priority) {
    return static_cast<int>(priority <= HThreadPriorityTimeCritical ? priority : HThreadPriorityNormal);
}

}  // namespace

HThread::HThread(HThreadPriority priority) : mnPriority(priority) {}

HThread::HThread(const HThread&) : HThread() {}

HThread::~HThread() = default;

HThread& HThread::operator=(const HThread&) { return *this; }

bool HThread::Start(bool) {
    if (IsRunning()) return false;
    const CallerFrame caller(ZANBASE_RETURN_ADDRESS());
    // Not _Run_, because the object may own another thread when this one ends. The platform layer empties
    // mpoThread if it still points to this thread: the last access to the object.
    const auto body = [](void* thread) {
        const auto run = [](void* object) { static_cast<HThread*>(object)->Run(); };
        RunReported(kRunName, run, thread);
    };
    if (const int error = StartThread(mpoThread, body, this)) {
        PrintLine("HThread::Start(%p) Error: %s\n", static_cast<void*>(this), SystemErrorText(error).c_str());
        return false;
    }
    const HThreadPriority priority = mnPriority;
    if (priority != HThreadPriorityNormal) SetNativePriority(mpoThread, LevelOf(priority));
    return IsRunning();
}

void HThread::Stop() {}

bool HThread::IsRunning() const {
    const bool is_running = HasThread(mpoThread);
    if (!is_running) NoteAcquire(&mpoThread);
    return is_running;
}

void HThread::Wait() { JoinThread(mpoThread); }

void HThread::Kill() { KillThread(mpoThread); }

void HThread::SetPriority(HThreadPriority priority) {
    if (mnPriority.exchange(priority) != priority) SetNativePriority(mpoThread, LevelOf(priority));
}

unsigned long long HThread::GetCurrentThreadId() { return CurrentThreadId(); }

void HThread::Yield() { YieldThread(); }

void HThread::DestroyThread() { DetachThread(mpoThread); }

void HThread::_Run_(HThread* thread) {
    RunReported(
        kRunName, [](void* object) { static_cast<HThread*>(object)->Run(); }, thread);
    thread->DestroyThread();
}

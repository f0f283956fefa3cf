/// @file
/// A worker thread that makes one pass of work for each signal, and sleeps in between.
#ifndef ZANBASE_HIBERNATE_THREAD_H
#define ZANBASE_HIBERNATE_THREAD_H

#include <atomic>

#include "zanbase/export.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"
#include "zanbase/thread.h"

/// @addtogroup threads
/// @{

/// A worker. A subclass implements `Process`, one pass of work.
///
///     struct Saver : HHibernateThread {
///         void Process() override { SaveWhatChanged(); }
///     };
///     Saver saver;
///     saver.Start(true);
///     const bool will_save = saver.Signal();
///
/// After `Start` the worker makes two passes and then hibernates: it sleeps and uses no processor time. Each
/// accepted signal adds one pass. If an exception escapes `Process`, or a machine fault ends it, one line is
/// printed on standard output and the worker continues as after any other pass (see `HThread` for what a
/// fault leaves behind). It keeps rounding and traps of floating-point operations as the pass has set them. After
/// a fault no exception of the pass is current or uncaught any more; those are not destroyed.
///
/// | Worker      | `IsProcessing` | `Signal`             | Left by                       |
/// |-------------|----------------|----------------------|-------------------------------|
/// | not started | true           | false                | `Start`                       |
/// | in a pass   | true           | false                | the end of the pass           |
/// | hibernating | false          | true, adds one pass  | the pass that a signal added  |
/// | ended       | true           | false                | never; the object is destroyed |
///
/// A signal is not queued: a signal during a pass is dropped, and the caller must handle that. Where every
/// request counts, use a queue with an `HCondVar`.
///
/// The worker runs until its object is destroyed; `Stop` does not stop it. `Kill` terminates it, with all
/// effects that `HThread::Kill` documents. A killed worker leaves the object in the state it was killed in:
/// if that was hibernating, `Signal` still returns true and no pass follows; if it was between two passes,
/// the object's mutex may stay locked, and then `Signal` deadlocks.
///
/// **Lifetime.** Destroy an object only while its worker hibernates and has no pass left to make: the two
/// passes after `Start` and one for each true result of `Signal` are done, and `IsProcessing` returns false.
/// Otherwise the worker may call `Process` after the subclass is destroyed. A subclass that counts its passes
/// can wait for this in its own destructor.
///
/// Thread-safe, as `HThread`.
class ZANBASE_API HHibernateThread : public HThread {
public:
    /// Creates a worker at normal priority. Does not start it.
    HHibernateThread();

    /// Ends the worker and waits for its end, polling once a millisecond by `USleep`. A pass that has begun
    /// is completed first. Returns at once if the worker was never started.
    /// Requires: see Lifetime.
    ~HHibernateThread() override;

    /// Requests one pass. True if the worker was hibernating; one pass runs per true result. Otherwise false,
    /// no effect. Thread-safe.
    bool Signal() const;

    /// False while the worker hibernates, otherwise true, also before `Start`. False may be out of date at once
    /// if another thread calls `Signal` or if a requested pass has not begun yet. Thread-safe.
    [[nodiscard]] bool IsProcessing() const;

protected:
    /// The worker's loop.
    void Run() override;

    /// One pass of work. Called only on the worker thread.
    virtual void Process() = 0;

private:
    std::atomic<bool> mbStop{false};         // written by the destructor; published by moWakeUp
    std::atomic<bool> mbHibernating{false};  // written under moStateMutex; IsProcessing reads it without
    HMutex moStateMutex;
    HSemaphore moWakeUp{1};  // one unit for each pass to make; the initial unit is the second pass
};

/// @}

#endif

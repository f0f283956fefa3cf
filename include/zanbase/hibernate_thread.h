/// @file
/// A worker thread that does one pass of work whenever it is signalled, and sleeps in between.
#ifndef ZANBASE_HIBERNATE_THREAD_H
#define ZANBASE_HIBERNATE_THREAD_H

#include <atomic>

#include "zanbase/export.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"
#include "zanbase/thread.h"

/// A worker: a subclass says in `Process` what one pass of work is.
///
///     struct Saver : HHibernateThread {
///         void Process() override { SaveWhatChanged(); }
///     };
///     Saver saver;
///     saver.Start(true);
///     const bool will_save = saver.Signal();
///
/// After `Start` the worker makes two passes in a row, unasked, and then hibernates: it sleeps without using
/// the processor. Each signal that it accepts makes one pass more. What goes wrong in a pass does not end the
/// worker: for an exception that escapes `Process`, or a machine fault in it, a line goes to standard output,
/// and it hibernates as after any other pass (see `HThread` for what a fault leaves behind).
///
/// | Worker      | `IsProcessing` | `Signal`             | Left by                      |
/// |-------------|----------------|----------------------|------------------------------|
/// | not started | true           | false                | `Start`                      |
/// | in a pass   | true           | false                | the end of the pass          |
/// | hibernating | false          | true, one pass more  | a pass that it owes          |
/// | ended       | true           | false                | not at all: the object goes  |
///
/// A signal is an offer and not an entry in a queue: one made during a pass is dropped, and its sender has to
/// see to that. Where every request counts, take a queue with a `HCondVar`. The worker lives until its object
/// is destroyed; `Stop` does not stop it. `Kill` ends it by force, with all that `HThread::Kill` warns of:
/// between two passes its own mutex may stay locked, and then `Signal` never returns.
///
/// Destroy an object only while its worker is in no pass and owes none: the two after `Start` and one for
/// each true answer of `Signal` are done, and `IsProcessing` gives false. Otherwise the worker may enter
/// `Process` when the subclass is gone. A subclass that counts its passes can wait for that in its own
/// destructor.
class ZANBASE_API HHibernateThread : public HThread {
public:
    /// A worker that is not started, at normal priority.
    HHibernateThread();

    /// Ends the worker and waits for that, testing once a millisecond by `USleep`; the pass it is in, if any,
    /// comes to its end first, and no other follows. An object that was never started goes at once.
    /// The subclass is gone by then: see above for when an object may be destroyed.
    ~HHibernateThread() override;

    /// Offers one pass. True if the worker is hibernating: it will make one pass more, and so many as there
    /// are true answers. False if it isn't: nothing has happened. Any thread, at any time.
    bool Signal() const;

    /// False while the worker hibernates, else true, also before `Start`. A snapshot, which may be out of
    /// date at once: a false as long as the worker owes a pass or somebody signals. Any thread, at any time.
    [[nodiscard]] bool IsProcessing() const;

protected:
    /// The worker's loop of passes and sleeps.
    void Run() override;

    /// One pass of work; called on the worker thread alone.
    virtual void Process() = 0;

private:
    std::atomic<bool> mbStop{false};         // set by the destructor alone; ordered by moWakeUp
    std::atomic<bool> mbHibernating{false};  // guarded by moStateMutex, except that anybody may look
    HMutex moStateMutex;
    HSemaphore moWakeUp{1};  // a unit for each pass that the worker owes; it starts with the second
};

#endif

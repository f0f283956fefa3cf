/// @file
/// The thread object that callers derive from, and the library's notion of which thread is which.
#ifndef ZANBASE_THREAD_H
#define ZANBASE_THREAD_H

#include <atomic>

#include "zanbase/export.h"

struct HNativeThread;

/// How much of a busy processor a thread gets, from least to most. Normal is what the process itself has; a
/// value beyond the last counts as normal. On Linux the values stand for a nice value of the thread, 39, 10
/// and 5 above that of the process and 5, 10 and 39 below, within -20 to 19. The system lets only privileged
/// processes lower it, be it back to normal, and a refusal goes unreported.
enum HThreadPriority : unsigned int {
    HThreadPriorityIdle = 0,
    HThreadPriorityLowest = 1,
    HThreadPriorityBelowNormal = 2,
    HThreadPriorityNormal = 3,
    HThreadPriorityAboveNormal = 4,
    HThreadPriorityHighest = 5,
    HThreadPriorityTimeCritical = 6
};

/// A thread: a subclass says in `Run` what it does, `Start` lets it do that on a thread of its own.
///
///     struct Greeter : HThread {
///         void Run() override { std::puts("hello"); }
///     };
///     Greeter greeter;
///     greeter.Start(true);
///     greeter.Wait();
///
/// An object owns one thread at most. When `Run` has ended, in whatever way, the object is idle and can be
/// started again, also at another priority. An exception that escapes `Run` ends the thread and not the
/// process, and so does a machine fault in it: an access to memory that isn't there, an integer division by
/// zero, an exhausted stack. One line on standard output tells of either. A fault abandons the frames of
/// `Run` as they stand: no destructor runs, locks stay held, and a fault inside `malloc` leaves that locked
/// too. `abort` ends the process as ever, and `pthread_exit` in `Run` ends the thread without a word. A
/// handler for such signals that the program installs after the first start sees the faults first, and has to
/// hand on those of threads like this.
///
/// Any thread may call any operation at any time, except that `Start` must not run twice at once on one
/// object, nor beside `Kill`; of two calls of `SetPriority` at once either may win. The object must outlive
/// its thread, and the destructor does not wait: destroy it only while it is idle. A subclass whose `Run`
/// uses its members has to see the thread end before they go. In the child of a fork every object is idle but
/// that of the thread that forked. For a worker that is woken again and again take `HHibernateThread`; for
/// many short jobs, or one whose result is awaited, a thread each is the wrong tool.
class ZANBASE_API HThread {
public:
    /// An idle object that wants `priority`. Makes no thread.
    HThread(HThreadPriority priority = HThreadPriorityNormal);

    /// Does nothing about the thread.
    virtual ~HThread();

    /// Makes a thread that calls `Run`, at the priority wanted, and returns true if it is still running.
    /// False if there is a thread already, which goes on undisturbed; if `Run` is over already; or if the
    /// system can't make a thread: then a line on standard output says why, and a later call may succeed. The
    /// argument has no effect.
    virtual bool Start(bool);

    /// Does nothing. A subclass may let it ask `Run` to end.
    virtual void Stop();

    /// Whether there is a thread. A false is final until the next `Start`, and all that the thread wrote can
    /// be seen; a true may be out of date at once.
    [[nodiscard]] bool IsRunning() const;

    /// Waits until the thread has ended, with the destructors of its thread-local objects. Any number of
    /// threads may wait. Returns at once if there is no thread, and on the thread itself.
    void Wait();

    /// Ends the thread wherever it stands, and returns when it is gone and the object idle. Nothing of it
    /// runs any more: no destructor, no handler, no exit routine. What it holds stays held for ever, a
    /// `HMutex` for instance, and what it was changing stays half changed. On the thread itself it doesn't
    /// return. A last resort.
    ///
    /// On Linux a signal ends the thread: of the real-time signals the highest but one, or the next below it
    /// that the program has no handler for. What that can't do, and what it breaks:
    ///   - A thread that blocks all signals is ended when it admits them again or has come to its end, and
    ///     the call waits until then. So it does if the program uses every real-time signal.
    ///   - A thread inside the C library may hold a lock there, that of `malloc` or of a stream, which would
    ///     stop every other thread. So it is let out first, which takes microseconds as a rule; one that is
    ///     never found outside for ten seconds, as it fills memory without pause, is ended all the same. A
    ///     wait inside the library counts as outside after ten milliseconds. So a lock of the library can
    ///     stay held if the thread waits for room in a pipe that it writes to by `printf`, or runs in a
    ///     callback that the library makes under a lock, such as that of `dl_iterate_phdr`.
    ///   - Other threads that wait for a `std::condition_variable` together with it may miss their wake-ups
    ///     from then on. Mutexes, the semaphores and the `HCondVar` of this library stay whole.
    ///   - The C library loses the thread's cache of freed blocks: about 0.7 kB, and what the thread has
    ///     freed, up to 234 kB; also 32 bytes for each of its thread-local objects with a destructor.
    ///   - If the initial thread has ended by `pthread_exit`, the process ends without its exit handlers.
    void Kill();

    /// Sets the priority wanted, which lasts over restarts. A running thread takes it at once; nothing
    /// happens if it is the one wanted already.
    void SetPriority(HThreadPriority priority);

    /// The calling thread's number in the system. It never has more than 32 bits, is the same on every call
    /// from one thread, and differs between threads that live at the same time; the system may give the
    /// number of a thread that has ended to a new one. Cheap.
    [[nodiscard]] static unsigned long long GetCurrentThreadId();

protected:
    /// A thread object of its own: idle, at normal priority, whatever the other one is.
    HThread(const HThread&);

    /// Changes nothing.
    HThread& operator=(const HThread&);

    /// What the thread does.
    virtual void Run() = 0;

    /// Lets another thread that is ready run first.
    void(Yield)();

    /// Lets the thread go: the object is idle, the thread runs on without an owner, and touches the object no
    /// more once `Run` is over. Who waits for it already goes on waiting.
    void DestroyThread();

    /// What a new thread does: `Run`, and the line if an exception or a fault ends it.
    static void _Run_(HThread* thread);

private:
    std::atomic<HNativeThread*> mpoThread{
        nullptr};  // null while idle; the thread itself empties it at its end
    std::atomic<HThreadPriority> mnPriority;
};

#endif

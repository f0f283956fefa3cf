/// @file
/// The thread object that callers derive from, and the number of the calling thread.
#ifndef ZANBASE_THREAD_H
#define ZANBASE_THREAD_H

#include <atomic>

#include "zanbase/export.h"

#undef Yield

/// @addtogroup threads
/// @{

struct HNativeThread;

/// How much of a busy processor a thread gets, from least to most. Normal is the priority of the process; a
/// value beyond the last counts as normal. On Linux a priority sets the nice value of the thread: 39, 10 and
/// 5 above that of the process, or 5, 10 and 39 below, clamped to -20 to 19; a nice value that the thread which
/// calls `Start` has set for itself does not count. Only privileged processes may lower a nice value, also back
/// to normal. A refusal is not reported. On Windows the values are the system's own relative priorities, from
/// `THREAD_PRIORITY_IDLE` to `THREAD_PRIORITY_TIME_CRITICAL`, and need no right.
enum HThreadPriority : unsigned int {
    HThreadPriorityIdle = 0,
    HThreadPriorityLowest = 1,
    HThreadPriorityBelowNormal = 2,
    HThreadPriorityNormal = 3,
    HThreadPriorityAboveNormal = 4,
    HThreadPriorityHighest = 5,
    HThreadPriorityTimeCritical = 6
};

/// A thread. A subclass implements `Run`; `Start` calls it on a new thread.
///
///     struct Greeter : HThread {
///         void Run() override { std::puts("hello"); }
///     };
///     Greeter greeter;
///     greeter.Start(true);
///     greeter.Wait();
///
/// An object owns at most one thread. When `Run` has ended, in whatever way, the object is idle and can be
/// started again.
///
/// **Thread safety.** All operations are thread-safe, with one exception: `Start` must not run concurrently
/// with `Start` or `Kill` on the same object. Of two concurrent calls of `SetPriority` either may win.
///
/// **Lifetime.** The object must outlive its thread. The destructor does not wait: destroy the object only
/// while it is idle. A subclass whose `Run` uses its members must wait for the thread before those are
/// destroyed.
///
/// **Exceptions and machine faults.** An exception that escapes `Run` ends the thread and prints one line on
/// standard output. So does a machine fault: an invalid memory access, an integer division by zero, an
/// illegal instruction, an exhausted stack. A fault abandons the frames of `Run` without unwinding them: no
/// destructor runs, and locks stay held. A fault inside `malloc` or `fwrite` leaves the heap or the stream
/// locked; then the next thread that allocates, or uses the stream, deadlocks, as do `fflush(nullptr)` and,
/// after a fault inside a write to `stdout`, `exit`. On Linux:
///   - `Run` must not block SIGSEGV, SIGBUS, SIGFPE or SIGILL: the system ends the process at a fault whose
///     signal is blocked. A mask inherited from the thread that called `Start` does no harm.
///   - A handler for these signals that the program installs after the first `Start` is called first. It must
///     pass on the faults of these threads to the handler that it replaced.
///   - `abort` ends the process. `pthread_exit` in `Run` ends the thread and prints nothing. A thread that
///     calls the raw `exit` system call stays "running" until `Kill`.
///
/// On Windows faults are structured exceptions, those of the floating-point units among them if the program has
/// unmasked them. A handler in `Run` gets them first, and so does a vectored one. A thread that calls `ExitThread` stays
/// "running" until `Wait` or `Kill`. When the process exits, the system ends all other threads before it destroys the
/// static objects of DLLs: `IsRunning` returns false from then on.
///
/// **Fork.** In the child every object is idle, except that of the thread that called `fork`.
///
/// Use `HHibernateThread` for a worker that is woken repeatedly. Don't start a thread for each of many short jobs.
class ZANBASE_API HThread {
public:
    /// Creates an idle object with the given priority. Creates no thread.
    HThread(HThreadPriority priority = HThreadPriorityNormal);

    /// Has no effect on the thread. Requires: the object is idle.
    virtual ~HThread();

    /// Creates a thread that calls `Run`, sets its priority, and returns true if the thread is still running.
    /// Returns false if there is a thread already, which is not affected; if `Run` has ended already; or if
    /// the system can't create a thread. In the last case a line on standard output gives the reason, and a
    /// later call may succeed. The argument has no effect.
    virtual bool Start(bool);

    /// Does nothing. A subclass may override it with a request to end `Run`.
    virtual void Stop();

    /// True if there is a thread. True may be out of date at once. False is final until the next `Start`, and
    /// everything that the thread did happens before.
    [[nodiscard]] bool IsRunning() const;

    /// Waits until the thread has ended, including the destructors of its thread-local objects and of its keys
    /// (`pthread_key_create`), also of those that are set again meanwhile. Any number of threads may wait. Returns
    /// at once if there is no thread, and on the thread itself.
    void Wait();

    /// Terminates the thread asynchronously and returns when it is gone and the object is idle. Returns at
    /// once if there is no thread; does not return on the thread itself. No destructor, handler or exit
    /// routine of the thread runs. What it holds stays held for ever, such as an `HMutex`, or the mutex inside
    /// `HMemory::Alloc` or `MkName`; what it was changing stays half changed. A later `fork` leaves out such a
    /// mutex of the library, the first one after a wait of five seconds, and its child must not use the table that
    /// the mutex guards. Use it only if nothing else is left.
    ///
    /// A thread that has not entered `Run` yet does not enter it.
    ///
    /// On Linux a signal terminates the thread: `SIGURG`, or if the program handles or blocks that at the first
    /// `Start`, the highest real-time signal but one, or the next below it that the program neither handles nor
    /// blocks. Limits and side effects:
    ///   - If the thread blocks all signals, `Kill` waits until it unblocks them or ends. `Kill` also waits
    ///     for the end of the thread if the program has a handler for `SIGURG` and every real-time signal; and
    ///     if it handles `SIGURG`, until the system has room for another signal (`RLIMIT_SIGPENDING`).
    ///   - A thread inside the C or the C++ library may hold a lock there, such as that of `malloc` or of the
    ///     locales. It is terminated once it has left the library, mostly within microseconds. Two limits end
    ///     this delay: ten seconds in all, and ten milliseconds in one system call (one second while a thread
    ///     holds the lock of `stdout` or `stderr`). Then the thread is terminated inside the library. A library
    ///     that is linked statically into the program is not recognised: there the thread is terminated at once.
    ///   - So a thread that waits in a system call can leave these locks held: that of `stdin` in
    ///     `fgets(stdin)` or `getline(cin)`, after which every `fflush(nullptr)` deadlocks; that of a stream in
    ///     `printf` to a full pipe; those of the resolver in `getaddrinfo`. End such a wait before the call,
    ///     for instance by closing the other end of the pipe. A callback of `dl_iterate_phdr` leaves the
    ///     loader's lock held.
    ///   - `setuid` and its kin in other threads are not held up: they signal every thread and wait for all
    ///     answers, and the thread answers before it is gone. The thread that calls one waits in a system call,
    ///     as above: terminated there, it leaves the lock held that starts and ends of threads need.
    ///   - Other threads that wait on a `std::condition_variable` together with the thread may miss wake-ups
    ///     from then on. The mutexes, semaphores and condition variables of this library are not affected.
    ///   - Memory leaks: the thread's cache of freed blocks (0.7 kB, and up to 234 kB that the thread has
    ///     freed), and 32 bytes for each thread-local object with a destructor.
    ///   - If the initial thread has ended by `pthread_exit`, the process ends without its exit handlers.
    ///
    /// On Windows it is `TerminateThread`, which takes effect at once:
    ///   - A thread inside the C runtime or the loader leaves their locks held: the next thread that allocates,
    ///     starts or ends may deadlock.
    ///   - Never kill a thread that waits for an `HMutex` or on an `HCondVar`: the behaviour is undefined. The system
    ///     keeps the waiters in a list on their stacks, so the next wake-up may be lost or may access memory that is
    ///     gone. An `HSemaphore` serves its other waiters.
    ///   - A thread that waits in `Wait` leaves a handle and a small block behind.
    void Kill();

    /// Sets the priority, for the running thread and for later starts. Does nothing if it is set already.
    void SetPriority(HThreadPriority priority);

    /// The system's number of the calling thread. Fits in 32 bits, never changes, and differs between threads
    /// that live at the same time; the system may reuse the number of a thread that has ended. Cheap.
    [[nodiscard]] static unsigned long long GetCurrentThreadId();

protected:
    /// Creates an idle object at normal priority. Takes nothing from the other object.
    HThread(const HThread&);

    /// Does nothing.
    HThread& operator=(const HThread&);

    /// The body of the thread.
    virtual void Run() = 0;

    /// Offers the processor to other threads that are ready. `<windows.h>` defines a macro of this name that makes
    /// calls disappear. This header removes it, so it has to be the later one.
    void Yield();

    /// Detaches the thread. The object becomes idle; the thread does not access it after `Run` returns.
    /// Threads already in `Wait` keep waiting.
    void DestroyThread();

    /// Calls `Run` on the calling thread, prints the line if an exception or a machine fault ends it, and then
    /// detaches the object's thread as `DestroyThread` does. A new thread does the same for itself; there is no
    /// need to call this.
    static void _Run_(HThread* thread);

private:
    std::atomic<HNativeThread*> mpoThread{nullptr};  // null while idle; the thread clears it at its end
    std::atomic<HThreadPriority> mnPriority;
};

/// @}

#endif

// Contract: what is shown to a race detector that is compiled into the program. Such a detector sees only code
// that was built for it: neither the atomic operations of this library nor the lines that call it. All of this
// has no effect without a detector, and none on the order of memory accesses. Thread-safe.
#ifndef ZANBASE_PLATFORM_RACE_DETECTOR_H
#define ZANBASE_PLATFORM_RACE_DETECTOR_H

// Locks, conditions, semaphores and the functions of thread.h show their own happens-before edges. Other code
// by which a caller's data may pass from thread to thread calls these two.
//
// Call before a release store to `object`.
void NoteRelease(const void* object) noexcept;

// Call after an acquire load of `object`: every earlier NoteRelease for the object happens before.
void NoteAcquire(const void* object) noexcept;

// Shows for a scope which line called the function, so that reports name it: a public function that acquires a
// lock or starts a thread passes ZANBASE_RETURN_ADDRESS(). Not needed if the function ends in a jump to that
// operation, as HMutex::Lock does.
class CallerFrame {
public:
    explicit CallerFrame(void* return_address) noexcept;
    ~CallerFrame();
    CallerFrame(const CallerFrame&) = delete;
    CallerFrame& operator=(const CallerFrame&) = delete;
};

#endif

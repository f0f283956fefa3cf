/// @file
/// Names for clang's thread-safety annotations: which lock guards a field, what a function acquires, releases or
/// requires. clang checks them with `-Wthread-safety`; for other compilers they are empty.
///
///     class ZANBASE_CAPABILITY("mutex") TableMutex {
///     public:
///         void Acquire() noexcept ZANBASE_ACQUIRE();
///         void Release() noexcept ZANBASE_RELEASE();
///     };
///     TableMutex goMutex;
///     int gnRows ZANBASE_GUARDED_BY(goMutex) = 0;
///     void AddRow() noexcept ZANBASE_REQUIRES(goMutex);
///
/// The public `HMutex` carries no annotation: it is re-entrant, and `HMutexLock` can be reset to another mutex.
/// clang's analysis follows neither. `HLockable` in zanbase/adapters/lockable.h is annotated.
#ifndef ZANBASE_THREAD_ANNOTATIONS_H
#define ZANBASE_THREAD_ANNOTATIONS_H

/// @cond
#ifdef __has_attribute
#if __has_attribute(capability)
#define ZANBASE_THREAD_ANNOTATION(annotation) __attribute__((annotation))
#endif
#endif
#ifndef ZANBASE_THREAD_ANNOTATION
#define ZANBASE_THREAD_ANNOTATION(annotation)
#endif

// On a class: objects are locks; or holders that acquire in the constructor and release in the destructor.
#define ZANBASE_CAPABILITY(kind) ZANBASE_THREAD_ANNOTATION(capability(kind))
#define ZANBASE_SCOPED_CAPABILITY ZANBASE_THREAD_ANNOTATION(scoped_lockable)

// On a variable: access to it, or to what it points to, requires the lock.
#define ZANBASE_GUARDED_BY(lock) ZANBASE_THREAD_ANNOTATION(guarded_by(lock))
#define ZANBASE_PT_GUARDED_BY(lock) ZANBASE_THREAD_ANNOTATION(pt_guarded_by(lock))

// On a lock: those that a thread which holds both acquires later, or earlier. clang checks it with -Wthread-safety-beta.
#define ZANBASE_ACQUIRED_BEFORE(...) ZANBASE_THREAD_ANNOTATION(acquired_before(__VA_ARGS__))
#define ZANBASE_ACQUIRED_AFTER(...) ZANBASE_THREAD_ANNOTATION(acquired_after(__VA_ARGS__))

// On a function: what the caller must hold, must not hold, or holds afterwards (no lock named: the object).
#define ZANBASE_REQUIRES(...) ZANBASE_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
#define ZANBASE_REQUIRES_SHARED(...) ZANBASE_THREAD_ANNOTATION(requires_shared_capability(__VA_ARGS__))
#define ZANBASE_EXCLUDES(...) ZANBASE_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))
#define ZANBASE_ACQUIRE(...) ZANBASE_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define ZANBASE_ACQUIRE_SHARED(...) ZANBASE_THREAD_ANNOTATION(acquire_shared_capability(__VA_ARGS__))
#define ZANBASE_RELEASE(...) ZANBASE_THREAD_ANNOTATION(release_capability(__VA_ARGS__))
#define ZANBASE_RELEASE_SHARED(...) ZANBASE_THREAD_ANNOTATION(release_shared_capability(__VA_ARGS__))
#define ZANBASE_RELEASE_GENERIC(...) ZANBASE_THREAD_ANNOTATION(release_generic_capability(__VA_ARGS__))
#define ZANBASE_TRY_ACQUIRE(...) ZANBASE_THREAD_ANNOTATION(try_acquire_capability(__VA_ARGS__))
#define ZANBASE_TRY_ACQUIRE_SHARED(...) ZANBASE_THREAD_ANNOTATION(try_acquire_shared_capability(__VA_ARGS__))

// On a function: it checks at run time that the lock is held; or it returns a reference to the lock named.
#define ZANBASE_ASSERT_CAPABILITY(lock) ZANBASE_THREAD_ANNOTATION(assert_capability(lock))
#define ZANBASE_ASSERT_SHARED_CAPABILITY(lock) ZANBASE_THREAD_ANNOTATION(assert_shared_capability(lock))
#define ZANBASE_RETURN_CAPABILITY(lock) ZANBASE_THREAD_ANNOTATION(lock_returned(lock))

// On a function that the analysis can't follow; a comment beside it says why.
#define ZANBASE_NO_THREAD_SAFETY_ANALYSIS ZANBASE_THREAD_ANNOTATION(no_thread_safety_analysis)
/// @endcond

#endif

/// @file
/// The allocation tracker: live blocks and usage of each call site, and the reports over them.
#ifndef ZANBASE_MEMORY_H
#define ZANBASE_MEMORY_H

#include <cstddef>
#include <cstdio>
#include <functional>
#include <list>
#include <memory>
#include <utility>

#include "zanbase/export.h"
#include "zanbase/mutex.h"

/// @addtogroup memory
/// @{

// Boost's map header adds about 90,000 lines to each including file, so it is not included here. Code that
// reads the tables includes zanbase/memory_tables.h.
namespace boost {
template <class T>
struct hash;
namespace unordered {
template <class K, class T, class H, class P, class A>
class unordered_map;
}
}  // namespace boost

/// A process-wide ledger of memory blocks. It allocates nothing for its callers: a caller that takes a block
/// records it here, and records its release.
///
///     void* block = std::malloc(64);
///     HMemory::Alloc(block, 64, __FILE__, __LINE__);
///     HMemory::LeakReport(stderr);  // one block of 64 bytes, at this file and line
///     HMemory::Free(block);
///     std::free(block);
///
/// Record the release before the block is freed, as above: afterwards another thread can get the same
/// address.
///
/// **Threads.** All operations are thread-safe; each holds one mutex from start to end. They may be called
/// until the process has ended, also by detached threads and destructors of static objects. A fork waits
/// until no other thread is inside the tracker, so the child can use it; after five seconds in one operation,
/// which only a report or a killed thread takes, it waits no longer, and the child must not use the tracker.
///
/// **Call sites.** A call site is the value of the file pointer and the line. The text is neither compared
/// nor copied: the same text at two addresses makes two sites. Requires: the pointer is not null, and the
/// text is readable and unchanged as long as the tables or a saved state hold the pointer. The usage table
/// holds it after all blocks are freed. A string literal and `__FILE__` of a shared object end with
/// `dlclose`: free its blocks and call `UsageReset` before, and leave no saved state that has its sites. A
/// result of `MkName` is overwritten and must not be used as file text.
///
/// **Errors.** The tables are created by the first `Alloc` and live as long as the process; before it, every
/// other operation does nothing. No operation reports a failure. If the tracker's own memory is exhausted,
/// `std::bad_alloc` reaches the caller and the tables stay sound. An `Alloc` that throws has not changed the
/// total and the peak, but may have counted the usage of its site.
///
/// **Calls from an allocator.** The tracker and its reports use `operator new` and `malloc` themselves. A
/// program that calls the tracker from its own `operator new` or `malloc` makes every call through a guard,
/// the reports too:
///
///     thread_local bool in_tracker = false;
///     template <class Call> void CallTracker(Call call) {
///         if (in_tracker) return;
///         in_tracker = true;
///         call();  // [=] { HMemory::Alloc(block, size, "operator new", 0); }
///         in_tracker = false;
///     }
///
/// Make the first call in `main`: an allocator also serves libraries that are initialised before this one.
///
/// The class has static members only and is not made to be instantiated. It detects no faults: a block freed
/// twice or never recorded is not noticed. Use a sanitizer to find those.
class ZANBASE_API HMemory {
public:
    /// Records the block of `size` bytes at `ptr`, allocated at `line` of `file`. Neither `ptr` nor `size` is
    /// checked: null and 0 are recorded like any other value. If the tracker has a block at `ptr` already,
    /// that record stays unchanged; the usage of the given site and the total grow all the same. Thread-safe.
    static void Alloc(void* ptr, std::size_t size, const char* file, int line);

    /// Removes the block at `ptr` and counts its recorded size as freed at the site that recorded it. Does
    /// nothing if the tracker has no such block. Thread-safe.
    static void Free(void* ptr);

    /// Saves all that is recorded and starts from empty. Calls nest to any depth. Copies both tables.
    /// Thread-safe.
    static void Push();

    /// Restores the state saved by the newest `Push`; all that was recorded since is lost, the peak too. Does
    /// nothing if no state is saved. Thread-safe.
    static void Pop();

    /// Empties both tables and sets the total and the peak to 0. Saved states stay. Thread-safe.
    static void Reset();

    /// Empties the usage table only: the live blocks, the total, the peak and the saved states stay.
    /// Thread-safe.
    static void UsageReset();

    /// Prints a table of the live blocks on `stream`: a row for each call site, the one that holds most bytes
    /// last, then the totals. Prints nothing if no block is live, and does not acquire the stream then. The
    /// heading, each row and the totals are one write each. The stream is neither checked nor flushed.
    /// Requires: `stream` is open for writing.
    ///
    /// Thread-safe. The calling thread owns the tracker's mutex and the stream's lock (`flockfile`) until the
    /// table is written: no other output gets into it, and `Alloc` and `Free` wait. It waits for neither while
    /// it owns the other. So a thread that owns the stream may call the tracker; and one that owns `moMutex`
    /// may print, open files and report. Doing both with one stream is a deadlock of the program's own.
    ///
    /// A write function of the program's own, under the stream, may call the tracker, print and report on other
    /// streams. It must not wait for a thread that may wait for the tracker: for a stream whose owner records
    /// here; or for the disk ledger, if `operator new` or the stream of a ledger's report records here.
    static void LeakReport(std::FILE* stream);

    /// Prints on `stream` what each call site allocated and freed, smallest first, then the totals in K and
    /// the peak. Prints nothing if the usage table is empty. Sites below 1/10240 of the total bytes are
    /// printed as one sum. The title, each site and the totals are one write each. Thread-safe. Requirements and
    /// locks are those of `LeakReport`.
    static void UsageReport(std::FILE* stream);

    /// Does nothing: there is no state to copy.
    HMemory& operator=(const HMemory&);

protected:
    /// What one call site did.
    struct MemoryUsage {
        std::size_t mnAllocated = 0;    ///< bytes recorded by `Alloc`
        std::size_t mnFreed = 0;        ///< bytes of blocks of this site that `Free` removed
        unsigned int mnAllocCount = 0;  ///< calls of `Alloc`
        unsigned int mnFreeCount = 0;   ///< calls of `Free` that found a block of this site
    };

    /// One live block.
    struct MemoryBlock {
        std::size_t mnSize;   ///< bytes
        const char* mpcFile;  ///< not owned, not null
        int mnLine;           ///< line in that file
    };

    /// A saved state; zanbase/memory_tables.h completes it.
    struct MemoryState;

    /// A file's text, by its address, and a line in it.
    using CallSite = std::pair<const char*, int>;
    /// What each call site did.
    using FileMap =
        boost::unordered::unordered_map<CallSite, MemoryUsage, boost::hash<CallSite>, std::equal_to<CallSite>,
                                        std::allocator<std::pair<const CallSite, MemoryUsage>>>;
    /// The live blocks by their address.
    using MemoryMap =
        boost::unordered::unordered_map<void*, MemoryBlock, boost::hash<void*>, std::equal_to<void*>,
                                        std::allocator<std::pair<void* const, MemoryBlock>>>;

    // For derived classes, with moMutex held. They may change the tables' contents, but must keep the
    // pointers. The three tables are created together, by the first `Alloc` or before it by a derived class,
    // and never destroyed.
    static FileMap* mpoFileMap;                     ///< usage of each site; null until the first `Alloc`
    static MemoryMap* mpoMemoryMap;                 ///< live blocks by address; null until then
    static std::list<MemoryState>* mpoMemoryStack;  ///< saved states, newest at the back; null until then
    static std::size_t mnTotalMemory;               ///< bytes recorded and not yet freed
    static std::size_t mnPeekMemory;  ///< the highest total after an `Alloc` since the last clearing
    static HMutex moMutex;            ///< guards all of the above; built at load, never destroyed
};

/// @}

#endif

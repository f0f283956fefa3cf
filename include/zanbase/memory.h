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

// Boost's map header costs an including file about 90,000 lines, so it is not included here. Code that reads
// the tables includes zanbase/memory_tables.h.
namespace boost {
template <class T>
struct hash;
namespace unordered {
template <class K, class T, class H, class P, class A>
class unordered_map;
}
}  // namespace boost

/// A process-wide ledger of memory blocks. It allocates nothing for its callers: whoever takes a block tells
/// the tracker, and tells it again when the block goes.
///
///     void* block = std::malloc(64);
///     HMemory::Alloc(block, 64, __FILE__, __LINE__);
///     HMemory::LeakReport(stderr);  // one block of 64 bytes, at this file and line
///     HMemory::Free(block);
///     std::free(block);
///
/// Any thread may call any operation; each holds the one mutex from start to end. The tables come into being
/// at the first `Alloc` and live as long as the process: before it, every other operation does nothing. No
/// operation reports a failure. If the tracker's own memory runs out, `std::bad_alloc` goes to the caller,
/// the tables stay sound, and `Alloc` has added nothing to the total and the peak. The tracker can't be used
/// once the library's static objects are destroyed.
///
/// A call site is the value of the file pointer and the line. The text is neither compared nor copied: the
/// same text at two addresses makes two sites. The pointer must not be null, and the text must stay readable
/// as long as the tables or a saved state hold the pointer; string literals and `__FILE__` do.
///
/// The class has static members only and is not made to be instantiated. It finds no faults by itself: a
/// block freed twice, or never announced, goes unnoticed. To find those, take a sanitizer.
class ZANBASE_API HMemory {
public:
    /// Records the block of `size` bytes at `ptr`, taken at `line` of `file`. Neither `ptr` nor `size` is
    /// tested: null and 0 are recorded like any other. If the tracker holds a block at `ptr` already, that
    /// record stays as it is; the usage of the given site and the total grow all the same.
    static void Alloc(void* ptr, std::size_t size, const char* file, int line);

    /// Drops the block at `ptr` and counts its recorded size as freed at the site that recorded it. Does
    /// nothing if the tracker holds no such block.
    static void Free(void* ptr);

    /// Saves all that is recorded and starts afresh. Calls nest to any depth. Costs a copy of both tables.
    static void Push();

    /// Returns to the state of the newest `Push`; all that was recorded since is forgotten, the peak too.
    /// Does nothing if no state is saved.
    static void Pop();

    /// Empties both tables and sets the total and the peak to 0. Saved states stay.
    static void Reset();

    /// Empties the usage table only: the live blocks, the total, the peak and the saved states stay.
    static void UsageReset();

    /// Prints a table of the live blocks on `stream`: a row for each call site, the one that holds most bytes
    /// last, then the totals. Prints nothing if no block is live. `stream` must be open for writing; it is
    /// neither tested nor flushed. The tracker stands still until the table is written.
    static void LeakReport(std::FILE* stream);

    /// Prints on `stream` what each call site allocated and freed, smallest first, then the totals in K and
    /// the peak. Sites below a small share of the total are printed as one sum. Prints nothing if the usage
    /// table is empty. `stream` is as for `LeakReport`.
    static void UsageReport(std::FILE* stream);

    /// Does nothing: there is no state to copy.
    HMemory& operator=(const HMemory&);

protected:
    /// What one call site did.
    struct MemoryUsage {
        std::size_t mnAllocated = 0;    ///< bytes announced by `Alloc`
        std::size_t mnFreed = 0;        ///< bytes of this site's blocks dropped by `Free`
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

    // For classes derived from this one to read, with moMutex held; only the operations above change them.
    // The three tables are created together and never destroyed.
    static FileMap* mpoFileMap;                     ///< usage of each site; null until the first `Alloc`
    static MemoryMap* mpoMemoryMap;                 ///< live blocks by address; null until then
    static std::list<MemoryState>* mpoMemoryStack;  ///< saved states, newest at the back; null until then
    static std::size_t mnTotalMemory;               ///< bytes announced and not yet freed
    static std::size_t mnPeekMemory;  ///< the highest total after an `Alloc` since the last clearing
    static HMutex moMutex;            ///< guards all of the above; built at load
};

/// @}

#endif

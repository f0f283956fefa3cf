// Every process-wide object that needs a constructor at load, in one file: within a file the order of
// construction is the order of definition. Callers in other libraries are linked against this one, so the
// loader builds these objects before any code of theirs runs.
//
// None of them is ever destroyed: detached threads and destructors of other static objects may call the
// library while the process exits, and the library is never unloaded: each back end keeps it loaded.
#include <new>

#include "diskio/ledger.h"
#include "environment/message_catalogue.h"
#include "locks/lasting_mutex.h"
#include "platform/fork.h"
#include "text/name_ring.h"
#include "timing/row_table.h"
#include "zanbase/memory.h"

namespace {

struct TrackerAccess : HMemory {
    using HMemory::moMutex;
};

// Has no destructor, so the object in it works until the process has ended.
template <class T>
class NoDestructor {
public:
    NoDestructor() { new (maStorage) T; }
    T& Get() { return *std::launder(reinterpret_cast<T*>(maStorage)); }

private:
    alignas(T) unsigned char maStorage[sizeof(T)];
};

NoDestructor<HMutex> goDiskIOMutex, goGrowthMutex;
NoDestructor<MessageCatalogue> goCatalogue;
NoDestructor<NameRing> goRing;

}  // namespace

const HMutex* const gpoLastingMutex = &TrackerAccess::moMutex;
HMutex HMemory::moMutex;
const HMutex* const mpoDiskIOMutex = &goDiskIOMutex.Get();
HMutex& goTimerGrowthMutex = goGrowthMutex.Get();
MessageCatalogue& goMessageCatalogue = goCatalogue.Get();
NameRing& goNameRing = goRing.Get();

namespace {

// A fork owns the mutex of every table, so that the child can use them all. No other code owns two of them.
const HMutex& TableMutex(unsigned int number) {
    const HMutex* const mutexes[] = {&TrackerAccess::moMutex, mpoDiskIOMutex, &goTimerGrowthMutex,
                                     &goMessageCatalogue.moCatalogueMutex, &goNameRing.moRingMutex};
    return *mutexes[number];
}

[[maybe_unused]] const bool gbForkHandled = [] {
    HoldAroundFork({5, [](unsigned int number) { return TableMutex(number).TryLock(); },
                    [](unsigned int number) { TableMutex(number).Unlock(); }});
    return true;
}();

}  // namespace

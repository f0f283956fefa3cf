// Every process-wide object that needs a constructor at load, in one file: within a file the order of
// construction is the order of definition, and destruction runs the other way. Callers in other libraries are
// linked against this one, so the loader builds these objects before any code of theirs runs.
#include "environment/message_catalogue.h"
#include "text/name_ring.h"
#include "zanbase/memory.h"

HMutex HMemory::moMutex;
MessageCatalogue goMessageCatalogue;
NameRing goNameRing;

// The one ring of name slots.
//
//   mnLastSlot: -1 at load, then 0, 1, … 255, 0, …; changed by TakeSlot only, under moRingMutex.   A slot
// belongs to the caller that took it until the 256th take after; no lock is needed to fill or read it.
#ifndef ZANBASE_TEXT_NAME_RING_H
#define ZANBASE_TEXT_NAME_RING_H

#include "text/text_rules.h"
#include "zanbase/mutex.h"

struct NameRing {
    static constexpr int kSlots = 256;

    // Takes the next slot: kTextBytes bytes.
    char* TakeSlot();

    char maSlots[kSlots]
                [kTextBytes];  // in static storage, zero at load: a page costs nothing until it is used
    int mnLastSlot = -1;       // guarded by moRingMutex
    HMutex moRingMutex;
};

extern NameRing& goNameRing;  // built in load_time.cpp, never destroyed

#endif

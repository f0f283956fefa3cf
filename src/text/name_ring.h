// The one ring of name slots.
//
//   mnLastSlot: -1 at load, then 0, 1, … 255, 0, …; only a take moves it, under moRingMutex.
//   A slot is its taker's until the 256th take after; filling and reading it need no lock.
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

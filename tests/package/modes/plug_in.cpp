// Records and times in a shared library of its own.
#include "plug_in.h"

#include <zanbase/adapters/scope_timer.h>
#include <zanbase/adapters/tracked_block.h>

void TimeInPlugIn(const char* name) { HTimedRegion(name); }

bool IsPausedInPlugIn() { return HTrackerPause::IsActive(); }

void RecordInPlugIn() {
    static char block[240];
    HTrackAlloc(block, sizeof block, {"plug_in.cpp", 1});
}

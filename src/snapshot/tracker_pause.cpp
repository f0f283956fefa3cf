// The pauses of each thread.
#include "zanbase/tracker_pause.h"

int& HTrackerPauses() noexcept {
    static thread_local int pauses = 0;
    return pauses;
}

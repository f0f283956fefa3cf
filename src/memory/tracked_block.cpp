// Recording of blocks within a pause.
#include <new>

#include "zanbase/memory.h"
#include "zanbase/tracker_pause.h"

bool HTrackBlock(void* ptr, std::size_t size, const char* file, int line) noexcept {
    const HTrackerPause pause;
    try {
        HMemory::Alloc(ptr, size, file, line);
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

void HTrackBlockEnd(void* ptr) noexcept {
    const HTrackerPause pause;
    try {
        HMemory::Free(ptr);
    } catch (const std::bad_alloc&) {
        // The record stays.
    }
}

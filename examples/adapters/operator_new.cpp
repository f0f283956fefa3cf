// Every `new` of a program in the tracker: a replacement of the global operators. Prints what a map of strings
// takes, and that nothing is left of it.
//
// Recording starts in main: objects that are built earlier may allocate before the library is ready.
#include <zanbase/adapters/tracked_block.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <new>
#include <string>

namespace {

std::atomic<bool> is_recording{false};

void* Allocate(std::size_t size) {
    for (;;) {
        if (void* const block = std::malloc(size == 0 ? 1 : size)) return block;
        const std::new_handler handler = std::get_new_handler();
        if (handler == nullptr) throw std::bad_alloc();
        handler();
    }
}

}  // namespace

// The other forms (arrays, nothrow) call these two. Over-aligned objects have forms of their own and are left out.
void* operator new(std::size_t size) {
    void* const block = Allocate(size);
    if (!is_recording) return block;
    try {
        HTrackAlloc(block, size, {"operator new", 0});
    } catch (...) {
        std::free(block);
        throw;
    }
    return block;
}

void operator delete(void* block) noexcept {
    if (is_recording && block != nullptr) HTrackFree(block);
    std::free(block);
}

void operator delete(void* block, std::size_t) noexcept { operator delete(block); }

int main() {
    is_recording = true;
    {
        std::map<int, std::string> names;
        for (int number = 0; number < 100; ++number) names[number] = std::string(50, 'x');
        const HTrackerPause pause;  // the report allocates while it walks over the tables
        HMemory::LeakReport(stdout);
    }
    const HTrackerPause pause;
    HMemory::LeakReport(stdout);
    HMemory::UsageReport(stdout);
    is_recording = false;
    return 0;
}

// A C++ program with known rows: a comment "row" states calls, bytes, live blocks and live bytes of its line.
// Its arguments are two plug-ins that are loaded one after the other, the first twice.
#include <dlfcn.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <new>
#include <string>
#include <thread>
#include <vector>

namespace {

void* volatile gSink;

struct alignas(64) Wide {
    char bytes[128];
};

void Operators() {
    gSink = new int;                     // row 1 4 1 4
    gSink = new char[33];                // row 1 33 1 33
    gSink = new (std::nothrow) char[5];  // row 1 5 1 5
    gSink = new Wide;                    // row 1 128 1 128
    gSink = new Wide[2];                 // row 1 256 1 256
    if (reinterpret_cast<std::uintptr_t>(gSink) % alignof(Wide) != 0) std::abort();
    for (int i = 0; i < 3; ++i) {
        long* volatile number = new long;  // row 3 24 0 0
        delete number;
    }
    try {
        gSink = ::operator new (~std::size_t{0} / 2);
    } catch (const std::bad_alloc&) {
        gSink = std::malloc(9);  // row 1 9 1 9
    }
}

void Containers() {
    std::vector<int> numbers;
    for (int i = 0; i < 100; ++i) numbers.push_back(i);  // row 8 1020 0 0
    std::string text(100, 'x');                          // row 1 101 0 0
    gSink = &text;
    const auto owned = std::make_unique<double>(2.5);  // row 1 8 0 0
    gSink = owned.get();
}

// Blocks of many threads, freed by other ones.
void Threads() {
    constexpr int kThreads = 4;
    std::vector<void*> blocks(1000 * kThreads);  // row 1 32000 0 0
    auto in_threads = [](auto work) {
        std::thread threads[kThreads];
        for (int i = 0; i < kThreads; ++i) threads[i] = std::thread(work, i);
        for (auto& thread : threads) thread.join();
    };
    in_threads([&](int part) {
        for (int i = 0; i < 1000; ++i)
            blocks[static_cast<std::size_t>(part * 1000 + i)] = std::malloc(24);  // row 4000 96000 4 96
    });
    std::reverse(blocks.begin(), blocks.end());
    in_threads([&](int part) {
        for (int i = 1; i < 1000; ++i) std::free(blocks[static_cast<std::size_t>(part * 1000 + i)]);
    });
}

void PlugIn(const char* path) {
    void* const library = dlopen(path, RTLD_NOW);
    if (library == nullptr) std::abort();
    reinterpret_cast<void (*)()>(dlsym(library, "PlugInRun"))();
    dlclose(library);
}

}  // namespace

int main(int, char** arguments) {
    Operators();
    Containers();
    Threads();
    PlugIn(arguments[1]);
    PlugIn(arguments[2]);
    PlugIn(arguments[1]);
    std::at_quick_exit([] { gSink = std::malloc(21); });  // row 1 21 1 21
    quick_exit(0);
}

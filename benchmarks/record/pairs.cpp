// What the recorder's table of costs is measured on. Prints the nanoseconds of one pair of calls:
//   pairs memory LIVE THREADS   malloc and free beside LIVE blocks of each thread; 0 is a tight pair
//   pairs read                  read of 4 KiB of a cached file
//   pairs open                  open and close
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

namespace {

using Clock = std::chrono::steady_clock;

double Since(Clock::time_point start) {
    return std::chrono::duration<double, std::nano>(Clock::now() - start).count();
}

// Replaces blocks in a random order by blocks of the sizes of small objects; returns the nanoseconds that
// took.
double Replace(std::size_t live, long pairs) {
    std::vector<void*> blocks(live != 0 ? live : 1);
    if (live != 0)
        for (void*& block : blocks) block = std::malloc(48);
    unsigned int random = 1;
    const auto start = Clock::now();
    for (long i = 0; i < pairs; ++i) {
        random = random * 1664525 + 1013904223;
        void* volatile& block = blocks[live != 0 ? (random >> 8) % live : 0];
        std::free(block);
        block = std::malloc(16 + (random >> 26));
    }
    const double nanoseconds = Since(start);
    for (void* block : blocks) std::free(block);
    return nanoseconds;
}

void Print(double nanoseconds, long pairs) {
    std::printf("%.1f\n", nanoseconds / static_cast<double>(pairs));
}

void Memory(std::size_t live, std::size_t threads) {
    constexpr long kPairs = 3000000;
    std::vector<double> taken(threads);
    std::vector<std::thread> others;
    for (std::size_t i = 1; i < threads; ++i)
        others.emplace_back([&, i] { taken[i] = Replace(live, kPairs); });
    taken[0] = Replace(live, kPairs);
    for (std::thread& thread : others) thread.join();
    Print(*std::max_element(taken.begin(), taken.end()), kPairs);
}

void Disk(bool opens) {
    constexpr long kPairs = 200000;
    static char text[4096];
    char name[] = "/tmp/pairsXXXXXX";
    const int file = mkstemp(name);
    if (file < 0 || write(file, text, sizeof text) != sizeof text) std::abort();
    const auto start = Clock::now();
    for (long i = 0; i < kPairs; ++i) {
        if (opens) {
            close(open(name, O_RDONLY));
        } else if (pread(file, text, sizeof text, 0) != sizeof text) {
            std::abort();
        }
    }
    Print(Since(start), kPairs);
    unlink(name);
}

}  // namespace

int main(int argc, char** argv) {
    const std::string what = argc > 1 ? argv[1] : "";
    if (what == "memory" && argc == 4) {
        Memory(std::strtoul(argv[2], nullptr, 10), std::strtoul(argv[3], nullptr, 10));
    } else if (what == "read" || what == "open") {
        Disk(what == "open");
    } else {
        return 1;
    }
    return 0;
}

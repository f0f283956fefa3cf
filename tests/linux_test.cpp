// What signals may not cut short, and the count of cores by files of the test's own.
#include <gtest/gtest.h>
#include <signal.h>

#include <thread>

#include "platform/clock.h"
#include "platform/linux/restartable.h"
#include "platform/processors.h"

int described = 0;  // processors that have a file: those from number 4 on, two to a core

extern "C" std::FILE* __wrap_fopen(const char* path, const char*) {
    int number = 0;
    std::sscanf(path, "/sys/devices/system/cpu/cpu%d/topology", &number);
    static std::string list;  // outlives the stream
    list = std::to_string(number / 2 * 2) + ",9999";
    return number < 4 || number >= 4 + described ? nullptr : fmemopen(list.data(), list.size(), "r");
}

TEST(PosixProcessors, AreCountedAtTheFirstOfTheirCore) {
    described = CountLogicalProcessors();
    EXPECT_EQ(CountProcessorCores(), (described + 1) / 2);
    --described;  // a processor that is described nowhere
    EXPECT_EQ(CountProcessorCores(), 0);
}

FutexWord word{0};
std::atomic<unsigned int> hits{0};

TEST(PosixSignals, CutNoPauseAndBreakAStoreInsteadOfBeingOverwritten) {
    AllowRestartableStores();
    word = 1;
    if (!StoreIfStill(word, 1, 0)) GTEST_SKIP() << "this system has none";
    EXPECT_TRUE(word == 0 && !StoreIfStill(word, 1, 2));
    signal(SIGUSR1, [](int) { word = 2, ++hits; });
    std::thread sender([self = pthread_self()] {
        for (unsigned int sent = 0; sent < 5000; pthread_kill(self, SIGUSR1), ++sent)
            while (hits != sent) continue;
    });
    const unsigned int start = ReadTicks();
    SleepFor(5);
    EXPECT_GE(ReadTicks() - start, 5U);
    while (hits < 5000) {
        word.store(1, std::memory_order_relaxed);  // a locked one would draw all the signals to itself
        std::atomic_signal_fence(std::memory_order_seq_cst);
        const unsigned int before = hits;
        StoreIfStill(word, 1, 0);
        EXPECT_TRUE(hits == before || word == 2);
    }
    sender.join();
}

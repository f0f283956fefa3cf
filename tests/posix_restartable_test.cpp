// The restartable store against a signal handler that changes the word at any instruction.
#include "platform/posix/restartable.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>

#include <thread>

namespace {

FutexWord word{0};
std::atomic<unsigned int> hits{0};

void ChangeWord(int) {
    word = 2;
    ++hits;
}

TEST(StoreIfStill, NeverOverwritesAChange) {
    AllowRestartableStores();
    word = 1;
    if (!StoreIfStill(word, 1, 0)) GTEST_SKIP() << "this system has none";
    EXPECT_EQ(word, 0U);
    EXPECT_FALSE(StoreIfStill(word, 1, 2));
    struct sigaction action {};
    action.sa_handler = ChangeWord;
    sigaction(SIGUSR1, &action, nullptr);
    constexpr unsigned int kHits = 5000;
    const pthread_t self = pthread_self();
    std::thread sender([&] {
        for (unsigned int sent = 0; sent < kHits;) {
            if (hits != sent) continue;
            ++sent;
            pthread_kill(self, SIGUSR1);
        }
    });
    unsigned int overwritten = 0;
    while (hits < kHits) {
        word.store(1, std::memory_order_relaxed);
        std::atomic_signal_fence(std::memory_order_seq_cst);
        const unsigned int before = hits;
        StoreIfStill(word, 1, 0);
        if (hits != before && word != 2) ++overwritten;
    }
    sender.join();
    EXPECT_EQ(overwritten, 0U);
}

}  // namespace

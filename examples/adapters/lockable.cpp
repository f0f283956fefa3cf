// A bounded queue over an HLockable and a table of prices over an HSharedLockable, both checked by clang's analysis, and
// the holders of the standard library. Prints what three threads passed through them.
#include <zanbase/adapters/lockable.h>

#include <condition_variable>
#include <cstdio>
#include <deque>
#include <mutex>
#include <shared_mutex>
#include <thread>

namespace {

// clang's -Wthread-safety checks every use of maItems, and below of mnPrice and mnChanges.
class Queue {
public:
    void Put(int item) {
        HLockGuard guard(moMutex);
        while (maItems.size() >= 4) moChanged.wait(guard);
        maItems.push_back(item);
        guard.unlock();  // the threads that are woken find the lock free
        moChanged.notify_all();
    }

    int Take() {
        HLockGuard guard(moMutex);
        moChanged.wait(guard, [this]() ZANBASE_REQUIRES(moMutex) { return !maItems.empty(); });
        const int item = RemoveFirst();
        guard.unlock();
        moChanged.notify_all();
        return item;
    }

private:
    int RemoveFirst() ZANBASE_REQUIRES(moMutex) {
        const int item = maItems.front();
        maItems.pop_front();
        return item;
    }

    HLockable moMutex;
    std::condition_variable_any moChanged;
    std::deque<int> maItems ZANBASE_GUARDED_BY(moMutex);
};

class Price {
public:
    void Raise() {
        const HLockGuard guard(moMutex);
        ++mnPrice;
        ++mnChanges;
    }

    int Difference() {
        const HSharedLockGuard guard(moMutex);
        return mnPrice - mnChanges;
    }

private:
    HSharedLockable moMutex;
    int mnPrice ZANBASE_GUARDED_BY(moMutex) = 100;
    int mnChanges ZANBASE_GUARDED_BY(moMutex) = 0;
};

// Moves between two accounts; std::scoped_lock acquires both without a deadlock, whatever their order. The analysis does
// not see that, so the assertions state it, and check it when the program runs.
struct Account {
    HLockable moMutex;
    int mnBalance ZANBASE_GUARDED_BY(moMutex) = 1000;
};

void Move(Account& from, Account& to) {
    const std::scoped_lock lock(from.moMutex, to.moMutex);
    from.moMutex.AssertHeld();
    to.moMutex.AssertHeld();
    --from.mnBalance;
    ++to.mnBalance;
}

int Balance(Account& account) {
    const HLockGuard guard(account.moMutex);
    return account.mnBalance;
}

int ReadBalance(HSharedLockable& mutex, const int& balance) {
    const std::shared_lock<HSharedLockable> lock(mutex);
    return balance;
}

}  // namespace

int main() {
    constexpr int kItems = 1000;
    Queue queue;
    Price price;
    Account left;
    Account right;
    HSharedLockable summary_mutex;
    int summary = 0;  // guarded by summary_mutex
    long sum = 0;

    std::thread producer([&] {
        for (int item = 1; item <= kItems; ++item) {
            queue.Put(item);
            price.Raise();
            Move(left, right);
            const std::unique_lock<HSharedLockable> lock(summary_mutex);
            ++summary;
        }
    });
    std::thread watcher([&] {
        int off = 0;
        for (int look = 0; look < kItems; ++look) {
            if (price.Difference() != 100 || ReadBalance(summary_mutex, summary) > kItems) ++off;
            Move(right, left);
        }
        std::printf("%d looks were off\n", off);
    });
    for (int item = 0; item < kItems; ++item) sum += queue.Take();
    producer.join();
    watcher.join();
    std::printf("sum %ld, balances %d, updates %d\n", sum, Balance(left) + Balance(right), summary);
    return 0;
}

// A bounded queue over an HLockable, and a table of prices over an HSharedLockable, with the holders of the
// standard library. Prints what three threads passed through them.
#include <zanbase/adapters/lockable.h>

#include <condition_variable>
#include <cstdio>
#include <deque>
#include <mutex>
#include <shared_mutex>
#include <thread>

namespace {

class Queue {
public:
    void Put(int item) {
        std::unique_lock<HLockable> lock(moMutex);
        moChanged.wait(lock, [this] { return maItems.size() < 4; });
        maItems.push_back(item);
        moChanged.notify_all();
    }

    int Take() {
        std::unique_lock<HLockable> lock(moMutex);
        moChanged.wait(lock, [this] { return !maItems.empty(); });
        const int item = maItems.front();
        maItems.pop_front();
        moChanged.notify_all();
        return item;
    }

private:
    HLockable moMutex;
    std::condition_variable_any moChanged;
    std::deque<int> maItems;  // guarded by moMutex
};

// clang's -Wthread-safety checks every use of mnPrice and mnChanges.
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

// Moves between two accounts; std::scoped_lock acquires both without a deadlock, whatever their order.
struct Account {
    HLockable moMutex;
    int mnBalance = 1000;  // guarded by moMutex
};

void Move(Account& from, Account& to) {
    const std::scoped_lock lock(from.moMutex, to.moMutex);
    --from.mnBalance;
    ++to.mnBalance;
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
    std::printf("sum %ld, balances %d, updates %d\n", sum, left.mnBalance + right.mnBalance, summary);
    return 0;
}

// A price list that several threads read while one updates it. Each update changes two entries together, and
// no reader may see one change without the other.
#include <atomic>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "zanbase/read_write_mutex.h"
#include "zanbase/semaphore.h"
#include "zanbase/thread.h"

namespace {

struct PriceList {
    // Prefers writers: overlapping readers must not keep an update out for ever.
    HWritePrefMutex mutex;
    std::map<std::string, int> prices{{"bolt", 100}, {"nut", 100}};  // guarded by mutex
};

class Reader : public HThread {
public:
    Reader(const PriceList& list, const std::atomic<bool>& ends) : mList(list), mEnds(ends) {}
    long Torn() const { return mTorn; }
    void AwaitFirstLook() const { mLooked.Lock(); }

protected:
    void Run() override {
        for (bool first = true; first || !mEnds; first = false) {
            {
                const HReaderLock lock(&mList.mutex);
                if (Price("bolt") != Price("nut")) ++mTorn;
            }
            if (first) mLooked.Unlock();
        }
    }

private:
    // Acquires a read lock of its own: nested in that of Run, it never waits, not even behind a writer.
    int Price(const std::string& name) const {
        const HReaderLock lock(&mList.mutex);
        return mList.prices.at(name);
    }

    const PriceList& mList;
    const std::atomic<bool>& mEnds;
    const HSemaphore mLooked{0};
    long mTorn = 0;  // other threads read it only after Wait()
};

}  // namespace

int main() {
    PriceList list;
    std::atomic<bool> ends{false};
    std::vector<std::unique_ptr<Reader>> readers;
    for (int i = 0; i < 4; ++i) {
        readers.push_back(std::make_unique<Reader>(list, ends));
        readers.back()->Start(true);
    }
    for (const auto& reader : readers) reader->AwaitFirstLook();

    for (int update = 0; update < 1000; ++update) {
        const HWriterLock lock(&list.mutex);
        for (auto& [name, price] : list.prices) ++price;
    }
    ends = true;

    long torn = 0;
    for (const auto& reader : readers) {
        reader->Wait();
        torn += reader->Torn();
    }
    std::printf("4 readers, 1000 updates: bolt %d, nut %d, torn looks %ld\n", list.prices["bolt"],
                list.prices["nut"], torn);
    return torn == 0 ? 0 : 1;
}

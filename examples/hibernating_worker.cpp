// A worker counts words in the background: signals that it accepts, signals that it drops, a pass that fails,
// and how its object is destroyed at the right moment.
#include <cstdio>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "zanbase/zanbase.h"

class WordCounter : public HHibernateThread {
public:
    // Before the base class: it ends a worker, but can't wait for a pass that needs this object.
    ~WordCounter() override { CatchUp(); }

    void Add(const std::string& word) {
        {
            const HMutexLock lock(&moMutex);
            moWaiting.push_back(word);
        }
        Offer();
    }

    // Returns when every word is counted and the worker sleeps.
    void CatchUp() {
        // An offer made during a pass is dropped, and that pass may have taken its words before the last one
        // came.
        while (IsRunning() && HasWaiting()) {
            Offer();
            USleep(1000);
        }
        // First the count: once the last pass owed has begun, hibernating means that it is over.
        while (IsRunning() && (mnPasses < mnOwed || IsProcessing())) USleep(1000);
    }

    int CountOf(const std::string& word) const {
        const auto entry = moCounts.find(word);
        return entry != moCounts.end() ? entry->second : 0;
    }

private:
    void Offer() {
        if (Signal()) ++mnOwed;
    }

    bool HasWaiting() {
        const HMutexLock lock(&moMutex);
        return !moWaiting.empty();
    }

    void Process() override {
        ++mnPasses;
        std::vector<std::string> words;
        {
            const HMutexLock lock(&moMutex);
            words.swap(moWaiting);
        }
        for (const std::string& word : words) ++moCounts[word];
        for (const std::string& word : words)
            if (word.empty()) throw std::runtime_error("a word without letters");
    }

    HMutex moMutex;
    std::vector<std::string> moWaiting;   // guarded by moMutex
    std::map<std::string, int> moCounts;  // the worker's; anybody's while it sleeps
    std::atomic<int> mnPasses{0};         // begun
    int mnOwed = 2;                       // the worker makes two unasked
};

int main() {
    WordCounter counter;
    if (!counter.Start(true)) return 1;
    for (const char* word : {"lead", "tin", "lead", "", "zinc", "lead"}) counter.Add(word);
    counter.CatchUp();
    std::printf("%d lead, %d tin, %d zinc\n", counter.CountOf("lead"), counter.CountOf("tin"),
                counter.CountOf("zinc"));
}

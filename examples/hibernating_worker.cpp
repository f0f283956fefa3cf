// A worker counts words in the background: signals that it accepts, signals that it drops, a pass that fails,
// and the destruction of its object once it hibernates.
#include <cstdio>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "zanbase/zanbase.h"

class WordCounter : public HHibernateThread {
public:
    // Here and not in the base class: a pass needs this object.
    ~WordCounter() override { CatchUp(); }

    void Add(const std::string& word) {
        {
            const HMutexLock lock(&moMutex);
            moWaiting.push_back(word);
        }
        RequestPass();
    }

    // Returns when all words are counted and the worker hibernates.
    void CatchUp() {
        // A signal during a pass is dropped, and the pass may have taken its words before the last was added.
        while (IsRunning() && HasWaiting()) {
            RequestPass();
            USleep(1000);
        }
        // The count first: once the last requested pass has begun, hibernating means that it has ended.
        while (IsRunning() && (mnPasses < mnRequested || IsProcessing())) USleep(1000);
    }

    int CountOf(const std::string& word) const {
        const auto entry = moCounts.find(word);
        return entry != moCounts.end() ? entry->second : 0;
    }

private:
    void RequestPass() {
        if (Signal()) ++mnRequested;
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
    std::map<std::string, int> moCounts;  // the worker's; any thread may read it while the worker hibernates
    std::atomic<int> mnPasses{0};         // begun
    int mnRequested = 2;                  // the worker makes two after its start
};

int main() {
    WordCounter counter;
    if (!counter.Start(true)) return 1;
    for (const char* word : {"lead", "tin", "lead", "", "zinc", "lead"}) counter.Add(word);
    counter.CatchUp();
    std::printf("%d lead, %d tin, %d zinc\n", counter.CountOf("lead"), counter.CountOf("tin"),
                counter.CountOf("zinc"));
}

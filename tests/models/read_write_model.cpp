// The shipped steps of the read-write locks, on a mutex, semaphores and fields whose every access is a step.
#include "locks/read_write_steps.h"

#include <gtest/gtest.h>

#include "models/explorer.h"

namespace {

using Downgrade = HReadWriteSteps::Downgrade;

// Places in State::words: the fields; then for each thread the locks that it holds, and whether it has
// admitted readers while it writes.
constexpr std::size_t kReaders = 0, kWriters = 1, kWriter = 2, kReaderMutex = 3, kWriterMutex = 4,
                      kResource = 5, kGate = 6, kEntries = 7, kCounts = kEntries + kThreads,
                      kReads = kCounts + kThreads, kWrites = kReads + kThreads, kAdmits = kWrites + kThreads;
enum class Fault { kNone, kWriterLooksOutside, kReaderLooksAtDepth };

Fault fault = Fault::kNone;
char call = 0;  // the running one: r, R, w, W for ReadLock, ReadUnlock, WriteLock, WriteUnlock

struct Mutex {
    std::size_t place;
    bool IsLeftOut() const {
        return fault == Fault::kWriterLooksOutside && call == 'W' && place == kReaderMutex;
    }
    void Lock() const {
        if (IsLeftOut()) return;
        Change(place, [](Value owner) {
            if (owner != 0) Explorer::Block();
            return explorer.self + 1;
        });
    }
    void Unlock() const {
        if (!IsLeftOut()) Set(place, 0);
    }
};

struct Semaphore {
    std::size_t place;
    void Lock() const {
        Change(place, [this](Value units) {
            const State& state = explorer.now;
            if (place == kGate && state.words[kReaderMutex] == explorer.self + 1)
                Explorer::Fail("waits for the gate with the reader mutex");
            if (state.words[kWriterMutex] == explorer.self + 1) Explorer::Fail("waits with the writer mutex");
            if (units == 0) Explorer::Block();
            return units - 1;
        });
    }
    bool TryLock(double) const {
        return Change(place, [](Value units) { return units == 0 ? 0 : units - 1; }) != 0;
    }
    void Unlock() const {
        if (Add(place, 1) != 0) Explorer::Fail("released twice");
    }
};

struct Number {
    std::size_t place;
    operator Value() const { return Get(place); }
    Value operator++() const { return Add(place, 1) + 1; }
    Value operator--() const { return Add(place, -1) - 1; }
};

struct Writer {
    Value load(std::memory_order) const {
        if (fault != Fault::kReaderLooksAtDepth || call != 'R') return Get(kWriter);
        return Get(kWriters) == 0 ? HReadWriteSteps::kNoThread : 0;
    }
    void store(Value value, std::memory_order) const { Set(kWriter, value); }
};

// The spare entry saves allocations and changes nothing else: the model has none.
struct Spare {
    bool empty() const { return true; }
    Value& key() { return mKey; }
    Value& mapped() { return mKey; }
    Value mKey = 0;
};

struct Table {
    struct Entry {
        std::size_t thread;
        Number second{kCounts + thread};
        const Entry* operator->() const { return this; }
        bool operator==(const Entry& other) const { return thread == other.thread; }
        bool operator!=(const Entry& other) const { return thread != other.thread; }
    };
    Entry end() const { return {kThreads}; }
    Entry find(Value thread) const { return Get(kEntries + thread) != 0 ? Entry{thread} : end(); }
    Spare extract(const Entry& entry) const {
        Set(kEntries + entry.thread, 0);
        return {};
    }
    void emplace(Value thread, unsigned int count) const {
        Set(kEntries + thread, 1);
        Set(kCounts + thread, count);
    }
    void insert(Spare&&) const {}
};

struct Lock {
    Number mnReaders{kReaders}, mnWriters{kWriters};
    Table moReaderThreads;
    Spare moSpareCount;
    Writer mnWriterThread;
    Mutex moReaderMutex{kReaderMutex}, moWriterMutex{kWriterMutex};
    Semaphore moResource{kResource}, moGate{kGate};
};

// A lock counts as held from the return of its call to the start of its unlock. A writer admits readers from
// the start of its own read lock.
template <Downgrade kDowngrade>
void Make(char letter) {
    constexpr auto kReadLock = kDowngrade == Downgrade::kAllowed ? HReadWriteSteps::ReadLockAtOnce<Lock>
                                                                 : HReadWriteSteps::ReadLockInTurn<Lock>;
    Lock lock;
    const std::size_t self = explorer.self;
    call = letter;
    if (letter == 'R' || letter == 'W') Add((letter == 'R' ? kReads : kWrites) + self, -1);
    if (letter == 'r' && Get(kWrites + self) != 0) Set(kAdmits + self, 1);
    if (letter == 'r') kReadLock(lock, self);
    if (letter == 'w') HReadWriteSteps::WriteLock(lock, self);
    if (letter == 'R') HReadWriteSteps::ReadUnlock<kDowngrade>(lock, self);
    if (letter == 'W') HReadWriteSteps::WriteUnlock<kDowngrade>(lock, self);
    if (letter == 'r' || letter == 'w') ++explorer.now.words[(letter == 'r' ? kReads : kWrites) + self];
}

State Free() {
    State state;
    state.words[kWriter] = HReadWriteSteps::kNoThread;
    state.words[kResource] = state.words[kGate] = 1;
    return state;
}

const char* Wrong(const State& state, bool at_the_end) {
    for (std::size_t writer = 0; writer < kThreads; ++writer) {
        if (at_the_end && !explorer.IsDone(state, writer)) return "a deadlock";
        for (std::size_t other = 0; other < kThreads; ++other) {
            if (writer == other || state.words[kWrites + writer] == 0) continue;
            if (state.words[kWrites + other] != 0) return "two writers";
            if (state.words[kReads + other] != 0 && state.words[kAdmits + writer] == 0) return "a reader too";
        }
    }
    State free = Free();
    for (std::size_t place = kAdmits; place < free.words.size(); ++place)
        free.words[place] = state.words[place];
    return at_the_end && state.words != free.words ? "not free in the end" : nullptr;
}

// What is wrong in some order of the steps of some three of the scripts.
std::string Explore(void (*make)(char), const std::vector<std::string>& scripts, Fault seeded) {
    fault = seeded;
    explorer.call = make;
    explorer.check = Wrong;
    for (const std::string& a : scripts) {
        for (const std::string& b : scripts) {
            for (const std::string& c : scripts) {
                if (a > b || b > c) continue;  // the threads are alike
                explorer.scripts = {a, b, c};
                const std::string found = explorer.Explore(Free());
                if (!found.empty()) return found + ": " + a + " " + b + " " + c;
            }
        }
    }
    return "";
}

TEST(ReadWriteModel, HoldsInEveryOrderOfStepsAndFindsFaults) {
    constexpr auto kReadPref = Make<Downgrade::kAllowed>, kWritePref = Make<Downgrade::kBarred>;
    const std::vector<std::string> scripts{"rR", "rrRR", "wW", "wwWW", "wrWR", "wrRW"};
    EXPECT_EQ(Explore(kReadPref, scripts, Fault::kNone), "");
    EXPECT_EQ(Explore(kWritePref, {"rR", "rrRR", "wW", "wwWW", "rRwW"}, Fault::kNone), "");
    EXPECT_EQ(Explore(kReadPref, scripts, Fault::kWriterLooksOutside), "released twice: rR rR wrRW");
    EXPECT_EQ(Explore(kReadPref, scripts, Fault::kReaderLooksAtDepth), "a deadlock: rR rR wW");
}

}  // namespace

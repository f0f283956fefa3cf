// The steps of the read-write locks as they are shipped, on a mutex, semaphores and fields whose every access
// is a step.
#include "locks/read_write_steps.h"

#include <gtest/gtest.h>

#include "models/explorer.h"

namespace {

using Downgrade = ReadWriteSteps::Downgrade;

// The fields; then what the model notes of each thread: what it holds, and whether as a writer it has let
// readers in.
enum Place : std::size_t {
    kReaders,
    kWriters,
    kWriter,
    kReaderMutex,
    kWriterMutex,
    kResource,
    kGate,
    kEntries,
    kCounts = kEntries + kThreads,
    kReads = kCounts + kThreads,
    kWrites = kReads + kThreads,
    kOpened = kWrites + kThreads
};
enum class Fault { kNone, kWriterLooksOutside, kReaderLooksAtDepth };

Fault fault = Fault::kNone;
char call = 0;  // that runs: r, R, w or W for ReadLock, ReadUnlock, WriteLock, WriteUnlock

struct Mutex {
    std::size_t place;
    bool IsForgotten() const {
        return fault == Fault::kWriterLooksOutside && call == 'W' && place == kReaderMutex;
    }
    void Lock() const {
        if (IsForgotten()) return;
        Change(place, [](Value owner) {
            if (owner != 0) Explorer::Block();
            return running->self + 1;
        });
    }
    void Unlock() const {
        if (!IsForgotten()) Set(place, 0);
    }
};

struct Semaphore {
    std::size_t place;
    void Lock() const {
        Change(place, [this](Value units) {
            if (place == kGate && running->now.words[kReaderMutex] == running->self + 1)
                Explorer::Fail("at the gate with the reader mutex");
            if (units == 0) Explorer::Block();
            return units - 1;
        });
    }
    void Unlock() const {
        if (Add(place, 1) != 0) Explorer::Fail("given back twice");
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
        return Get(kWriters) == 0 ? ReadWriteSteps::kNobody : 0;
    }
    void store(Value value, std::memory_order) const { Set(kWriter, value); }
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
    void erase(const Entry& entry) const { Set(kEntries + entry.thread, 0); }
    Number operator[](Value thread) const {
        Set(kEntries + thread, 1);
        return {kCounts + thread};
    }
};

struct Lock {
    Number mnReaders{kReaders}, mnWriters{kWriters};
    Table moReaderThreads;
    Writer mnWriterThread;
    Mutex moReaderMutex{kReaderMutex}, moWriterMutex{kWriterMutex};
    Semaphore moResource{kResource}, moGate{kGate};
};

struct Kind {
    void (*read_lock)(Lock&, Value);
    void (*read_unlock)(Lock&, Value);
    void (*write_unlock)(Lock&, Value);
    std::vector<std::string> scripts;  // what one thread may do
};
const Kind kReadPref{ReadWriteSteps::ReadLockAtOnce<Lock>,
                     ReadWriteSteps::ReadUnlock<Downgrade::kAllowed, Lock>,
                     ReadWriteSteps::WriteUnlock<Downgrade::kAllowed, Lock>,
                     {"rR", "rrRR", "wW", "wwWW", "wrWR", "wrRW"}};
const Kind kWritePref{ReadWriteSteps::ReadLockInTurn<Lock>,
                      ReadWriteSteps::ReadUnlock<Downgrade::kBarred, Lock>,
                      ReadWriteSteps::WriteUnlock<Downgrade::kBarred, Lock>,
                      {"rR", "rrRR", "wW", "wwWW", "rRwW"}};

// A lock counts as held from the return of its call to the start of its unlock. A writer lets readers in from
// the start of its own read lock.
void Make(const Kind& kind, char letter) {
    Lock lock;
    const std::size_t self = running->self;
    call = letter;
    if (letter == 'r') {
        if (Get(kWrites + self) != 0) Set(kOpened + self, 1);
        kind.read_lock(lock, self);
        ++running->now.words[kReads + self];
    } else if (letter == 'w') {
        ReadWriteSteps::WriteLock(lock, self);
        ++running->now.words[kWrites + self];
    } else {
        Add((letter == 'R' ? kReads : kWrites) + self, -1);
        (letter == 'R' ? kind.read_unlock : kind.write_unlock)(lock, self);
    }
}

State Free() {
    State state;
    state.words[kWriter] = ReadWriteSteps::kNobody;
    state.words[kResource] = state.words[kGate] = 1;
    return state;
}

const char* Wrong(const State& state, bool at_the_end) {
    for (std::size_t writer = 0; writer < kThreads; ++writer) {
        if (at_the_end && !running->IsDone(state, writer)) return "a deadlock";
        for (std::size_t other = 0; other < kThreads; ++other) {
            if (writer == other || state.words[kWrites + writer] == 0) continue;
            if (state.words[kWrites + other] != 0) return "two writers";
            if (state.words[kReads + other] != 0 && state.words[kOpened + writer] == 0) return "a reader too";
        }
    }
    State free = Free();
    for (std::size_t place = kOpened; place < free.words.size(); ++place)
        free.words[place] = state.words[place];
    return at_the_end && state.words != free.words ? "not free in the end" : nullptr;
}

// What is wrong with `kind` in some order of the steps of some three scripts.
std::string Explore(const Kind& kind, Fault seeded) {
    fault = seeded;
    for (const std::string& a : kind.scripts) {
        for (const std::string& b : kind.scripts) {
            for (const std::string& c : kind.scripts) {
                if (a > b || b > c) continue;  // the threads are alike
                Explorer explorer;
                running = &explorer;
                explorer.check = Wrong;
                explorer.scripts = {a, b, c};
                explorer.call = [&](char letter) { Make(kind, letter); };
                const std::string found = explorer.Explore(Free());
                if (!found.empty()) return found + ": " + a + " " + b + " " + c;
            }
        }
    }
    return "";
}

TEST(ReadWriteModel, IsWholeInEveryOrderOfSteps) {
    EXPECT_EQ(Explore(kReadPref, Fault::kNone), "");
    EXPECT_EQ(Explore(kWritePref, Fault::kNone), "");
}

TEST(ReadWriteModel, FindsSeededFaults) {
    EXPECT_EQ(Explore(kReadPref, Fault::kWriterLooksOutside), "given back twice: rR rR wrRW");
    EXPECT_EQ(Explore(kReadPref, Fault::kReaderLooksAtDepth), "a deadlock: rR rR wW");
}

}  // namespace

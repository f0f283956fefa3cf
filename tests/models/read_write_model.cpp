// The steps of the read-write locks as they are shipped, on a mutex, a semaphore and fields whose every
// access is a step of the explorer.
#include "locks/read_write_steps.h"

#include <gtest/gtest.h>

#include "models/explorer.h"

namespace {

using model::Explorer;
using model::State;
using model::Value;
using Downgrade = ReadWriteSteps::Downgrade;

enum Word {
    kReaders,
    kWriters,
    kWriter,
    kReaderMutex,
    kWriterMutex,
    kResource,
    kGate,
    kEntries,
    kCounts = 10,
    kReads = 13,
    kWrites = 16,
    kOpened = 19
};
enum class Op { kReadLock, kReadUnlock, kWriteLock, kWriteUnlock };
enum class Fault { kNone, kWriterLooksOutside, kReaderLooksAtDepth };

Explorer* running = nullptr;
Op op;  // of the running thread
Fault fault;

Value Get(std::size_t word) {
    return running->Step([=](State& state) { return state.words[word]; });
}
Value Add(std::size_t word, Value amount) {
    return running->Step([=](State& state) { return state.words[word] += amount; });
}
Value Set(std::size_t word, Value value) {
    return running->Step([=](State& state) { return state.words[word] = value; });
}

struct Mutex {
    std::size_t word;
    bool Left() const {
        return fault == Fault::kWriterLooksOutside && op == Op::kWriteUnlock && word == kReaderMutex;
    }
    void Lock() const {
        if (Left()) return;
        running->Step([this](State& state) {
            if (state.words[word] != 0) Explorer::Block();
            return state.words[word] = running->Self() + 1;
        });
    }
    void Unlock() const {
        if (!Left()) Set(word, 0);
    }
};

struct Semaphore {
    std::size_t word;
    void Lock() const {
        running->Step([this](State& state) {
            if (word == kGate && state.words[kReaderMutex] == running->Self() + 1) Explorer::Fail("gate");
            if (state.words[word] == 0) Explorer::Block();
            return --state.words[word];
        });
    }
    void Unlock() const {
        if (Add(word, 1) > 1) Explorer::Fail("a unit given back twice");
    }
};

struct Number {
    std::size_t word;
    operator Value() const { return Get(word); }
    Value operator++() const { return Add(word, 1); }
    Value operator--() const { return Add(word, ~Value{0}); }
};

struct Identity {
    Value load(std::memory_order) const {
        if (fault == Fault::kReaderLooksAtDepth && op == Op::kReadUnlock)
            return Get(kWriters) == 0 ? ReadWriteSteps::kNobody : 0;
        return Get(kWriter);
    }
    void store(Value value, std::memory_order) const { Set(kWriter, value); }
};

struct Table {
    struct Entry {
        Number second;
        std::size_t thread;
        const Entry* operator->() const { return this; }
        bool operator!=(const Entry& other) const { return thread != other.thread; }
        bool operator==(const Entry& other) const { return thread == other.thread; }
    };
    Entry end() const { return {{0}, model::kThreads}; }
    Entry find(Value thread) const {
        return Get(kEntries + thread) != 0 ? Entry{{kCounts + thread}, thread} : end();
    }
    void erase(const Entry& entry) const { Set(kEntries + entry.thread, 0); }
    Number operator[](Value thread) const {
        Set(kEntries + thread, 1);
        return {kCounts + thread};
    }
};

struct Lock {
    Number mnReaders{kReaders}, mnWriters{kWriters};
    Table moReaderThreads;
    Identity mnWriterThread;
    Mutex moReaderMutex{kReaderMutex}, moWriterMutex{kWriterMutex};
    Semaphore moResource{kResource}, moGate{kGate};
};

using Steps = void (*)(Lock&, Value);
struct Kind {
    Steps read_lock, read_unlock, write_lock, write_unlock;
    std::vector<std::string> scripts;  // what one thread may do: r, R, w, W in the order of the four above
};
const Kind kReadPref{ReadWriteSteps::ReadLockAtOnce<Lock>,
                     ReadWriteSteps::ReadUnlock<Downgrade::kAllowed, Lock>,
                     ReadWriteSteps::WriteLock<Lock>,
                     ReadWriteSteps::WriteUnlock<Downgrade::kAllowed, Lock>,
                     {"rR", "rrRR", "wW", "wwWW", "wrWR", "wrRW"}};
const Kind kWritePref{ReadWriteSteps::ReadLockInTurn<Lock>,
                      ReadWriteSteps::ReadUnlock<Downgrade::kBarred, Lock>,
                      ReadWriteSteps::WriteLock<Lock>,
                      ReadWriteSteps::WriteUnlock<Downgrade::kBarred, Lock>,
                      {"rR", "rrRR", "wW", "wwWW", "rRwW"}};

// One call of a script; the model notes what the thread holds from its return on, up to the start of the
// unlock. A writer's read lock opens the lock for other readers from its start on.
Explorer::Call CallFor(const Kind& kind, char letter) {
    return [&kind, letter] {
        Lock lock;
        const std::size_t self = running->Self();
        const bool reads = letter == 'r' || letter == 'R';
        const std::size_t held = (reads ? kReads : kWrites) + self;
        if (letter == 'r' || letter == 'w') {
            op = reads ? Op::kReadLock : Op::kWriteLock;
            if (reads && Get(kWrites + self) != 0) Set(kOpened + self, 1);
            (reads ? kind.read_lock : kind.write_lock)(lock, self);
            ++running->Now().words[held];
        } else {
            op = reads ? Op::kReadUnlock : Op::kWriteUnlock;
            Add(held, ~Value{0});
            (reads ? kind.read_unlock : kind.write_unlock)(lock, self);
        }
    };
}

const char* Wrong(const Explorer& explorer, const State& state, bool at_the_end) {
    const auto& words = state.words;
    for (std::size_t writer = 0; writer < model::kThreads; ++writer) {
        for (std::size_t other = 0; other < model::kThreads; ++other) {
            if (writer == other || words[kWrites + writer] == 0) continue;
            if (words[kWrites + other] != 0) return "two writers";
            if (words[kReads + other] != 0 && words[kOpened + writer] == 0) return "a writer beside a reader";
        }
    }
    if (!at_the_end) return nullptr;
    for (std::size_t thread = 0; thread < model::kThreads; ++thread) {
        if (state.threads[thread].call != explorer.calls[thread].size()) return "a deadlock";
        if (words[kEntries + thread] != 0) return "an entry left";
    }
    const bool free = words[kReaders] == 0 && words[kWriters] == 0 &&
                      words[kWriter] == ReadWriteSteps::kNobody && words[kResource] == 1 && words[kGate] == 1;
    return free ? nullptr : "not free in the end";
}

// What is wrong with `kind` in some order of the steps of some three scripts.
std::string Explore(const Kind& kind, Fault seeded = Fault::kNone) {
    fault = seeded;
    const std::size_t count = kind.scripts.size();
    for (std::size_t code = 0; code < count * count * count; ++code) {
        const std::size_t picks[] = {code % count, code / count % count, code / count / count};
        if (picks[0] > picks[1] || picks[1] > picks[2]) continue;  // the threads are alike
        Explorer explorer;
        running = &explorer;
        explorer.check = [&](const State& state, bool end) { return Wrong(explorer, state, end); };
        State start;
        start.words[kWriter] = ReadWriteSteps::kNobody;
        start.words[kResource] = start.words[kGate] = 1;
        std::string scripts;
        for (std::size_t thread = 0; thread < model::kThreads; ++thread) {
            for (const char letter : kind.scripts[picks[thread]])
                explorer.calls[thread].push_back(CallFor(kind, letter));
            scripts += " " + kind.scripts[picks[thread]];
        }
        const std::string found = explorer.Explore(start);
        if (!found.empty()) return found + ":" + scripts;
    }
    return "";
}

TEST(ReadWriteModel, IsWholeInEveryOrderOfSteps) {
    EXPECT_EQ(Explore(kReadPref), "");
    EXPECT_EQ(Explore(kWritePref), "");
}

TEST(ReadWriteModel, FindsSeededFaults) {
    EXPECT_EQ(Explore(kReadPref, Fault::kWriterLooksOutside), "a unit given back twice: rR rR wrRW");
    EXPECT_EQ(Explore(kReadPref, Fault::kReaderLooksAtDepth), "not free in the end: rR rR wW");
}

}  // namespace

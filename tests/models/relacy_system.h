// The algorithms of the locks under the memory model of C++: a load may return any value that the model allows, in any
// schedule that the library Relacy tries. This is the system under them, its atomic variables, and the test that every
// memory order is needed: each is weakened in turn, and a fault must be found.
#ifndef ZANBASE_TESTS_RELACY_SYSTEM_H
#define ZANBASE_TESTS_RELACY_SYSTEM_H

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstring>
#include <sstream>
#include <vector>

#include "support/run_in_child.h"

#include <relacy/relacy.hpp>

// It replaces these words in the code of its tests; here that is the library's own code.
#undef new
#undef delete
#undef malloc
#undef calloc
#undef realloc
#undef free
#undef assert
#undef errno
#undef memory_order_relaxed
#undef memory_order_consume
#undef memory_order_acquire
#undef memory_order_release
#undef memory_order_acq_rel
#undef memory_order_seq_cst

// It counts allocations, but leaves this form to the standard library.
inline void DeleteCounted(void* block) noexcept { operator delete(block); }
void operator delete(void* block, std::size_t) noexcept { DeleteCounted(block); }

// A place in the source that accesses an atomic variable with more than relaxed order.
struct OrderedAccess {
    const char* file;
    unsigned int line;
    std::memory_order order;
    bool operator==(const OrderedAccess& other) const {
        return line == other.line && std::strcmp(file, other.file) == 0;
    }
};

// Those that the runs have met, in an array: Relacy counts what a run allocates.
inline std::array<OrderedAccess, 32> ordered_accesses;
inline std::size_t ordered_access_count = 0;
inline OrderedAccess weakened{"", 0, {}};  // the one that has this order instead of its own

inline rl::memory_order OrderOf(const OrderedAccess& access) {
    if (access == weakened) return static_cast<rl::memory_order>(weakened.order);  // the same numbers
    const auto end = ordered_accesses.begin() + ordered_access_count;
    if (access.order != std::memory_order_relaxed && std::find(ordered_accesses.begin(), end, access) == end)
        ordered_accesses.at(ordered_access_count++) = access;
    return static_cast<rl::memory_order>(access.order);
}

template <class T>
class RelacyAtomic {
public:
    RelacyAtomic(T value = {}) {
        const rl::preemption_disabler not_shared_yet(rl::ctx());
        mValue.store(value, rl::mo_relaxed, {});
    }

    T load(std::memory_order order, const char* file = __builtin_FILE(),
           unsigned int line = __builtin_LINE()) const {
        return mValue.load(OrderOf({file, line, order}), {"", file, line});
    }
    void store(T desired, std::memory_order order, const char* file = __builtin_FILE(),
               unsigned int line = __builtin_LINE()) {
        mValue.store(desired, OrderOf({file, line, order}), {"", file, line});
    }
    T fetch_add(T more, std::memory_order order, const char* file = __builtin_FILE(),
                unsigned int line = __builtin_LINE()) {
        return mValue.fetch_add(more, OrderOf({file, line, order}), {"", file, line});
    }
    T fetch_or(T bits, std::memory_order order, const char* file = __builtin_FILE(),
               unsigned int line = __builtin_LINE()) {
        return mValue.fetch_or(bits, OrderOf({file, line, order}), {"", file, line});
    }
    // The order on failure is relaxed if it is given, else what `order` has for a load.
    bool compare_exchange_strong(T& expected, T desired, std::memory_order order, std::memory_order,
                                 const char* file = __builtin_FILE(), unsigned int line = __builtin_LINE()) {
        const rl::debug_info place{"", file, line};
        return mValue.compare_exchange_strong(expected, desired, OrderOf({file, line, order}), place,
                                              rl::mo_relaxed, place);
    }
    bool compare_exchange_strong(T& expected, T desired, std::memory_order order,
                                 const char* file = __builtin_FILE(), unsigned int line = __builtin_LINE()) {
        return mValue.compare_exchange_strong(expected, desired, OrderOf({file, line, order}),
                                              {"", file, line});
    }

    // As the kernel does it: compares the newest value and queues the thread in one step. The thread may also wake up
    // for no reason.
    bool SleepWhile(unsigned int expected, bool has_deadline) {
        const T newest = mValue.fetch_add(0, rl::mo_relaxed, {});
        if (static_cast<unsigned int>(newest) != expected) return true;
        return mValue.wait(rl::ctx(), has_deadline, true, {}) != rl::unpark_reason_timeout;
    }
    int WakeSleepers(int most) {
        rl::ctx().sched();  // other threads may run before
        return mValue.wake(rl::ctx(), most, {});
    }

private:
    rl::generic_atomic<T, false> mValue;
};

// No thread is killed here, so no wake-up is noted; futex_model.cpp explores kills.
struct RelacySystem {
    using Word = RelacyAtomic<unsigned int>;
    using DoubleWord = RelacyAtomic<unsigned long long>;
    using Deadline = const int*;
    struct ForwardWakeupIfKilled {
        template <class AnyWord>
        explicit ForwardWakeupIfKilled(AnyWord&) {}
        ~ForwardWakeupIfKilled() {}
    };
    struct ForwardSignalIfKilled {
        ForwardSignalIfKilled(Word&, unsigned int) {}
        ~ForwardSignalIfKilled() {}
    };
    static constexpr int kEverySleeper = 3;

    static bool IsAlone() { return false; }
    static DoubleWord& LowerHalf(DoubleWord& word) { return word; }
    template <class AnyWord>
    static bool SleepWhile(AnyWord& word, unsigned int expected, Deadline deadline) {
        return word.SleepWhile(expected, deadline != nullptr);
    }
    template <class AnyWord>
    static int WakeSleepers(AnyWord& word, int most) {
        return word.WakeSleepers(most);
    }
};

// A plain variable: an access that races with another is a fault.
class RelacyPlain {
public:
    RelacyPlain() {
        const rl::preemption_disabler not_shared_yet(rl::ctx());
        mValue({}).store(0);
    }
    operator unsigned int() const { return mValue({}).load(); }
    unsigned int operator=(unsigned int value) {
        mValue({}).store(value);
        return value;
    }
    unsigned int operator++() { return *this = *this + 1; }
    unsigned int operator--() { return *this = *this - 1; }

private:
    rl::var<unsigned int> mValue;
};

// What Relacy finds in some schedules of the threads of `Suite`; it describes that on `output`.
template <class Suite>
rl::test_result_e Simulate(std::ostream& output) {
    rl::test_params parameters;
    parameters.iteration_count = 20000;
    parameters.execution_depth_limit = 10000;
    parameters.output_stream = parameters.progress_stream = &output;
    rl::simulate<Suite>(parameters);
    return parameters.test_result;
}

// Finds nothing in the code as it is, and a fault once any of its orders is weakened, at `accesses` places.
template <class Suite>
void ExpectNeedsItsOrders(std::size_t accesses) {
    ordered_access_count = 0;
    EXPECT_EQ(Simulate<Suite>(std::cout), rl::test_result_success);
    EXPECT_EQ(ordered_access_count, accesses);
    std::ostream nowhere(nullptr);
    for (std::size_t i = 0; i < ordered_access_count; ++i) {
        weakened = ordered_accesses[i];
        std::vector<std::memory_order> weaker{std::memory_order_relaxed};
        if (weakened.order == std::memory_order_acq_rel)
            weaker = {std::memory_order_acquire, std::memory_order_release};
        for (const std::memory_order order : weaker) {
            weakened.order = order;
            // In a child, since a fault may also be an access through a null pointer.
            const ChildResult child = RunInChild([&] { return static_cast<int>(Simulate<Suite>(nowhere)); });
            EXPECT_NE(child.exit_code, rl::test_result_success)
                << weakened.file << ':' << weakened.line << ": weaker order " << static_cast<int>(order);
        }
    }
    weakened = {"", 0, {}};
}

#endif

// Rows of slots, one row for each thread number. Slots are added while other threads use theirs: no slot ever
// moves, and nothing but the addition of rows needs a lock.
//
//   GrowingArray:  maSegments[0] -> kFirst items;  [1] -> 2 kFirst items;  [2] -> 4 kFirst items;  …
//   RowTable:      moRows, a GrowingArray of rows; each row is a GrowingArray of slots
//
// - A segment pointer changes once, from null to its segment. Doubling segments keep their number small and
//   waste at most half of the memory.
// - A slot is written by the thread of its row, or with exclusive access to the table.
// - Slots are made before they are used, so that a thread that uses its own allocates nothing. The exception is a
//   slot added while another thread adds rows: either may miss the other's part, so At makes what is missing.
//
// Both are templates over the atomic variables as well, for the models of tests/models. The memory orders are held by
// MemoryModel.RowTableNeedsItsOrders.
#ifndef ZANBASE_TIMING_ROW_TABLE_H
#define ZANBASE_TIMING_ROW_TABLE_H

#include <array>
#include <atomic>
#include <cstddef>
#include <memory>

#include "platform/compiler.h"
#include "zanbase/mutex.h"

// Held while rows are added, and for nothing else.
extern HMutex& goTimerGrowthMutex;  // built in load_time.cpp, never destroyed

// An array whose items are made on demand, by any thread, and keep their address. Requires: kFirst is a multiple of
// the items of a Line.
template <class Item, std::size_t kFirst, template <class> class Atomic = std::atomic>
class GrowingArray {
public:
    GrowingArray() = default;
    ~GrowingArray() {
        for (Atomic<Line*>& segment : maSegments) delete[] segment.load(std::memory_order_relaxed);
    }
    GrowingArray(const GrowingArray&) = delete;
    GrowingArray& operator=(const GrowingArray&) = delete;

    // Null if the item was not made yet. Thread-safe.
    Item* Find(std::size_t index) const {
        const Place place = PlaceOf(index);
        // Pairs with the exchange in MakeSegment.
        Line* const lines = maSegments[place.segment].load(std::memory_order_acquire);
        return lines != nullptr ? &ItemOf(lines, place) : nullptr;
    }

    // Makes the item if it is missing. Thread-safe. std::bad_alloc leaves the array as it was.
    Item& At(std::size_t index) {
        const Place place = PlaceOf(index);
        // Pairs with the exchange in MakeSegment.
        Line* lines = maSegments[place.segment].load(std::memory_order_acquire);
        if (ZANBASE_UNLIKELY(lines == nullptr)) lines = MakeSegment(place.segment);
        return ItemOf(lines, place);
    }

    // Calls `visit` with each item that was made. Thread-safe if `visit` is.
    template <class Visit>
    void ForEach(Visit visit) {
        for (std::size_t segment = 0; segment < kSegments; ++segment) {
            Line* const lines = maSegments[segment].load(std::memory_order_acquire);
            const std::size_t count = lines != nullptr ? (kFirst << segment) / kLineItems : 0;
            for (std::size_t line = 0; line < count; ++line)
                for (Item& item : lines[line].maItems) visit(item);
        }
    }

private:
    static constexpr std::size_t kLineItems = 16;
    static constexpr std::size_t kSegments = 32;
    static_assert(kFirst % kLineItems == 0);

    // Whole pairs of cache lines, because processors fetch lines in pairs. So arrays share none.
    struct alignas(128) Line {
        std::array<Item, kLineItems> maItems;
    };

    struct Place {
        std::size_t segment;
        std::size_t item;  // within the segment
    };

    // In units of kFirst items, segment k holds the units 2^k - 1 to 2^(k+1) - 2.
    static Place PlaceOf(std::size_t index) {
        const unsigned long long unit = index / kFirst + 1;
        const auto segment = std::size_t{HighestBit(unit)};
        return {segment, index - kFirst * ((std::size_t{1} << segment) - 1)};
    }

    static Item& ItemOf(Line* lines, Place place) {
        return lines[place.item / kLineItems].maItems[place.item % kLineItems];
    }

    // Of two threads that make the same segment, one deletes its own.
    ZANBASE_NOT_INLINE Line* MakeSegment(std::size_t segment) {
        std::unique_ptr<Line[]> lines(new Line[(kFirst << segment) / kLineItems]);
        Line* other = nullptr;
        // Release, for the loads in Find and At: a thread that finds the segment finds its items made. Acquire, for
        // another thread's exchange.
        if (!maSegments[segment].compare_exchange_strong(other, lines.get(), std::memory_order_acq_rel))
            return other;
        return lines.release();
    }

    std::array<Atomic<Line*>, kSegments> maSegments{};
};

// An operation that throws std::bad_alloc has no visible effect.
template <class Slot, template <class> class Atomic = std::atomic>
class RowTable {
public:
    explicit RowTable(std::size_t rows) { AddRows(rows, 0); }

    // Pairs with the store in AddRows. Thread-safe.
    std::size_t RowCount() const { return mnRows.load(std::memory_order_acquire); }

    // Null if the slot was not made yet. Thread-safe. Requires: `row` is below RowCount().
    Slot* Find(std::size_t row, std::size_t slot) const { return moRows.Find(row)->Find(slot); }

    // Makes the slot if it is missing. Thread-safe. Requires: `row` is below RowCount().
    Slot& At(std::size_t row, std::size_t slot) { return moRows.Find(row)->At(slot); }

    // Makes the slot of every row. Thread-safe.
    void AddSlot(std::size_t slot) {
        for (std::size_t row = 0; row < RowCount(); ++row) At(row, slot);
    }

    // Adds rows, with slots 0 to `slots` - 1 in each, until there are `rows`. Requires: one thread at a time.
    void AddRows(std::size_t rows, std::size_t slots) {
        for (std::size_t row = RowCount(); row < rows; ++row) {
            auto& new_row = moRows.At(row);
            for (std::size_t slot = 0; slot < slots; slot += kFirstSlots) new_row.At(slot);
        }
        // Pairs with the load in RowCount.
        if (rows > RowCount()) mnRows.store(rows, std::memory_order_release);
    }

private:
    static constexpr std::size_t kFirstSlots = 64;
    static constexpr std::size_t kFirstRows = 16;

    GrowingArray<GrowingArray<Slot, kFirstSlots, Atomic>, kFirstRows, Atomic> moRows;
    Atomic<std::size_t> mnRows{0};
};

#endif

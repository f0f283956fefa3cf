// Rows of slots, one row a thread: rows stay where they are while the table grows under their threads' hands.
//
//   mpoTable -> newest table -> row 0, row 1, …      (maTables keeps the older tables, which have the same
//                                                    rows: a thread may still be reading them)
//
// - A row is written by its own thread, or by whoever has the whole table for himself.
// - A table is not changed once mpoTable has pointed at it; a longer one takes its place.
// - All rows of the newest table have the same length.
// - Slots of different rows lie in different cache lines, two lines apart: processors fetch them in pairs.
#ifndef ZANBASE_TIMING_ROW_TABLE_H
#define ZANBASE_TIMING_ROW_TABLE_H

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <deque>
#include <memory>
#include <new>
#include <vector>

#include "zanbase/mutex.h"

// Held while Toggle adds rows, and for nothing else.
extern HMutex& goTimerGrowthMutex;  // built in load_time.cpp, never destroyed

// Gives out whole pairs of cache lines.
template <class T>
struct LinePairs {
    using value_type = T;

    LinePairs() = default;
    template <class Other>
    LinePairs(const LinePairs<Other>&) noexcept {}

    T* allocate(std::size_t count) {
        const std::size_t bytes = (count * sizeof(T) + kBytes - 1) / kBytes * kBytes;
        return static_cast<T*>(::operator new(bytes, std::align_val_t(kBytes)));
    }
    void deallocate(T* block, std::size_t) noexcept { ::operator delete(block, std::align_val_t(kBytes)); }

    friend bool operator==(const LinePairs&, const LinePairs&) { return true; }
    friend bool operator!=(const LinePairs&, const LinePairs&) { return false; }

private:
    static constexpr std::size_t kBytes = 128;
};

// What throws std::bad_alloc here has changed nothing that can be seen.
template <class Slot>
class RowTable {
public:
    using Row = std::vector<Slot, LinePairs<Slot>>;
    using Table = std::vector<std::shared_ptr<Row>>;

    explicit RowTable(std::size_t rows) : maTables(1), mpoTable(&maTables.front()) { GrowTo(rows); }

    // The newest table. Any thread.
    const Table& Rows() const { return *mpoTable.load(std::memory_order_acquire); }

    std::size_t RowLength() const { return Rows().empty() ? 0 : Rows().front()->size(); }

    // Adds rows as long as the first, with fresh slots, until there are `count`. One thread at a time, while
    // others may use their rows; a table that is long enough is left alone.
    void GrowTo(std::size_t count) {
        Table longer = Rows();
        if (longer.size() >= count) return;
        while (longer.size() < count) longer.push_back(std::make_shared<Row>(RowLength()));
        maTables.push_back(std::move(longer));
        mpoTable.store(&maTables.back(), std::memory_order_release);
    }

    // Makes room for one more slot in each row, so that the next AddSlot can't fail. With nothing else going
    // on.
    void ReserveSlot() {
        for (const auto& row : Rows())
            if (row->size() == row->capacity()) row->reserve(std::max<std::size_t>(2 * row->size(), 8));
    }

    void AddSlot() {
        for (const auto& row : Rows()) row->emplace_back();
    }

private:
    std::deque<Table> maTables;          // guarded by whatever keeps growth to one thread; adding moves none
    std::atomic<const Table*> mpoTable;  // never null
};

#endif

// Rows of slots, one row for each thread: the address of a slot never changes, so threads can use their slots
// while the table grows.
//
//   mpoTable -> newest table -> segments of row 0, segments of row 1, …   (each a block of kSegmentSlots slots;
//                                                                          older tables have the same segments)
//
// - A slot is written by the thread of its row, or with exclusive access to the table.
// - A table is not changed once mpoTable points at it. Growth replaces it by a larger one and keeps the older
//   ones, because a thread may still be reading them.
// - A segment fills whole pairs of cache lines, because processors fetch lines in pairs. So rows share none.
#ifndef ZANBASE_TIMING_ROW_TABLE_H
#define ZANBASE_TIMING_ROW_TABLE_H

#include <algorithm>
#include <array>
#include <atomic>
#include <cstddef>
#include <deque>
#include <memory>
#include <vector>

#include "zanbase/mutex.h"

// Held while rows or timers are added.
extern HMutex& goTimerGrowthMutex;  // built in load_time.cpp, never destroyed

// An operation that throws std::bad_alloc has no visible effect.
template <class Slot>
class RowTable {
public:
    explicit RowTable(std::size_t rows) : maTables(1), mpoTable(&maTables.front()) { GrowTo(rows, 0); }

    // Any thread.
    std::size_t RowCount() const { return Newest().mnRows; }

    // Requires: the call of GrowTo that made the slot happens-before this one.
    Slot& At(std::size_t row, std::size_t slot) const {
        const Table& table = Newest();
        const auto& segment = table.maSegments[row * table.mnRowSegments + slot / kSegmentSlots];
        return segment->maSlots[slot % kSegmentSlots];
    }

    // Adds slots until there are at least `rows` rows of at least `slots` slots. Other threads may use their
    // rows meanwhile. Requires: one thread at a time calls this.
    void GrowTo(std::size_t rows, std::size_t slots) {
        const Table& old = Newest();
        const std::size_t row_segments = (slots + kSegmentSlots - 1) / kSegmentSlots;
        if (rows <= old.mnRows && row_segments <= old.mnRowSegments) return;
        Table larger{std::max(rows, old.mnRows), std::max(row_segments, old.mnRowSegments), {}};
        for (std::size_t row = 0; row < larger.mnRows; ++row) {
            for (std::size_t index = 0; index < larger.mnRowSegments; ++index) {
                const bool is_old = row < old.mnRows && index < old.mnRowSegments;
                larger.maSegments.push_back(is_old ? old.maSegments[row * old.mnRowSegments + index]
                                                   : std::make_shared<Segment>());
            }
        }
        maTables.push_back(std::move(larger));
        mpoTable.store(&maTables.back(), std::memory_order_release);
    }

private:
    static constexpr std::size_t kSegmentSlots = 64;

    struct alignas(128) Segment {
        std::array<Slot, kSegmentSlots> maSlots;
    };

    struct Table {
        std::size_t mnRows = 0;
        std::size_t mnRowSegments = 0;  // segments of each row
        std::vector<std::shared_ptr<Segment>> maSegments;
    };

    const Table& Newest() const { return *mpoTable.load(std::memory_order_acquire); }

    std::deque<Table> maTables;          // accessed by GrowTo alone; push_back does not move the elements
    std::atomic<const Table*> mpoTable;  // never null
};

#endif

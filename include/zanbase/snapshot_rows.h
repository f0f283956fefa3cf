/// @file
/// The arithmetic of snapshots, the same for all three accounts: rows are summed by their key. For zanbase/snapshot.h
/// alone.
#ifndef ZANBASE_SNAPSHOT_ROWS_H
#define ZANBASE_SNAPSHOT_ROWS_H

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

#include "zanbase/export.h"

/// @cond

ZANBASE_MODE_BEGIN

// A row type has
//   bool KeyLess(const Row&) const          a strict order of the keys
//   Row WithoutFigures() const              the key alone, all figures 0
//   void Add(const Row&, int sign)          adds the figures, or subtracts them
//   bool HasFigures() const                 a figure is not 0
struct HSnapshotArithmetic {
    // left + sign * right. Whole numbers wrap instead of overflowing.
    static long long Combined(long long left, long long right, int sign) {
        const auto whole = static_cast<unsigned long long>(right);
        return static_cast<long long>(static_cast<unsigned long long>(left) + (sign < 0 ? 0 - whole : whole));
    }
    static double Combined(double left, double right, int sign) { return left + sign * right; }

    // One row for each key of `rows` and `others`, in the order of the keys.
    template <class Row>
    static std::vector<Row> CombinedRows(const std::vector<Row>& rows, const std::vector<Row>& others,
                                         int sign) {
        std::vector<std::pair<const Row*, int>> terms;
        terms.reserve(rows.size() + others.size());
        for (const Row& row : rows) terms.emplace_back(&row, 1);
        for (const Row& row : others) terms.emplace_back(&row, sign);
        std::stable_sort(terms.begin(), terms.end(), [](const auto& left, const auto& right) {
            return left.first->KeyLess(*right.first);
        });
        std::vector<Row> result;
        for (const auto& [row, row_sign] : terms) {
            if (result.empty() || result.back().KeyLess(*row)) result.push_back(row->WithoutFigures());
            result.back().Add(*row, row_sign);
        }
        return result;
    }

    // `rows` less `earlier`, without the rows that have no difference.
    template <class Row>
    static std::vector<Row> RowsSince(const std::vector<Row>& rows, const std::vector<Row>& earlier) {
        std::vector<Row> difference = CombinedRows(rows, earlier, -1);
        difference.erase(std::remove_if(difference.begin(), difference.end(),
                                        [](const Row& row) { return !row.HasFigures(); }),
                         difference.end());
        return difference;
    }
};

ZANBASE_MODE_END

/// @endcond

#endif

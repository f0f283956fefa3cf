// The arithmetic of snapshots, the same for all three accounts: rows are summed by their key.
#ifndef ZANBASE_SNAPSHOT_SNAPSHOT_ROWS_H
#define ZANBASE_SNAPSHOT_SNAPSHOT_ROWS_H

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

// left + sign * right for the figures of a row. Whole numbers wrap instead of overflowing.
inline long long Combined(long long left, long long right, int sign) {
    const auto whole = static_cast<unsigned long long>(right);
    return static_cast<long long>(static_cast<unsigned long long>(left) + (sign < 0 ? 0 - whole : whole));
}

inline double Combined(double left, double right, int sign) { return left + sign * right; }

// `Rules` describes the rows of an account:
//   Row                                            the type of a row
//   static bool KeyLess(const Row&, const Row&)    a strict order of the keys
//   static Row WithoutFigures(const Row&)          the key alone, all figures 0
//   static void Add(Row&, const Row&, int sign)    adds the figures
//   static bool IsZero(const Row&)                 all figures are 0
//
// One row for each key of `rows` and `others`, in the order of the keys.
template <class Rules, class Row = typename Rules::Row>
std::vector<Row> CombinedRows(const std::vector<Row>& rows, const std::vector<Row>& others, int sign) {
    std::vector<std::pair<const Row*, int>> terms;
    terms.reserve(rows.size() + others.size());
    for (const Row& row : rows) terms.emplace_back(&row, 1);
    for (const Row& row : others) terms.emplace_back(&row, sign);
    std::stable_sort(terms.begin(), terms.end(), [](const auto& left, const auto& right) {
        return Rules::KeyLess(*left.first, *right.first);
    });
    std::vector<Row> result;
    for (const auto& [row, row_sign] : terms) {
        if (result.empty() || Rules::KeyLess(result.back(), *row))
            result.push_back(Rules::WithoutFigures(*row));
        Rules::Add(result.back(), *row, row_sign);
    }
    return result;
}

// `rows` less `earlier`, without the rows that have no difference.
template <class Rules, class Row = typename Rules::Row>
std::vector<Row> RowsSince(const std::vector<Row>& rows, const std::vector<Row>& earlier) {
    std::vector<Row> difference = CombinedRows<Rules>(rows, earlier, -1);
    difference.erase(std::remove_if(difference.begin(), difference.end(), Rules::IsZero), difference.end());
    return difference;
}

#endif

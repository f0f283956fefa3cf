/// @file
/// A sort to be called as the standard `qsort` is, whose permutation is the same on every system.
#ifndef ZANBASE_SORT_H
#define ZANBASE_SORT_H

#include "zanbase/export.h"

/// Brings an array of `count` elements, `size` bytes each, into ascending order in its place.
///
///     int numbers[] = {3, 1, 2};
///     ZAN_qsort(numbers, 3, sizeof numbers[0], CompareInts);
///
/// `compare(a, b)` is called on elements where they lie in the array and tells by its sign whether `a` sorts
/// after (positive), before (negative) or level with `b`. The sort isn't stable, but which comparisons are
/// made, and so where level elements land, depends on the answers alone: every build gives the same
/// permutation. Nothing is allocated, and no element ever leaves the array: whenever `compare` runs, the
/// array holds all its elements, in some order. So `compare` may throw, or leave by `longjmp`, and the
/// elements are still there, unsorted. If it contradicts itself (numbers that are NaN, say), the order is
/// any, and nothing outside the array is touched.
///
/// Time is about `count` log2(`count`) comparisons for distinct elements in any usual order. Level elements
/// stay on the side of the pivot where they are met, so an array with few distinct values takes time that is
/// quadratic in the number of level ones (all level, or sorted already, is fast). There, let `compare` decide
/// between level elements by a second key, such as a number of the record, or use `std::sort`. Use
/// `std::stable_sort` where level elements have to keep their order.
///
/// `size` is at least 1, or nothing is done; elements need no alignment. Different arrays may be sorted at
/// the same time, by `compare` too; the same one must not be.
ZANBASE_API void ZAN_qsort(void* base, unsigned long long count, unsigned long long size,
                           int (*compare)(const void*, const void*));

#endif

/// @file
/// An in-place sort with the interface of the standard `qsort` and the same permutation on every system.
#ifndef ZANBASE_SORT_H
#define ZANBASE_SORT_H

#include "zanbase/export.h"

/// @addtogroup parallel
/// @{

/// Sorts an array of `count` elements of `size` bytes each into ascending order, in place.
///
///     int numbers[] = {3, 1, 2};
///     ZAN_qsort(numbers, 3, sizeof numbers[0], CompareInts);
///
/// `compare(a, b)` gets pointers to elements in the array. Its result is positive if `a` sorts after `b`,
/// negative if before, 0 if they are equal. The sort is not stable. The sequence of comparisons, and so the
/// place of each equal element, depends on the results of `compare` alone: every build gives the same
/// permutation.
///
/// The sort allocates nothing and keeps no element outside the array: whenever `compare` runs, the array
/// holds all its elements in some order. So `compare` may throw or leave by `longjmp`; the elements are then
/// complete and unsorted. If `compare` contradicts itself (for numbers that are NaN, for example), the order
/// is unspecified, and nothing outside the array is touched.
///
/// Time: about `count` log2(`count`) comparisons for distinct elements, and for arrays that are sorted or
/// whose elements are all equal. An array with few distinct values takes time quadratic in the number of
/// equal elements. For such arrays let `compare` order equal elements by a second key, such as a record
/// number, or use `std::sort`. Where equal elements must keep their order use `std::stable_sort`.
///
/// A `size` of 0 does nothing. Elements need no alignment. Thread-safe for different arrays, from inside
/// `compare` too.
ZANBASE_API void ZAN_qsort(void* base, unsigned long long count, unsigned long long size,
                           int (*compare)(const void*, const void*));

/// @}

#endif

// The sort against a model of its steps: the same comparisons and permutation, for elements of any size.
#include "zanbase/sort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <utility>
#include <vector>

std::string array;  // of elements, which begin with their key
std::size_t size = 1;
std::vector<std::pair<long, long>> comparisons;  // by offsets

int Compare(const void* left, const void* right) {
    const auto *const a = static_cast<const char*>(left), *const b = static_cast<const char*>(right);
    comparisons.emplace_back(a - array.data(), b - array.data());
    return *a - *b;  // 1 as well as more
}

int AlwaysAbove(const void* element, const void*) { return *static_cast<const char*>(element) % 2 + 2; }

char* At(std::size_t number) { return &array[number * size]; }  // the model uses element numbers
int Compare(std::size_t a, std::size_t b) { return Compare(At(a), At(b)); }
void Swap(std::size_t a, std::size_t b) { std::swap_ranges(At(a), At(a) + size, At(b)); }

std::size_t MedianOf(std::size_t a, std::size_t b, std::size_t c) {
    std::size_t larger = a, smaller = b;
    if (Compare(a, b) <= 0) std::swap(larger, smaller);
    if (Compare(larger, c) <= 0) return larger;
    return Compare(smaller, c) < 0 ? c : smaller;
}

// Moves the elements below that at `mid` before it and those above it behind it; smaller parts first.
void Partition(std::size_t lo, std::size_t hi) {
    if (hi - lo < 4) return;
    std::size_t mid = lo + (hi - lo) / 2, i = lo, j = hi - 1;
    if (hi - lo >= 6) Swap(MedianOf(lo, mid, j), mid);
    while (i < j) {
        while (i < mid && Compare(i, mid) <= 0) ++i;
        while (j > mid && Compare(mid, j) <= 0) --j;
        Swap(i, j);
        if (i == mid) {
            mid = j;
        } else if (j == mid) {
            mid = i;
        }
        if (i != mid) ++i;
        if (j != mid) --j;
    }
    const bool is_upper_smaller = hi - mid - 1 < mid - lo;
    if (is_upper_smaller) Partition(mid + 1, hi);
    Partition(lo, mid);
    if (!is_upper_smaller) Partition(mid + 1, hi);
}

void Sort(std::size_t count) {
    Partition(0, count);
    std::size_t smallest = 0;
    for (std::size_t e = 1; e < std::min<std::size_t>(count, 4); ++e)
        if (Compare(smallest, e) > 0) smallest = e;
    Swap(smallest, 0);
    for (std::size_t next = 1; next < count; ++next) {
        std::size_t place = next;
        while (Compare(place - 1, next) > 0) --place;
        std::rotate(At(place), At(next), At(next) + size);
    }
}

TEST(Sort, MakesTheComparisonsAndThePermutationOfTheModel) {
    std::minstd_rand random;
    for (size = 1; size <= 100; ++size) {
        for (std::size_t count = 1; count <= 200; count += count < 64 ? 1 : 136) {
            std::string unsorted(count * size, '\0');
            for (char& byte : unsorted) byte = static_cast<char>(random() % (count % 2 == 0 ? 256 : 7));
            array = unsorted;
            Sort(count);
            const auto expected = std::pair(std::exchange(array, unsorted), std::exchange(comparisons, {}));
            ZAN_qsort(array.data(), count, size, Compare);
            ASSERT_EQ(std::pair(array, std::exchange(comparisons, {})), expected) << size << ' ' << count;
            ZAN_qsort(array.data(), count, size, AlwaysAbove);  // stays in the array
        }
    }
}

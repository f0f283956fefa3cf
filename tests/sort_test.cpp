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
    return 3 * (*a - *b);
}

int AlwaysAbove(const void* element, const void*) { return *static_cast<const char*>(element) % 2 + 2; }

char* At(std::size_t number) { return &array[number * size]; }  // the model uses element numbers
int Compare(std::size_t a, std::size_t b) { return Compare(At(a), At(b)); }
void Swap(std::size_t a, std::size_t b) { std::swap_ranges(At(a), At(a) + size, At(b)); }

void Partition(std::size_t lo, std::size_t hi) {
    if (hi - lo < 4) return;
    std::size_t mid = lo + (hi - lo) / 2, i = lo, j = hi - 1;
    if (hi - lo >= 6) {
        std::size_t median = Compare(lo, mid) > 0 ? lo : mid;
        if (Compare(median, j) > 0 && Compare(median = lo + mid - median, j) < 0) median = j;
        Swap(median, mid);
    }
    for (; i < j; i += i != mid, j -= j != mid) {
        while (i < mid && Compare(i, mid) <= 0) ++i;
        while (j > mid && Compare(mid, j) <= 0) --j;
        Swap(i, j);
        mid = i == mid ? j : j == mid ? i : mid;
    }
    if (hi - mid - 1 < mid - lo) return Partition(mid + 1, hi), Partition(lo, mid);
    Partition(lo, mid), Partition(mid + 1, hi);
}

void Sort(std::size_t count) {
    Partition(0, count);
    std::size_t smallest = 0;
    for (std::size_t e = 1; e < std::min<std::size_t>(count, 4); ++e)
        if (Compare(smallest, e) > 0) smallest = e;
    Swap(smallest, 0);
    for (std::size_t p = 1, q = 1; p < count; q = ++p) {
        while (Compare(q - 1, p) > 0) --q;
        std::rotate(At(q), At(p), At(p) + size);
    }
}

TEST(Sort, MakesTheComparisonsAndThePermutationOfTheModel) {
    std::minstd_rand random;
    for (size = 1; size <= 100; ++size)
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

// A quicksort that leaves small partitions to one insertion pass. The sequence of its comparisons is frozen:
// it determines the place of equal elements, so no step may be added, removed or swapped. How bytes move
// between two comparisons is free; they move in the widest blocks that the element allows.
//
// Invariant: at every comparison the array is a permutation of its elements.
#include "zanbase/sort.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

namespace {

using Compare = int (*)(const void*, const void*);

struct Block {
    unsigned char bytes[32];
};

// Swaps two elements from `offset` on in whole words; returns the offset of the rest.
template <class Word>
std::size_t SwapWords(char* a, char* b, std::size_t offset, std::size_t size) {
    for (; size - offset >= sizeof(Word); offset += sizeof(Word)) {
        Word from_a;
        Word from_b;
        std::memcpy(&from_a, a + offset, sizeof(Word));
        std::memcpy(&from_b, b + offset, sizeof(Word));
        std::memcpy(a + offset, &from_b, sizeof(Word));
        std::memcpy(b + offset, &from_a, sizeof(Word));
    }
    return offset;
}

// Moves the element at `from` down to `to`, and those in between up by one place, in the same way.
template <class Word>
std::size_t RotateWords(char* to, char* from, std::size_t offset, std::size_t size) {
    for (; size - offset >= sizeof(Word); offset += sizeof(Word)) {
        Word moved;
        char* place = from + offset;
        std::memcpy(&moved, place, sizeof(Word));
        for (; place != to + offset; place -= size) std::memcpy(place, place - size, sizeof(Word));
        std::memcpy(place, &moved, sizeof(Word));
    }
    return offset;
}

// One sort. `Size` is a constant for the common element sizes, so that a move is a load and a store; else a
// number.
template <class Size>
class Sort {
public:
    Sort(Size size, Compare compare)
        : mnElementSize(size), mnInsertionBytes(4 * size), mnMedianBytes(6 * size), mpfnCompare(compare) {}

    void Run(char* base, std::size_t count) const {
        char* const end = base + mnElementSize * count;
        char* limit = end;
        if (count >= 4) {
            Partition(base, end);
            limit = base + mnInsertionBytes;
        }
        PlaceSentinel(base, limit);
        InsertAll(base, end);
    }

private:
    // The smallest element is among the first four: partitions of three or fewer are not split.
    void PlaceSentinel(char* base, const char* limit) const {
        char* smallest = base;
        for (char* element = base + mnElementSize; element < limit; element += mnElementSize)
            if (mpfnCompare(smallest, element) > 0) smallest = element;
        if (smallest != base) Swap(smallest, base);
    }

    // Moves each element back to its place. The smallest element, at `base`, ends each loop; the comparison
    // with `base` keeps a contradictory `compare` inside the array.
    void InsertAll(char* base, const char* end) const {
        for (char* element = base + mnElementSize; element < end; element += mnElementSize) {
            char* place = element;
            while (place != base && mpfnCompare(place - mnElementSize, element) > 0) place -= mnElementSize;
            if (place != element) Rotate(place, element);
        }
    }

    // Partitions [lo, hi) until the rest is small. Recurses into the smaller side and loops on the larger, so
    // the depth is below log2 of the count.
    void Partition(char* lo, char* hi) const {
        std::size_t bytes;
        do {
            char* const pivot = Split(lo, hi, ChoosePivot(lo, hi));
            char* const above = pivot + mnElementSize;
            const auto left = static_cast<std::size_t>(pivot - lo);
            const auto right = static_cast<std::size_t>(hi - above);
            if (left <= right) {
                if (left >= mnInsertionBytes) Partition(lo, pivot);
                lo = above;
                bytes = right;
            } else {
                if (right >= mnInsertionBytes) Partition(above, hi);
                hi = pivot;
                bytes = left;
            }
        } while (bytes >= mnInsertionBytes);
    }

    // Returns the middle element. In a partition of six elements or more it first becomes the median of
    // three.
    char* ChoosePivot(char* lo, char* hi) const {
        const auto bytes = static_cast<std::size_t>(hi - lo);
        char* const mid = lo + mnElementSize * (bytes / mnElementSize / 2);
        if (bytes < mnMedianBytes) return mid;
        char* const last = hi - mnElementSize;
        const bool lo_is_larger = mpfnCompare(lo, mid) > 0;
        char* median = lo_is_larger ? lo : mid;
        if (mpfnCompare(median, last) > 0) {
            median = lo_is_larger ? mid : lo;
            if (mpfnCompare(median, last) < 0) median = last;
        }
        if (median != mid) Swap(median, mid);
        return mid;
    }

    // Moves smaller elements to the left of the pivot and larger ones to the right, and returns its final
    // place. Swaps may move the pivot. Invariant: elements in [lo, i) and (j, hi) are on their side.
    char* Split(char* lo, char* hi, char* mid) const {
        char* i = lo;
        char* j = hi - mnElementSize;
        for (;;) {
            while (i < mid && mpfnCompare(i, mid) <= 0) i += mnElementSize;
            while (j > mid && mpfnCompare(mid, j) <= 0) j -= mnElementSize;
            if (i == mid && j == mid) return mid;
            Swap(i, j);
            if (j == mid) {
                mid = i;
                j -= mnElementSize;
            } else if (i == mid) {
                mid = j;
                i += mnElementSize;
            } else {
                i += mnElementSize;
                j -= mnElementSize;
            }
        }
    }

    void Swap(char* a, char* b) const {
        std::size_t done = SwapWords<Block>(a, b, 0, mnElementSize);
        done = SwapWords<std::uint64_t>(a, b, done, mnElementSize);
        done = SwapWords<std::uint32_t>(a, b, done, mnElementSize);
        SwapWords<unsigned char>(a, b, done, mnElementSize);
    }

    void Rotate(char* to, char* from) const {
        std::size_t done = RotateWords<Block>(to, from, 0, mnElementSize);
        done = RotateWords<std::uint64_t>(to, from, done, mnElementSize);
        done = RotateWords<std::uint32_t>(to, from, done, mnElementSize);
        RotateWords<unsigned char>(to, from, done, mnElementSize);
    }

    const Size mnElementSize;
    const std::size_t mnInsertionBytes;  // smaller partitions are left to the insertion pass
    const std::size_t mnMedianBytes;     // from this size on the pivot is a median of three
    const Compare mpfnCompare;
};

template <std::size_t kSize>
using Fixed = std::integral_constant<std::size_t, kSize>;

}  // namespace

void ZAN_qsort(void* base, unsigned long long count, unsigned long long size,
               int (*compare)(const void*, const void*)) {
    if (count < 2 || size == 0) return;
    char* const first = static_cast<char*>(base);
    switch (size) {
        case 4:
            return Sort(Fixed<4>(), compare).Run(first, count);
        case 8:
            return Sort(Fixed<8>(), compare).Run(first, count);
        case 16:
            return Sort(Fixed<16>(), compare).Run(first, count);
        default:
            return Sort(static_cast<std::size_t>(size), compare).Run(first, count);
    }
}

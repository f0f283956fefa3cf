// The sort against a model of its steps that moves single bytes: the same comparisons, the same bytes.
#include "zanbase/sort.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstring>
#include <random>
#include <string>
#include <utility>
#include <vector>

namespace {

using Bytes = std::vector<unsigned char>;
using Trace = std::vector<std::pair<std::ptrdiff_t, std::ptrdiff_t>>;  // element numbers of each comparison

// What the comparison under test knows.
const unsigned char* base = nullptr;
std::ptrdiff_t size = 0;
Trace trace;

int KeyOf(const unsigned char* element) { return size < 4 ? element[0] : element[0] * 256 + element[1]; }

int TraceAndCompare(const void* left, const void* right) {
    const auto* const a = static_cast<const unsigned char*>(left);
    const auto* const b = static_cast<const unsigned char*>(right);
    trace.emplace_back((a - base) / size, (b - base) / size);
    return 3 * (KeyOf(a) - KeyOf(b));
}

// Elements are known by their numbers, spans are counted in elements.
class Model {
public:
    explicit Model(unsigned char* bytes) : mpcBytes(bytes) {}

    void Run(std::ptrdiff_t count) {
        if (count < 2) return;
        if (count >= 4) Partition(0, count);
        std::ptrdiff_t m = 0;
        for (std::ptrdiff_t e = 1; e < std::min<std::ptrdiff_t>(count, 4); ++e)
            if (Compare(m, e) > 0) m = e;
        if (m != 0) Swap(m, 0);
        for (std::ptrdiff_t p = 1; p < count; ++p) {
            std::ptrdiff_t q = p - 1;
            while (Compare(q, p) > 0) --q;
            for (std::ptrdiff_t t = p; t > q + 1; --t) Swap(t, t - 1);
        }
    }

private:
    int Compare(std::ptrdiff_t a, std::ptrdiff_t b) {
        return TraceAndCompare(mpcBytes + a * size, mpcBytes + b * size);
    }

    void Swap(std::ptrdiff_t a, std::ptrdiff_t b) {
        for (std::ptrdiff_t k = 0; k < size; ++k) std::swap(mpcBytes[a * size + k], mpcBytes[b * size + k]);
    }

    void Partition(std::ptrdiff_t lo, std::ptrdiff_t hi) {
        std::ptrdiff_t mid = lo + (hi - lo) / 2;
        if (hi - lo >= 6) {
            std::ptrdiff_t j = mid;
            if (Compare(lo, mid) > 0) j = lo;
            if (Compare(j, hi - 1) > 0) {
                j = lo + mid - j;
                if (Compare(j, hi - 1) < 0) j = hi - 1;
            }
            if (j != mid) Swap(j, mid);
        }
        std::ptrdiff_t i = lo;
        std::ptrdiff_t j = hi - 1;
    scan:
        while (i < mid && Compare(i, mid) <= 0) ++i;
        while (j > mid) {
            if (Compare(mid, j) <= 0) {
                --j;
            } else {
                Swap(i, j);
                if (i == mid) mid = j++;
                --j;
                ++i;
                goto scan;
            }
        }
        if (i != mid) {
            Swap(i, mid);
            mid = i;
            --j;
            goto scan;
        }
        const bool left_first = mid - lo <= hi - mid - 1;  // the smaller side, then the larger
        for (const bool left : {left_first, !left_first}) {
            const auto [from, to] = left ? std::pair(lo, mid) : std::pair(mid + 1, hi);
            if (to - from >= 4) Partition(from, to);
        }
    }

    unsigned char* mpcBytes;
};

enum Order { kRandom, kSorted, kReversed, kSawtooth, kFewDistinct, kLevel, kOrders };

Bytes Elements(std::ptrdiff_t count, Order order) {
    std::minstd_rand random(static_cast<unsigned int>(count * 101 + size));
    Bytes bytes(static_cast<std::size_t>(count * size));
    for (std::size_t at = 0; at < bytes.size(); ++at) bytes[at] = static_cast<unsigned char>(random() >> 8);
    for (std::ptrdiff_t number = 0; number < count; ++number) {
        const std::ptrdiff_t keys[kOrders] = {0, number, count - number, number % 7, number * number % 3, 1};
        if (order == kRandom) break;
        unsigned char* const element = &bytes[static_cast<std::size_t>(number * size)];
        if (size < 4) element[0] = static_cast<unsigned char>(keys[order]);
        if (size >= 4) element[0] = static_cast<unsigned char>(keys[order] >> 8);
        if (size >= 4) element[1] = static_cast<unsigned char>(keys[order]);
    }
    return bytes;
}

// False if the sort and the model differ.
bool SortsLikeTheModel(std::ptrdiff_t count, Order order) {
    Bytes expected = Elements(count, order);
    Bytes sorted(expected);
    sorted.insert(sorted.begin(), 0);  // an odd address
    base = expected.data();
    trace.clear();
    Model(expected.data()).Run(count);
    const Trace expected_trace = std::exchange(trace, {});
    base = sorted.data() + 1;
    ZAN_qsort(sorted.data() + 1, static_cast<unsigned long long>(count),
              static_cast<unsigned long long>(size), TraceAndCompare);
    sorted.erase(sorted.begin());
    return trace == expected_trace && sorted == expected;
}

TEST(Sort, MakesTheComparisonsAndMovesOfTheModel) {
    for (size = 1; size <= 100; ++size)
        for (int order = 0; order < kOrders; ++order)
            for (std::ptrdiff_t count = 0; count <= 64; count += size % 8 == 0 || count < 10 ? 1 : 9)
                ASSERT_TRUE(SortsLikeTheModel(count, Order(order))) << size << ' ' << order << ' ' << count;
    for (const int large : {1, 4, 8, 13, 16, 100})
        for (const Order order : {kRandom, kSorted, kReversed, kSawtooth}) {
            size = large;
            ASSERT_TRUE(SortsLikeTheModel(3000, order)) << size << ' ' << order;
        }
}

int calls = 0;
int CompareAtRandom(const void*, const void*) {
    static std::minstd_rand random;
    return static_cast<int>(random() % 3) - 1;
}
int SayAbove(const void*, const void*) { return 1; }
int CompareThenThrow(const void* left, const void* right) {
    if (--calls == 0) throw std::string("enough");
    return std::memcmp(left, right, 1);
}

TEST(Sort, KeepsEveryElementWhateverTheComparisonDoes) {
    const std::string letters = "thequickbrownfoxjumpsoverthelazydog";
    for (int round = 1; round < 300; ++round) {
        for (const auto compare : {CompareAtRandom, SayAbove, CompareThenThrow}) {
            std::string mixed = letters;
            calls = round;
            try {
                ZAN_qsort(mixed.data(), mixed.size(), 1, compare);
            } catch (const std::string&) {
            }
            EXPECT_TRUE(std::is_permutation(mixed.begin(), mixed.end(), letters.begin(), letters.end()));
        }
    }
}

// Takes more than two gigabytes: run with --gtest_also_run_disabled_tests.
TEST(Sort, DISABLED_SortsMoreThanTwoToThe31Bytes) {
    struct Huge {
        unsigned int key;
        char body[65540];
        unsigned int copy;
    };
    std::vector<Huge> elements(32800);
    ASSERT_GT(elements.size() * sizeof(Huge), 1ULL << 31);
    std::minstd_rand random;
    for (Huge& element : elements) element.key = element.copy = static_cast<unsigned int>(random());
    ZAN_qsort(elements.data(), elements.size(), sizeof(Huge), [](const void* left, const void* right) {
        const unsigned int a = static_cast<const Huge*>(left)->key;
        const unsigned int b = static_cast<const Huge*>(right)->key;
        return (a > b) - (a < b);
    });
    for (std::size_t number = 1; number < elements.size(); ++number) {
        ASSERT_LE(elements[number - 1].key, elements[number].key);
        ASSERT_EQ(elements[number].key, elements[number].copy);
    }
}

}  // namespace

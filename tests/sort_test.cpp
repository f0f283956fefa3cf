// The sort against a model of its steps: the same comparisons, the same permutation, for all sizes of
// elements.
#include "zanbase/sort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>
#include <iterator>
#include <numeric>
#include <random>
#include <string>
#include <utility>
#include <vector>

namespace {

using Bytes = std::basic_string<unsigned char>;
using Trace = std::vector<std::pair<long, long>>;  // comparisons by element numbers

Bytes sorted;
long size = 0;
Trace trace;

// The first byte is the key; the others make elements of the same key distinct.
int Compare(const void* left, const void* right) {
    const auto* const a = static_cast<const unsigned char*>(left);
    const auto* const b = static_cast<const unsigned char*>(right);
    trace.emplace_back((a - sorted.data()) / size, (b - sorted.data()) / size);
    return 3 * (*a - *b);
}

struct Model {
    Bytes* elements;
    Trace comparisons = {};

    int Compare(long a, long b) {
        comparisons.emplace_back(a, b);
        return elements[a][0] - elements[b][0];
    }
    void Swap(long a, long b) { elements[a].swap(elements[b]); }

    void Sort(long count) {
        if (count >= 4) Partition(0, count);
        long smallest = 0;
        for (long e = 1; e < std::min(count, 4L); ++e)
            if (Compare(smallest, e) > 0) smallest = e;
        Swap(smallest, 0);
        for (long p = 1; p < count; ++p) {
            long q = p - 1;
            while (Compare(q, p) > 0) --q;
            for (long t = p; t > q + 1; --t) Swap(t, t - 1);
        }
    }

    void Partition(long lo, long hi) {
        long mid = lo + (hi - lo) / 2;
        if (hi - lo >= 6) {
            long j = Compare(lo, mid) > 0 ? lo : mid;
            if (Compare(j, hi - 1) > 0) {
                j = lo + mid - j;
                if (Compare(j, hi - 1) < 0) j = hi - 1;
            }
            Swap(j, mid);
        }
        for (long i = lo, j = hi - 1;;) {
            while (i < mid && Compare(i, mid) <= 0) ++i;
            while (j > mid && Compare(mid, j) <= 0) --j;
            if (i == mid && j == mid) break;
            Swap(i, j);
            const long was = mid;
            if (i == was) mid = j;
            if (j == was) mid = i;
            if (mid != i) ++i;
            if (mid != j) --j;
        }
        std::pair<long, long> sides[] = {{lo, mid}, {mid + 1, hi}};
        if (mid - lo > hi - mid - 1) std::swap(sides[0], sides[1]);
        for (const auto& [from, to] : sides)
            if (to - from >= 4) Partition(from, to);
    }
};

TEST(Sort, MakesTheComparisonsAndThePermutationOfTheModel) {
    std::minstd_rand random;
    const auto any_byte = [&] { return static_cast<unsigned char>(random() >> 8); };
    const std::function<long(long)> orders[] = {[&](long) { return any_byte(); }, [](long n) { return n; },
                                                [](long n) { return -n; }, [](long n) { return n % 7; }};
    for (size = 1; size <= 100; ++size) {
        for (long count = 1; count <= 200; count += count < 64 ? 1 : 136) {
            for (const auto& key_of : orders) {
                std::vector<Bytes> elements;
                for (long number = 0; number < count; ++number) {
                    Bytes element(1, static_cast<unsigned char>(key_of(number)));
                    std::generate_n(std::back_inserter(element), size - 1, any_byte);
                    elements.push_back(element);
                }
                const auto joined = [&] {
                    return std::accumulate(elements.begin(), elements.end(), Bytes());
                };
                sorted = joined();
                trace.clear();
                ZAN_qsort(sorted.data(), elements.size(), static_cast<std::size_t>(size), Compare);
                Model model{elements.data()};
                model.Sort(count);
                ASSERT_TRUE(sorted == joined() && trace == model.comparisons) << size << ' ' << count;
            }
        }
    }
}

int calls_left = 0;

TEST(Sort, KeepsEveryElementWhateverTheComparisonDoes) {
    const std::string letters = "thequickbrownfoxjumpsoverthelazydog";
    for (int round = 0; round < 200; ++round) {
        std::string mixed = letters;
        calls_left = round;
        try {  // contradicts itself, then throws
            ZAN_qsort(&mixed[1], mixed.size() - 2, 1, [](const void*, const void*) {
                return calls_left-- == 0 ? throw std::string() : 2 - calls_left * calls_left % 5;
            });
        } catch (const std::string&) {
        }
        EXPECT_TRUE(std::is_permutation(mixed.begin(), mixed.end(), letters.begin()));
    }
    ZAN_qsort(nullptr, 9, 0, nullptr);  // elements without bytes: nothing to do
}

// Takes more than two gigabytes: run with --gtest_also_run_disabled_tests.
TEST(Sort, DISABLED_SortsMoreThanTwoToThe31Bytes) {
    using Huge = std::array<int, 16386>;
    std::vector<Huge> elements((1ULL << 31) / sizeof(Huge) + 1);
    std::minstd_rand random;
    for (Huge& element : elements) element.front() = element.back() = static_cast<int>(random());
    ZAN_qsort(elements.data(), elements.size(), sizeof(Huge), [](const void* a, const void* b) {
        return static_cast<const Huge*>(a)->front() < static_cast<const Huge*>(b)->front() ? -1 : 1;
    });
    EXPECT_TRUE(std::is_sorted(elements.begin(), elements.end()));
    for (const Huge& element : elements) ASSERT_EQ(element.front(), element.back());
}

}  // namespace

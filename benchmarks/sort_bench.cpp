// The sort beside the C library's, which has the same calling form, and the standard one on the same
// comparison through a pointer.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "ratios.h"
#include "zanbase/sort.h"

namespace {

constexpr std::size_t kCount = 100000;

struct Pair {
    long long key;
    long long value;
};

struct Record {
    int key;
    char text[96];
};

int KeyOf(int element) { return element; }
double KeyOf(double element) { return element; }
long long KeyOf(const Pair& element) { return element.key; }
int KeyOf(const Record& element) { return element.key; }

void SetKey(int& element, int key) { element = key; }
void SetKey(double& element, int key) { element = key; }
void SetKey(Pair& element, int key) { element = {key, key}; }
void SetKey(Record& element, int key) { element.key = key; }

template <class Element>
int CompareElements(const void* left, const void* right) {
    const auto a = KeyOf(*static_cast<const Element*>(left));
    const auto b = KeyOf(*static_cast<const Element*>(right));
    return (a > b) - (a < b);
}

enum Pattern { kRandom, kSorted, kReversed, kFewDistinct };

template <class Element>
std::vector<Element> Elements(Pattern pattern) {
    std::minstd_rand random(1);
    std::vector<Element> elements(kCount);
    int number = 0;
    for (Element& element : elements) {
        ++number;
        const int drawn = static_cast<int>(random() >> 1);
        SetKey(element, pattern == kRandom     ? drawn
                        : pattern == kSorted   ? number
                        : pattern == kReversed ? -number
                                               : drawn % 100);
    }
    return elements;
}

void OurSort(void* base, std::size_t count, std::size_t size, int (*compare)(const void*, const void*)) {
    ZAN_qsort(base, count, size, compare);
}

void CSort(void* base, std::size_t count, std::size_t size, int (*compare)(const void*, const void*)) {
    std::qsort(base, count, size, compare);
}

template <class Element>
void StdSort(void* base, std::size_t count, std::size_t, int (*compare)(const void*, const void*)) {
    const auto first = static_cast<Element*>(base);
    std::sort(first, first + count, [=](const Element& a, const Element& b) { return compare(&a, &b) < 0; });
}

template <class Element, auto kSort>
void SortArray(benchmark::State& state, Pattern pattern) {
    const std::vector<Element> unsorted = Elements<Element>(pattern);
    std::vector<Element> elements(kCount);
    int (*compare)(const void*, const void*) = CompareElements<Element>;
    benchmark::DoNotOptimize(compare);  // all sorts call it through the pointer
    for (auto _ : state) {
        std::copy(unsorted.begin(), unsorted.end(), elements.begin());
        kSort(elements.data(), kCount, sizeof(Element), compare);
        benchmark::DoNotOptimize(elements.data());
    }
}

// Ratios by order. The C library's merge sort makes half the comparisons on sorted and reversed arrays; only
// arrays in random order have a goal there.
std::vector<Ratio> random_beside_c, ordered_beside_c, beside_std;

template <class Element>
bool AddSorts(const std::string& element) {
    for (const auto& [pattern, name] : {std::pair{kRandom, "Random"},
                                        {kSorted, "Sorted"},
                                        {kReversed, "Reversed"},
                                        {kFewDistinct, "FewDistinct"}}) {
        const std::string of = element + name;
        benchmark::RegisterBenchmark(("OurSort" + of).c_str(), SortArray<Element, OurSort>, pattern);
        benchmark::RegisterBenchmark(("CSort" + of).c_str(), SortArray<Element, CSort>, pattern);
        benchmark::RegisterBenchmark(("StdSort" + of).c_str(), SortArray<Element, StdSort<Element>>, pattern);
        AddRatio("OurSort" + of, "CSort" + of, 0);
        AddRatio("OurSort" + of, "StdSort" + of, 0);
        if (pattern == kFewDistinct) continue;
        (pattern == kRandom ? random_beside_c : ordered_beside_c).push_back({"OurSort" + of, "CSort" + of});
        beside_std.push_back({"OurSort" + of, "StdSort" + of});
    }
    return true;
}

const bool rows =
    AddSorts<int>("Int") && AddSorts<double>("Double") && AddSorts<Pair>("Pair") &&
    AddSorts<Record>("Record") &&
    AddMeanRatio("OurSort, geometric mean", "CSort, random", random_beside_c, 0.9) &&
    AddMeanRatio("OurSort, geometric mean", "CSort, sorted and reversed", ordered_beside_c, 0) &&
    AddMeanRatio("OurSort, geometric mean", "StdSort, all but few distinct", beside_std, 1.2);

}  // namespace

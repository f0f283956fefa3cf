// Benchmarks small functions of one value beside their peers, on the same values.
#ifndef ZANBASE_BENCHMARKS_TEXT_PAIRS_H
#define ZANBASE_BENCHMARKS_TEXT_PAIRS_H

#include <benchmark/benchmark.h>

#include <cstddef>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "ratios.h"

constexpr std::size_t kValues = 256;  // more than a branch predictor can memorise

// Numbers of all lengths and both signs.
template <class Integer>
std::vector<Integer> Integers() {
    std::vector<Integer> values(kValues);
    std::mt19937_64 random;
    for (Integer& value : values) {
        value = static_cast<Integer>(random());
        for (auto halvings = random() % (8 * sizeof(Integer)); halvings > 0; --halvings) value /= 2;
    }
    return values;
}

// Numbers with `decimals` places or less, of the size that measured values have.
inline std::vector<double> Reals(int decimals) {
    std::vector<double> values(kValues);
    std::mt19937_64 random;
    for (double& value : values) {
        value = static_cast<double>(random() % 100000000) - 50000000;
        for (int place = 0; place < decimals; ++place) value /= 10;
    }
    return values;
}

// One function of the library over `values`, and its peers over the same.
template <class Value>
class Ours {
public:
    template <class Function>
    Ours(const std::string& name, std::vector<Value> values, Function function)
        : moName(name), moValues(std::move(values)) {
        Measure(moName, function);
    }

    // Measures a peer, with a row for the ratio.
    template <class Function>
    const Ours& Beside(const std::string& peer, Function function, double goal,
                       const char* file = __builtin_FILE()) const {
        const std::string name = peer + " for " + moName;
        Measure(name, function);
        AddRatio(moName, name, goal, file);
        return *this;
    }

private:
    template <class Function>
    void Measure(const std::string& name, Function function) const {
        benchmark::RegisterBenchmark(name.c_str(), [values = moValues, function](benchmark::State& state) {
            std::size_t next = 0;
            for (auto _ : state) {
                benchmark::DoNotOptimize(function(values[next]));
                next = (next + 1) % kValues;
            }
        });
    }

    std::string moName;
    std::vector<Value> moValues;
};

#endif

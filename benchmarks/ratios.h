// Rows of the ratio table that the benchmark program prints after its run: what ours costs over what a peer
// costs, both measured in the same run.
#ifndef ZANBASE_BENCHMARKS_RATIOS_H
#define ZANBASE_BENCHMARKS_RATIOS_H

#include <string>
#include <vector>

// Adds a row: the time of the benchmark named `ours` over that of the one named `peer` (full names as the run
// prints them, arguments and thread counts included). `goal` is the highest ratio aimed at; 0 means none.
// Returns true, so that a variable at namespace scope can be initialised with it.
// `file` gives the row its family.
bool AddRatio(const std::string& ours, const std::string& peer, double goal,
              const char* file = __builtin_FILE());

// Two benchmarks of the run, by their full names.
struct Ratio {
    std::string ours;
    std::string peer;
};

// Adds a row with the geometric mean of `ratios`; `ours` and `peer` say what they are of. It is left out
// unless all of them were measured.
bool AddMeanRatio(const std::string& ours, const std::string& peer, const std::vector<Ratio>& ratios,
                  double goal, const char* file = __builtin_FILE());

#endif

// Rows of the ratio table that the benchmark program prints after its run: what ours costs over what a peer
// costs, both measured in the same run.
#ifndef ZANBASE_BENCHMARKS_RATIOS_H
#define ZANBASE_BENCHMARKS_RATIOS_H

#include <string>

// Adds a row: the time of the benchmark named `ours` over that of the one named `peer` (full names as the run
// prints them, arguments and thread counts included). `goal` is the highest ratio aimed at; 0 means none.
// Returns true, so that it can stand at namespace scope.
bool AddRatio(const std::string& ours, const std::string& peer, double goal);

#endif

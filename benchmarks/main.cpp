// Runs the benchmarks in a shuffled order, several times each, and prints the ratio table; if ZANBASE_RATIOS of the
// environment names a file, the rows are written there too. The fastest of the repetitions counts, and in rows of
// one thread its processor time: on a busy machine those are least disturbed.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "ratios.h"

namespace {

struct Row {
    std::string ours;
    std::string peer;
    std::vector<Ratio> ratios;  // the row shows their geometric mean
    double goal;
    std::string family;
};

std::vector<Row>& Rows() {
    static std::vector<Row> rows;
    return rows;
}

// Prints the median of each benchmark's repetitions and keeps the best.
class BestTimes : public benchmark::ConsoleReporter {
public:
    BestTimes() : ConsoleReporter(OO_Tabular) {}

    void ReportRuns(const std::vector<Run>& runs) override {
        std::vector<Run> medians;
        for (const Run& run : runs) {
            if (run.aggregate_name == "median") medians.push_back(run);
            if (run.run_type != Run::RT_Iteration || run.error_occurred) continue;
            const bool on_one_thread = run.run_name.time_type.empty();
            const double time = on_one_thread ? run.GetAdjustedCPUTime() : run.GetAdjustedRealTime();
            const auto [entry, is_new] = mTimes.emplace(run.run_name.str(), time);
            if (!is_new) entry->second = std::min(entry->second, time);
        }
        ConsoleReporter::ReportRuns(medians);
    }

    void PrintRatios() const {
        std::printf("\n%-52s %-44s %8s %8s\n", "ours", "peer", "ratio", "goal");
        for (const Row& row : Rows()) {
            const double ratio = MeanOf(row.ratios);
            if (std::isnan(ratio)) continue;
            std::printf("%-52s %-44s %8.2f ", row.ours.c_str(), row.peer.c_str(), ratio);
            if (row.goal > 0) {
                std::printf("%8.2f%s\n", row.goal, ratio > row.goal ? "  above" : "");
            } else {
                std::printf("%8s\n", "-");
            }
        }
    }

    // One row a line, its fields with tabs between: family, ours, peer, ratio, goal (0 for none).
    void WriteRatios(const char* path) const {
        std::FILE* const file = std::fopen(path, "w");
        if (file == nullptr) return std::perror(path);
        for (const Row& row : Rows()) {
            const double ratio = MeanOf(row.ratios);
            if (std::isnan(ratio)) continue;
            std::fprintf(file, "%s\t%s\t%s\t%.3f\t%.2f\n", row.family.c_str(), row.ours.c_str(),
                         row.peer.c_str(), ratio, row.goal);
        }
        std::fclose(file);
    }

private:
    // NaN if one of them was not measured.
    double MeanOf(const std::vector<Ratio>& ratios) const {
        double logarithms = 0;
        for (const Ratio& ratio : ratios) {
            const auto ours = mTimes.find(ratio.ours);
            const auto peer = mTimes.find(ratio.peer);
            if (ours == mTimes.end() || peer == mTimes.end()) return NAN;
            logarithms += std::log(ours->second / peer->second);
        }
        return std::exp(logarithms / static_cast<double>(ratios.size()));
    }

    std::map<std::string, double> mTimes;
};

}  // namespace

bool AddRatio(const std::string& ours, const std::string& peer, double goal, const char* file) {
    return AddMeanRatio(ours, peer, {{ours, peer}}, goal, file);
}

bool AddMeanRatio(const std::string& ours, const std::string& peer, const std::vector<Ratio>& ratios,
                  double goal, const char* file) {
    std::string family = file;
    family.erase(0, family.rfind('/') + 1);
    family.erase(family.find("_bench"));
    Rows().push_back({ours, peer, ratios, goal, family});
    return true;
}

int main(int argc, char** argv) {
    // Defaults first: a later flag of the caller overrides them.
    std::vector<std::string> flags = {argv[0], "--benchmark_repetitions=9", "--benchmark_min_time=0.03",
                                      "--benchmark_enable_random_interleaving=true"};
    flags.insert(flags.end(), argv + 1, argv + argc);
    std::vector<char*> pointers;
    pointers.reserve(flags.size());
    for (std::string& flag : flags) pointers.push_back(flag.data());
    int count = static_cast<int>(pointers.size());
    benchmark::Initialize(&count, pointers.data());
    if (benchmark::ReportUnrecognizedArguments(count, pointers.data())) return 1;
    // Locks cost more once a process has had a second thread, so what is measured with one thread runs before.
    BestTimes times;
    std::string filter = benchmark::GetBenchmarkFilter();
    if (filter.empty()) {
        benchmark::RunSpecifiedBenchmarks(&times, "WithoutThreads");
        filter = "-WithoutThreads";
    }
    if (filter != "WithoutThreads") std::thread([] {}).join();
    benchmark::RunSpecifiedBenchmarks(&times, filter);
    times.PrintRatios();
    if (const char* const path = std::getenv("ZANBASE_RATIOS"); path != nullptr) times.WriteRatios(path);
    return 0;
}

// The scopes, by the calls of the runtime that they make, and the thread limit and counts with their sources.
#include "zanbase/openmp.h"

#include <gtest/gtest.h>
#include <omp.h>

#include <climits>
#include <cstdlib>
#include <optional>
#include <string>
#include <tuple>
#include <utility>

#include "support/failing_new.h"
#include "support/run_in_child.h"

std::string calls;                      // of the runtime's setters, in order
int logical = 6, cores = 3, asked = 0;  // what the system tells, and how often it was asked

#define RECORD_CALLS_OF(setter)                             \
    void __real_omp_set_##setter(int value);                \
    void __wrap_omp_set_##setter(int value) {               \
        calls += #setter " " + std::to_string(value) + ";"; \
        __real_omp_set_##setter(value);                     \
    }
extern "C" {
RECORD_CALLS_OF(dynamic)
RECORD_CALLS_OF(nested)
RECORD_CALLS_OF(num_threads)
int __wrap_omp_get_num_procs() { return 7; }
int __wrap__Z22CountLogicalProcessorsv() { return ++asked, logical; }
int __wrap__Z19CountProcessorCoresv() { return ++asked, cores; }
}

namespace {

// The tests with children come first, while nothing is settled and the runtime has no threads.
TEST(OMPGetMaxThreads, IsSettledOnceByTheFirstSource) {
    const struct {
        const char* environment;
        int set;  // 0: not called
        int limit;
    } rows[] = {{"4", 0, 4},     {"-2", 0, 6}, {"many", 0, 6}, {"4294967298", 0, INT_MAX & 255},
                {nullptr, 0, 6}, {"4", -1, 1}, {"4", 12, 12}};
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] {
            unsetenv("OMP_NUM_THREADS");
            if (row.environment != nullptr) setenv("OMP_NUM_THREADS", row.environment, 1);
            if (row.set != 0) OMPSetMaxThreads(row.set);
            const int first = OMPGetMaxThreads();
            setenv("OMP_NUM_THREADS", "99", 1);
            return first == OMPGetMaxThreads() ? first : 0;
        });
        EXPECT_EQ(child.exit_code, row.limit);
    }
}

TEST(ProcessorCounts, AreAskedForOnceAndFallBack) {
    const int rows[][4] = {{6, 3, 6, 3}, {0, 3, 3, 3}, {6, 0, 6, 7}, {0, 0, 7, 7}};  // told, then expected
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] {
            std::tie(logical, cores) = std::pair(row[0], row[1]);
            for (int call = 0; call < 3; ++call)
                if (GetLogicalProcessorCount() != row[2] || GetPhysicalProcessorCount() != row[3]) return -1;
            return asked;
        });
        EXPECT_EQ(child.exit_code, 2);
    }
}

void ScopesInsideARegion() {
    std::optional<OMPNested> outlived(true);
    std::optional<OMPThreadCount> outlives;
    calls += "in;";
#pragma omp parallel num_threads(2)
    if (OMPGetThreadNum() == OMPGetNumThreads() - 1) {
        OMPDynamic(true), OMPNested(false), OMPThreadCount(3);
        outlives.emplace(omp_get_max_threads() - 1);
        outlived.reset();
    }
    calls += "out;";
}

TEST(OpenMPScopes, CallTheRuntimeOnlyToChangeASettingOutsideRegions) {
    const std::pair<void (*)(), const char*> rows[] = {
        {[] { OMPDynamic(false), OMPNested(false), OMPThreadCount(5); }, ""},
        {[] { OMPDynamic(true); }, "dynamic 1;dynamic 0;"},
        {[] { OMPNested(true); }, "nested 1;num_threads 8;nested 0;num_threads 5;"},
        {[] { FailAtEachNew([] { OMPNested(true); }, [] { calls += "failed;"; }); },
         "nested 1;nested 0;failed;nested 1;num_threads 8;num_threads 5;nested 0;failed;"
         "nested 1;num_threads 8;nested 0;num_threads 5;"},
        {[] { __real_omp_set_nested(1), OMPNested(true), OMPNested(false); },
         "num_threads 8;nested 0;nested 1;num_threads 5;"},
        {[] { OMPThreadCount(LLONG_MIN); }, "num_threads 1;num_threads 5;"},
        {[] { OMPThreadCount((1LL << 32) + 2); }, "num_threads 8;num_threads 5;"},
        // The notes count, not the live setting.
        {[] {
             OMPDynamic scope(true), none(true);
             __real_omp_set_dynamic(0);
         },
         "dynamic 1;dynamic 0;"},
        // The outer scope's own count ends when it is assigned to; assigning the others calls nothing.
        {[] {
             OMPNested outer(true), inner(true);
             outer = inner;
         },
         "nested 1;num_threads 8;num_threads 5;"},
        {[] {
             OMPThreadCount outer(4), inner(4);
             OMPDynamic on(true), still_on(true);
             outer = inner, on = still_on;
         },
         "num_threads 4;dynamic 1;"},
        {ScopesInsideARegion, "nested 1;num_threads 8;in;out;num_threads 8;"},
    };
    for (const auto& [scopes, expected] : rows) {
        __real_omp_set_dynamic(0), __real_omp_set_nested(0), __real_omp_set_num_threads(5);
        OMPSetMaxThreads(8);
        calls.clear();
        scopes();
        EXPECT_EQ(calls, expected);
    }
}

}  // namespace

// The scopes, by the calls of the runtime that they make, and the thread limit and counts with their sources.
#include "zanbase/openmp.h"

#include <gtest/gtest.h>
#include <omp.h>

#include <optional>

#include "support/run_in_child.h"

std::string calls;                      // of the runtime's setters, in order: d(ynamic), n(ested), t(hreads)
int logical = 0, cores = 0, asked = 0;  // what the system tells, and how often it was asked

extern "C" {
void __real_omp_set_dynamic(int), __real_omp_set_nested(int), __real_omp_set_num_threads(int);
void __wrap_omp_set_dynamic(int on) { calls += " d" + std::to_string(on), __real_omp_set_dynamic(on); }
void __wrap_omp_set_nested(int on) { calls += " n" + std::to_string(on), __real_omp_set_nested(on); }
void __wrap_omp_set_num_threads(int n) { calls += " t" + std::to_string(n), __real_omp_set_num_threads(n); }
int __wrap_omp_get_num_procs() { return 7; }
int __wrap__Z22CountLogicalProcessorsv() { return ++asked, logical; }
int __wrap__Z19CountProcessorCoresv() { return ++asked, cores; }
}

// With children, so it comes first: nothing is settled yet, and the runtime has no threads.
TEST(OpenMPNumbers, AreSettledOnceByTheFirstSource) {
    const std::tuple<const char*, int, int, int, std::string> rows[] = {
        {"4", 0, 6, 3, "4 6 3\n"},  {"-2", 0, 0, 3, "3 3 3\n"},  {"4294967298", 0, 0, 0, "2147483647 7 7\n"},
        {"4", -1, 6, 3, "1 6 3\n"}, {"4", 12, 6, 3, "12 6 3\n"}, {nullptr, 0, 6, 0, "6 6 7\n"}};
    for (const auto& [environment, limit, logical_told, cores_told, expected] : rows) {
        std::tie(logical, cores) = std::tie(logical_told, cores_told);
        environment == nullptr ? unsetenv("OMP_NUM_THREADS") : setenv("OMP_NUM_THREADS", environment, 1);
        const ChildResult child = RunInChild([set = limit] {
            if (set != 0) OMPSetMaxThreads(set);
            for (int call = 0; call < 2; ++call, setenv("OMP_NUM_THREADS", "99", 1))
                std::printf("%d %d %d\n", OMPGetMaxThreads(), GetLogicalProcessorCount(),
                            GetPhysicalProcessorCount());
            return std::printf("%d", asked);
        });
        EXPECT_EQ(child.out, expected + expected + "2");
    }
}

void ScopesInsideARegion() {
    std::optional<OMPNested> outlived(true);
    std::optional<OMPThreadCount> outlives;
#pragma omp parallel num_threads(2)
    if (OMPGetThreadNum() == OMPGetNumThreads() - 1) {
        OMPDynamic(true), OMPNested(false), OMPThreadCount(3), outlived.reset();
        outlives.emplace(omp_get_max_threads() - 1);
    }
}

TEST(OpenMPScopes, CallTheRuntimeOnlyToChangeASettingOutsideRegions) {
    const std::pair<void (*)(), const char*> rows[] = {
        {[] { OMPDynamic(false), OMPNested(false), OMPThreadCount(5); }, ""},
        {[] { OMPDynamic(true), OMPDynamic(true), __real_omp_set_dynamic(0); }, " d1 d0"},
        {[] { __real_omp_set_nested(1), OMPNested(true), OMPNested(false); }, " t8 n0 n1 t5"},
        {[] { OMPThreadCount(2 - (1LL << 32)), OMPThreadCount(2 + (1LL << 32)); }, " t1 t8 t1 t5"},
        {[] { OMPNested(true) = OMPNested(false); }, " n1 t8 t5"},  // the right one begins first
        {[] { OMPNested(true) = OMPNested(true); }, " n1 t8 n0 n0 t5"},
        {ScopesInsideARegion, " n1 t8 t8"}};
    OMPSetMaxThreads(8);
    for (const auto& [scopes, expected] : rows) {
        __real_omp_set_dynamic(0), __real_omp_set_nested(0), __real_omp_set_num_threads(5);
        calls.clear();
        scopes();
        EXPECT_EQ(calls, expected);
    }
}

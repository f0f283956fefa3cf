// The scopes, by the calls of the runtime that they make, and the thread limit and counts with their sources.
#include "zanbase/openmp.h"

#include <gmock/gmock.h>

#include <climits>
#include <cstdlib>
#include <new>
#include <optional>
#include <string>

#include <omp.h>

#include "support/run_in_child.h"

namespace {

std::string calls;                      // of the runtime's setters, in order
int logical = 6, cores = 3, asked = 0;  // what the system tells, and how often it was asked
bool memory_is_exhausted = false;

std::string CallsOf() {
    const std::string made = calls;
    calls.clear();
    return made;
}

}  // namespace

extern "C" {
void __real_omp_set_dynamic(int enable);
void __real_omp_set_nested(int enable);
void __real_omp_set_num_threads(int count);
void __wrap_omp_set_dynamic(int enable) {
    calls += "dynamic " + std::to_string(enable) + ";";
    __real_omp_set_dynamic(enable);
}
void __wrap_omp_set_nested(int enable) {
    calls += "nested " + std::to_string(enable) + ";";
    __real_omp_set_nested(enable);
}
void __wrap_omp_set_num_threads(int count) {
    calls += "threads " + std::to_string(count) + ";";
    __real_omp_set_num_threads(count);
}
void* __real__Znwm(std::size_t size);
void* __wrap__Znwm(std::size_t size) {
    if (memory_is_exhausted) throw std::bad_alloc();
    return __real__Znwm(size);
}
int __wrap__Z22CountLogicalProcessorsv() { return ++asked, logical; }
int __wrap_omp_get_num_procs() { return 7; }
int __wrap__Z19CountProcessorCoresv() { return ++asked, cores; }
}

namespace {

// First, while this process has no threads and nothing is settled.
TEST(OMPGetMaxThreads, IsSettledOnceByTheFirstSource) {
    const struct {
        const char* environment;
        int set;  // 0: not called
        int limit;
    } rows[] = {{"4", 0, 4},    {"0", 0, 6},     {"-2", 0, 6}, {"many", 0, 6}, {"", 0, 6},
                {" 7,2", 0, 7}, {nullptr, 0, 6}, {"4", -1, 1}, {"4", 12, 12},  {nullptr, INT_MIN, 1}};
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] {
            unsetenv("OMP_NUM_THREADS");
            if (row.environment != nullptr) setenv("OMP_NUM_THREADS", row.environment, 1);
            if (row.set != 0) OMPSetMaxThreads(row.set);
            const int first = OMPGetMaxThreads();
            setenv("OMP_NUM_THREADS", "99", 1);
            const int second = OMPGetMaxThreads();
            OMPSetMaxThreads(0);
            return first == second && OMPGetMaxThreads() == 1 ? first : 0;
        });
        EXPECT_EQ(child.exit_code, row.limit) << (row.environment != nullptr ? row.environment : "unset");
    }
}

TEST(ProcessorCounts, AreAskedForOnceAndFallBack) {
    const struct {
        int logical, cores;  // 0: unknown
        int expected_logical, expected_cores;
    } rows[] = {{6, 3, 6, 3}, {0, 3, 3, 3}, {6, 0, 6, 7}, {0, 0, 7, 7}};
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] {
            logical = row.logical;
            cores = row.cores;
            for (int call = 0; call < 3; ++call)
                std::printf("%d %d ", GetLogicalProcessorCount(), GetPhysicalProcessorCount());
            return asked;
        });
        const std::string once = testing::PrintToString(row.expected_logical) + " " +
                                 testing::PrintToString(row.expected_cores) + " ";
        EXPECT_EQ(child.out, once + once + once);
        EXPECT_EQ(child.exit_code, 2);
    }
}

class OpenMPScopes : public testing::Test {
protected:
    OpenMPScopes() {
        __real_omp_set_dynamic(0);
        __real_omp_set_nested(0);
        __real_omp_set_num_threads(5);
        OMPSetMaxThreads(8);
        calls.clear();
    }
};

TEST_F(OpenMPScopes, CallTheRuntimeOnlyToChangeASetting) {
    { const OMPDynamic same(false); }
    { const OMPNested same(false); }
    { const OMPThreadCount same(5); }
    EXPECT_EQ(CallsOf(), "");
    { const OMPDynamic other(true); }
    EXPECT_EQ(CallsOf(), "dynamic 1;dynamic 0;");
    { const OMPNested other(true); }
    EXPECT_EQ(CallsOf(), "nested 1;threads 8;nested 0;threads 5;");
    __real_omp_set_nested(1);
    { const OMPNested same(true); }
    EXPECT_EQ(CallsOf(), "threads 8;threads 5;");
    { const OMPNested other(false); }
    EXPECT_EQ(CallsOf(), "nested 0;nested 1;");
    {
        const OMPDynamic outer(true);
        const OMPDynamic inner(true);
        __real_omp_set_dynamic(0);  // the notes count, not the live setting
    }
    EXPECT_EQ(CallsOf(), "dynamic 1;dynamic 0;");
}

TEST_F(OpenMPScopes, ClampTheThreadCountToTheLimit) {
    for (const auto& [count, expected] : {std::pair{0LL, 1},
                                          {-3LL, 1},
                                          {LLONG_MIN, 1},
                                          {1LL, 1},
                                          {7LL, 7},
                                          {8LL, 8},
                                          {1000LL, 8},
                                          {(1LL << 32) + 2, 8},
                                          {LLONG_MAX, 8}}) {
        const OMPThreadCount scope(count);
        EXPECT_EQ(omp_get_max_threads(), expected) << count;
    }
    EXPECT_EQ(omp_get_max_threads(), 5);
}

TEST_F(OpenMPScopes, ChangeNothingInsideAParallelRegion) {
    std::optional<OMPThreadCount> outlives;
    std::optional<OMPNested> outlived(true);
    CallsOf();
#pragma omp parallel num_threads(2)
    {
#pragma omp critical
        {
            const OMPDynamic dynamic(true);
            const OMPNested nested(false);
            const OMPThreadCount count(3);
        }
#pragma omp master
        {
            outlives.emplace(omp_get_max_threads() - 1);
            outlived.reset();
        }
    }
    EXPECT_EQ(CallsOf(), "");
    outlives.reset();  // made inside and ended outside: sets back what it noted
    EXPECT_EQ(CallsOf(), "threads 8;");
}

TEST_F(OpenMPScopes, ShareTheThreadCountWhenNestedScopesAreAssigned) {
    {
        OMPNested outer(true);
        {
            OMPNested inner(true);
            CallsOf();
            outer = inner;
            EXPECT_EQ(CallsOf(), "threads 5;");  // the outer one's own count ends
            OMPDynamic dynamic(true);
            OMPThreadCount count(2);
            CallsOf();
            const OMPDynamic none(true);
            dynamic = none;
            count = OMPThreadCount(2);
            EXPECT_EQ(CallsOf(), "");
        }
    }
    EXPECT_EQ(CallsOf(), "");
}

TEST_F(OpenMPScopes, LeaveTheSettingsWhenMemoryIsExhausted) {
    memory_is_exhausted = true;
    EXPECT_THROW(OMPNested(true), std::bad_alloc);
    memory_is_exhausted = false;
    EXPECT_EQ(omp_get_max_active_levels(), 1);
    EXPECT_EQ(omp_get_max_threads(), 5);
}

TEST(OpenMP, TellsTheTeam) {
    EXPECT_EQ(OMPGetNumThreads(), 1);
    EXPECT_EQ(OMPGetThreadNum(), 0);
    int members = 0;
#pragma omp parallel num_threads(3) reduction(+ : members)
    members += OMPGetNumThreads() == 3 && OMPGetThreadNum() == omp_get_thread_num();
    EXPECT_EQ(members, 3);
}

}  // namespace

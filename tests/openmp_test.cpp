// The calls of the OpenMP runtime that the scopes make, and the sources of the thread limit and the counts.
#include "zanbase/openmp.h"

#include <gtest/gtest.h>
#include <omp.h>

#include "platform/processors.h"
#include "support/environment.h"
#include "support/run_in_child.h"

int logical = 0, cores = 0, asked = 0;  // the system's answers, and the number of questions

int Answer(int count) noexcept {
    ++asked;
    return count;
}

int CountLogicalProcessors() noexcept { return Answer(logical); }
int CountProcessorCores() noexcept { return Answer(cores); }

std::string calls;  // of the runtime's setters, in order: d(ynamic), n(ested), t(hreads)

int Record(char setter, int value) {
    calls += std::string(" ") + setter + std::to_string(value);
    return value;
}

extern "C" {
void __real_omp_set_dynamic(int), __real_omp_set_nested(int), __real_omp_set_num_threads(int);
void __wrap_omp_set_dynamic(int on) { __real_omp_set_dynamic(Record('d', on)); }
void __wrap_omp_set_nested(int on) { __real_omp_set_nested(Record('n', on)); }
void __wrap_omp_set_num_threads(int count) { __real_omp_set_num_threads(Record('t', count)); }
int __wrap_omp_get_num_procs() { return 7; }
}

// First in the file: the children need a process in which no number is set and no thread runs.
TEST(OpenMPNumbers, AreSettledOnceByTheFirstSource) {
    struct {
        const char* environment;
        int limit, logical, cores;  // a limit of 0: none is set
        std::string numbers;        // the limit and the two counts
    } const cases[] = {
        {"4", 0, 6, 3, "4 6 3\n"},  {"-2", 0, 0, 3, "3 3 3\n"},  {"4294967298", 0, 0, 0, "2147483647 7 7\n"},
        {"4", -1, 6, 3, "1 6 3\n"}, {"4", 12, 6, 3, "12 6 3\n"}, {"text", 0, 6, 0, "6 6 7\n"}};
    for (const auto& c : cases) {
        SetEnvironment("OMP_NUM_THREADS", c.environment);
        const ChildResult child = RunInChild([&c] {
            logical = c.logical;
            cores = c.cores;
            if (c.limit != 0) OMPSetMaxThreads(c.limit);
            for (int call = 0; call < 2; ++call) {
                std::printf("%d %d ", OMPGetMaxThreads(), GetLogicalProcessorCount());
                std::printf("%d\n", GetPhysicalProcessorCount());
                SetEnvironment("OMP_NUM_THREADS", "99");
            }
            return asked;
        });
        EXPECT_EQ(child.out, c.numbers + c.numbers);
        EXPECT_EQ(child.exit_code, 2) << c.numbers;
    }
}

// Returns the calls that `scopes` makes, with a limit of 8 threads, all settings off and a thread count of 5.
std::string CallsOf(void (*scopes)()) {
    OMPSetMaxThreads(8);
    __real_omp_set_dynamic(0);
    __real_omp_set_nested(0);
    __real_omp_set_num_threads(5);
    calls.clear();
    scopes();
    return calls;
}

TEST(OpenMPScopes, CallTheRuntimeOnlyToChangeASetting) {
    EXPECT_EQ(CallsOf([] { OMPDynamic(false); }), "");
    EXPECT_EQ(CallsOf([] { OMPDynamic(true); }), " d1 d0");
    EXPECT_EQ(CallsOf([] { OMPNested(false); }), "");
    EXPECT_EQ(CallsOf([] { OMPNested(true); }), " n1 t8 n0 t5");
    EXPECT_EQ(CallsOf([] { OMPThreadCount(5); }), "");
    EXPECT_EQ(CallsOf([] { OMPThreadCount(2 - (1LL << 32)); }), " t1 t5");
    EXPECT_EQ(CallsOf([] { OMPThreadCount(2 + (1LL << 32)); }), " t8 t5");
}

TEST(OpenMPScopes, ShareTheThreadCountOfCopies) {
    EXPECT_EQ(CallsOf([] { OMPNested(true) = OMPNested(false); }),
              " n1 t8 t5");  // the right one begins first
    EXPECT_EQ(CallsOf([] { OMPNested(true) = OMPNested(true); }), " n1 t8 n0 n0 t5");
}

template <int kThreads>
void ScopesInARegion() {
#pragma omp parallel num_threads(kThreads)
    if (OMPGetThreadNum() == OMPGetNumThreads() - 1) {
        OMPDynamic(true);
        OMPNested(true);
        OMPThreadCount(3);
    }
}

TEST(OpenMPScopes, ChangeNothingInsideAnActiveRegion) {
    EXPECT_EQ(CallsOf(ScopesInARegion<2>), "");
    EXPECT_EQ(CallsOf(ScopesInARegion<1>), " d1 d0 n1 t8 n0 t5 t3 t5");  // one thread: not active
}

// The OpenMP scopes, and three numbers that are worked out once.
#include "zanbase/openmp.h"

#include <omp.h>

#include <algorithm>
#include <atomic>
#include <climits>
#include <cstdlib>

#include "platform/processors.h"

namespace {

// Each is one word that stands for itself, so relaxed order is enough; two threads on a first call may both
// work it out.
std::atomic<int> gnPhysicalProcessors{-1};  // valid above 0
std::atomic<int> gnLogicalProcessors{-1};   // valid above 0
std::atomic<int> gnMaxThreads{-1};          // -1: not settled yet

constexpr auto kRelaxed = std::memory_order_relaxed;

int Keep(std::atomic<int>& number, int value) {
    number.store(value, kRelaxed);
    return value;
}

// OpenMP 5.0 has a count of active levels in their place; runtimes keep both and may warn.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
bool IsNested() { return omp_get_nested() != 0; }
void SetNested(int enable) { omp_set_nested(enable); }
#pragma GCC diagnostic pop

// The one rule by which the scopes write a setting.
template <class Value>
void Change(Value from, Value to, void (*set)(int)) {
    if (from != to && omp_in_parallel() == 0) set(to);
}

}  // namespace

OMPDynamic::OMPDynamic(bool enable) : mbRequested(enable), mbPrevious(omp_get_dynamic() != 0) {
    Change(mbPrevious, mbRequested, omp_set_dynamic);
}

OMPDynamic::~OMPDynamic() { Change(mbRequested, mbPrevious, omp_set_dynamic); }

OMPDynamic& OMPDynamic::operator=(const OMPDynamic&) = default;

OMPThreadCount::OMPThreadCount(long long count)
    : mnRequested(static_cast<int>(std::clamp<long long>(count, 1, OMPGetMaxThreads()))),
      mnPrevious(omp_get_max_threads()) {
    Change(mnPrevious, mnRequested, omp_set_num_threads);
}

OMPThreadCount::~OMPThreadCount() { Change(mnRequested, mnPrevious, omp_set_num_threads); }

OMPThreadCount& OMPThreadCount::operator=(const OMPThreadCount&) = default;

OMPNested::OMPNested(bool enable) : mbRequested(enable), mbPrevious(IsNested()) {
    Change(mbPrevious, mbRequested, SetNested);
    if (!enable) return;
    try {
        mpoThreadCount.reset(new OMPThreadCount(OMPGetMaxThreads()));
    } catch (...) {
        Change(mbRequested, mbPrevious, SetNested);  // no destructor will run
        throw;
    }
}

// The scope of the thread count ends behind the body, with its member.
OMPNested::~OMPNested() { Change(mbRequested, mbPrevious, SetNested); }

OMPNested& OMPNested::operator=(const OMPNested&) = default;

int OMPGetMaxThreads() {
    int settled = gnMaxThreads.load(kRelaxed);
    if (settled != -1) return settled;
    const char* const text = std::getenv("OMP_NUM_THREADS");
    // Not atoi, which promises nothing about a number beyond an int; here that is the largest int.
    const long number = text != nullptr ? std::strtol(text, nullptr, 10) : 0;
    const int limit =
        number > 0 ? static_cast<int>(std::min<long>(number, INT_MAX)) : GetLogicalProcessorCount();
    // A limit that was set meanwhile stays.
    return gnMaxThreads.compare_exchange_strong(settled, limit, kRelaxed) ? limit : settled;
}

void OMPSetMaxThreads(int limit) { gnMaxThreads.store(std::max(limit, 1), kRelaxed); }

int OMPGetNumThreads() { return omp_get_num_threads(); }

int OMPGetThreadNum() { return omp_get_thread_num(); }

int GetLogicalProcessorCount() {
    if (const int count = gnLogicalProcessors.load(kRelaxed); count > 0) return count;
    if (const int count = CountLogicalProcessors(); count > 0) return Keep(gnLogicalProcessors, count);
    return Keep(gnLogicalProcessors, GetPhysicalProcessorCount());
}

int GetPhysicalProcessorCount() {
    if (const int count = gnPhysicalProcessors.load(kRelaxed); count > 0) return count;
    if (const int count = CountProcessorCores(); count > 0) return Keep(gnPhysicalProcessors, count);
    return Keep(gnPhysicalProcessors, omp_get_num_procs());
}

// The OpenMP scopes, and three cached numbers.
#include "zanbase/openmp.h"

#include <omp.h>

#include <algorithm>
#include <atomic>
#include <climits>
#include <cstdlib>

#include "platform/processors.h"

namespace {

// Each number is independent of other memory, so relaxed order is enough. Two threads may compute it at once
// on the first call; both store the same value.
std::atomic<int> gnPhysicalProcessors{-1};  // valid above 0
std::atomic<int> gnLogicalProcessors{-1};   // valid above 0
std::atomic<int> gnMaxThreads{-1};          // -1: not set yet

constexpr auto kRelaxed = std::memory_order_relaxed;

int Keep(std::atomic<int>& number, int value) {
    number.store(value, kRelaxed);
    return value;
}

// OpenMP 5.0 deprecates these two for a count of active levels. All runtimes still have them; some warn.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
bool IsNested() { return omp_get_nested() != 0; }
void SetNested(int enable) { omp_set_nested(enable); }
#pragma GCC diagnostic pop

// The rule of all scopes: writes a setting only if it changes and no parallel region is active.
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

// The destructor of the member, which runs after this body, ends the scope of the thread count.
OMPNested::~OMPNested() { Change(mbRequested, mbPrevious, SetNested); }

OMPNested& OMPNested::operator=(const OMPNested&) = default;

int OMPGetMaxThreads() {
    int settled = gnMaxThreads.load(kRelaxed);
    if (settled != -1) return settled;
    const char* const text = std::getenv("OMP_NUM_THREADS");
    // strtol, because atoi is undefined for a number out of range; such a number counts as the largest int.
    const long number = text != nullptr ? std::strtol(text, nullptr, 10) : 0;
    const int limit =
        number > 0 ? static_cast<int>(std::min<long>(number, INT_MAX)) : GetLogicalProcessorCount();
    // If another thread has set the limit meanwhile, its value counts.
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

// Processor counts from the C library and from the kernel's description of its topology.
#include "platform/processors.h"

#include <algorithm>
#include <cstdio>
#include <memory>

#include <unistd.h>

namespace {

constexpr int kNumberLimit = 8192;  // what the largest kernels are built for

// The lowest-numbered processor of the core that processor `number` belongs to; -1 if unknown. Processors
// that are offline have no topology and stand in no other's list.
int FirstOfCore(int number) noexcept {
    for (const char* const list : {"core_cpus_list", "thread_siblings_list"}) {  // the newer name first
        char path[96];
        std::snprintf(path, sizeof path, "/sys/devices/system/cpu/cpu%d/topology/%s", number, list);
        // "c": no cancellation point, "e": no inheritance.
        const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path, "rce"), std::fclose);
        int first = -1;
        if (file != nullptr && std::fscanf(file.get(), "%d", &first) == 1) return first;
    }
    return -1;
}

}  // namespace

int CountLogicalProcessors() noexcept {
    return static_cast<int>(std::max(sysconf(_SC_NPROCESSORS_ONLN), 0L));
}

// A core is counted at its first processor. Numbers may have gaps, so the search ends when all processors
// have been met; if some are described nowhere, a count of the others would be wrong.
int CountProcessorCores() noexcept {
    int unmet = CountLogicalProcessors();
    int cores = 0;
    for (int number = 0; unmet > 0 && number < kNumberLimit; ++number) {
        const int first = FirstOfCore(number);
        if (first >= 0) --unmet;
        if (first == number) ++cores;
    }
    return unmet == 0 ? cores : 0;
}

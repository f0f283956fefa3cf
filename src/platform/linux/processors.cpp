// Processor counts from the C library and from the kernel's description of its topology.
#include "platform/processors.h"

#include <algorithm>
#include <cstdio>
#include <memory>

#include <unistd.h>

namespace {

constexpr int kNumberLimit = 8192;  // what the largest kernels are built for

// Returns the lowest processor number in the core of processor `number`, -1 if unknown. An offline processor
// has no topology and is in no list.
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

// Counts each core at its first processor. Numbers may have gaps, so the loop ends when it has found all
// processors. If some have no description, the number of cores is unknown.
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

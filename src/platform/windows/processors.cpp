// Processor counts from the system's description of the machine.
#include "platform/processors.h"

#include <algorithm>
#include <vector>

#include "platform/windows/system.h"

int CountLogicalProcessors() noexcept {
    SYSTEM_INFO system;
    GetSystemInfo(&system);
    return static_cast<int>(system.dwNumberOfProcessors);
}

// The size may grow between two calls, as processors are added.
int CountProcessorCores() noexcept try {
    using Record = SYSTEM_LOGICAL_PROCESSOR_INFORMATION;
    static_assert(sizeof(Record) == 32);
    std::vector<Record> records;
    DWORD bytes = 0;
    while (GetLogicalProcessorInformation(records.data(), &bytes) == 0) {
        if (GetLastError() != ERROR_INSUFFICIENT_BUFFER) return 0;
        records.resize(bytes / sizeof(Record));
    }
    const auto is_core = [](const Record& record) { return record.Relationship == RelationProcessorCore; };
    return static_cast<int>(std::count_if(records.begin(), records.end(), is_core));
} catch (...) {
    return 0;
}

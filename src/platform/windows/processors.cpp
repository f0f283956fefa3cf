// Processor counts from the system's description of the machine.
#include "platform/processors.h"

#include <algorithm>
#include <cstdlib>

#include "platform/windows/system.h"
#include "zanbase/allocation.h"

int CountLogicalProcessors() noexcept {
    SYSTEM_INFO system;
    GetSystemInfo(&system);
    return static_cast<int>(system.dwNumberOfProcessors);
}

// The size may grow between two calls, as processors are added, and the call that succeeds may fill less.
int CountProcessorCores() noexcept try {
    using Record = SYSTEM_LOGICAL_PROCESSOR_INFORMATION;
    static_assert(sizeof(Record) == 32);
    Record* records = nullptr;
    DWORD bytes = 0;
    BOOL is_filled = FALSE;
    while ((is_filled = GetLogicalProcessorInformation(records, &bytes)) == 0 &&
           GetLastError() == ERROR_INSUFFICIENT_BUFFER) {
        std::free(records);
        records = nullptr;
        records = static_cast<Record*>(HMalloc(bytes));
    }
    const auto is_core = [](const Record& record) { return record.Relationship == RelationProcessorCore; };
    const bool has_records = is_filled != 0 && records != nullptr;
    const auto cores = has_records ? std::count_if(records, records + bytes / sizeof(Record), is_core) : 0;
    std::free(records);
    return static_cast<int>(cores);
} catch (...) {  // thrown by the program's out-of-memory handler
    return 0;
}

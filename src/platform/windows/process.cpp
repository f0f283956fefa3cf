// The process identifier of Windows.
#include "platform/process.h"

#include "platform/windows/system.h"

long long ProcessNumber() noexcept { return static_cast<long long>(GetCurrentProcessId()); }

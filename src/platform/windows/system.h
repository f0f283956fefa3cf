// The system's header, for sources of this back end alone: its macros rewrite names.
#ifndef ZANBASE_PLATFORM_WINDOWS_SYSTEM_H
#define ZANBASE_PLATFORM_WINDOWS_SYSTEM_H

#define WIN32_LEAN_AND_MEAN
#ifndef NOMINMAX
#define NOMINMAX
#endif
#include <windows.h>

#include "platform/wait_limit.h"

static_assert(kForever == INFINITE);

extern "C" __declspec(dllimport) BOOLEAN NTAPI RtlDllShutdownInProgress();

// Whether the system has ended all threads but the calling one, to detach the DLLs of an ending process.
inline bool IsLastThread() noexcept { return RtlDllShutdownInProgress() != 0; }

#endif

// The process's handlers for machine faults, which lead to the frames of RunGuarded.
#ifndef ZANBASE_PLATFORM_LINUX_FAULT_HANDLERS_H
#define ZANBASE_PLATFORM_LINUX_FAULT_HANDLERS_H

// Installs the handlers at the first call. Thread-safe.
void InstallFaultHandlers() noexcept;

#endif

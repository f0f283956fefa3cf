// Contract: the processor counts of the machine. Thread-safe. The caller caches them.
#ifndef ZANBASE_PLATFORM_PROCESSORS_H
#define ZANBASE_PLATFORM_PROCESSORS_H

// Returns the number of logical processors that the system schedules on, 0 if unknown. It describes the
// machine, not the processors that this process may use: a confined process sets its own thread limit.
int CountLogicalProcessors() noexcept;

// Returns the number of processor cores that those logical processors belong to, 0 if unknown.
int CountProcessorCores() noexcept;

#endif

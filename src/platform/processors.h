// Contract: the counts of the machine's processors. They are not cached here.
#ifndef ZANBASE_PLATFORM_PROCESSORS_H
#define ZANBASE_PLATFORM_PROCESSORS_H

// The number of logical processors that the system schedules on, whichever of them this process may use: it
// describes the machine, and a process that is confined to a part of it sets its own thread limit. 0 if
// unknown.
int CountLogicalProcessors() noexcept;

// The number of processor cores that those logical processors belong to; 0 if unknown.
int CountProcessorCores() noexcept;

#endif

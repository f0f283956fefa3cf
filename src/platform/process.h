// Contract: the identity of the process.
#ifndef ZANBASE_PLATFORM_PROCESS_H
#define ZANBASE_PLATFORM_PROCESS_H

// The system's number of the process, which no other living process has.
long long ProcessNumber() noexcept;

#endif

// What tests do with the surroundings of their process, on every system: linux.cpp and windows.cpp beside this file.
#ifndef ZANBASE_TESTS_ENVIRONMENT_H
#define ZANBASE_TESTS_ENVIRONMENT_H

#include <cstdio>

// Opens an empty file for reading and writing, of this process alone, that is deleted when it is closed.
std::FILE* OpenTemporaryFile();

// Sets an environment variable, or removes it if `value` is null.
void SetEnvironment(const char* name, const char* value);

// Whether a thread that has used up its stack gets a machine fault.
extern const bool kExhaustedStackIsAFault;

// Whether a killed thread returns, with its TLS destructors: under the thread sanitizer.
extern const bool kKillRunsTlsDestructors;

#endif

/// @file
/// The version of the headers, and that of the library which a program runs with.
#ifndef ZANBASE_VERSION_H
#define ZANBASE_VERSION_H

#include "zanbase/export.h"

/// Major version of these headers. The build takes the three numbers from here: the CMake package and `zanbase.pc` have
/// the same.
#define ZANBASE_VERSION_MAJOR 0
#define ZANBASE_VERSION_MINOR 1  ///< minor version
#define ZANBASE_VERSION_PATCH 0  ///< patch level
/// The version as one number that can be compared: 0.1.0 is 100.
#define ZANBASE_VERSION (ZANBASE_VERSION_MAJOR * 10000 + ZANBASE_VERSION_MINOR * 100 + ZANBASE_VERSION_PATCH)

/// Returns the version of the library that the program runs with, as a number like `ZANBASE_VERSION`. The two differ
/// where a program runs with another version than it was compiled with. Thread-safe.
/// @ingroup environment
ZANBASE_API int IMPGetVersion() noexcept;

#endif

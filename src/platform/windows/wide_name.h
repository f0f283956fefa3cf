// Names of files for the system's wide functions.
#ifndef ZANBASE_PLATFORM_WINDOWS_WIDE_NAME_H
#define ZANBASE_PLATFORM_WINDOWS_WIDE_NAME_H

#include <string>

// Converts a UTF-8 name. A name whose whole path is too long for the system's usual functions gets the form that they
// take at any length. After a failure the result is empty and the reason in errno: EILSEQ (not UTF-8) or ENOENT (empty).
std::wstring WideName(const char* name);

#endif

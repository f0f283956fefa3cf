/// @file
/// Macros of every public header: which symbols are exported, and what the compiler checks at a call.
/// This header and the platform layer are the only places that may test for a compiler or a system.
#ifndef ZANBASE_EXPORT_H
#define ZANBASE_EXPORT_H

/// @def ZANBASE_API
/// Marks what the library exports; everything else stays hidden. It has three states: the library itself is
/// being built (`ZANBASE_BUILDING`), its objects are linked statically (`ZANBASE_STATIC`), or a caller uses
/// the shared library (neither).
#if defined(_WIN32)
#include <crtdefs.h>

#include "zanbase/windows_runtime.h"
#if (defined(_UCRT) || defined(_MSC_VER)) != (ZANBASE_FOR_UCRT == 1)
#error This zanbase was built for another C runtime (msvcrt or UCRT): FILE, malloc and getenv would not be the same
#endif

#if defined(ZANBASE_BUILDING)
#define ZANBASE_API __declspec(dllexport)
#elif defined(ZANBASE_STATIC)
#define ZANBASE_API
#else
#define ZANBASE_API __declspec(dllimport)
#endif
#else
#define ZANBASE_API __attribute__((visibility("default")))
#endif

/// @def ZANBASE_PRINTF_FORMAT(text, first)
/// Parameter number `text` is a `printf` format for the arguments from number `first` on; `first` is 0
/// where the arguments come as a `va_list`. A member function counts its object as parameter 1.
/// @def ZANBASE_NULL_TERMINATED
/// The variable arguments end with a null pointer.
/// @def ZANBASE_FORMAT_ARGUMENT(number)
/// The result is a format that takes the same arguments as parameter number `number`.
#if defined(__GNUC__)
#if defined(__MINGW32__) && !defined(__clang__)  // clang has one kind of formats
#define ZANBASE_PRINTF_FORMAT(text, first) __attribute__((format(gnu_printf, text, first)))
#else
#define ZANBASE_PRINTF_FORMAT(text, first) __attribute__((format(printf, text, first)))
#endif
#define ZANBASE_NULL_TERMINATED __attribute__((sentinel))
#define ZANBASE_FORMAT_ARGUMENT(number) __attribute__((format_arg(number)))
#else
#define ZANBASE_PRINTF_FORMAT(text, first)
#define ZANBASE_NULL_TERMINATED
#define ZANBASE_FORMAT_ARGUMENT(number)
#endif

#endif

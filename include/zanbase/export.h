/// @file
/// Macros of every public header: which symbols are exported, and what the compiler checks at a call.
/// This header and the platform layer are the only places that may test for a compiler or a system.
#ifndef ZANBASE_EXPORT_H
#define ZANBASE_EXPORT_H

#include <cstddef>

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

/// @def ZANBASE_MODE_BEGIN
/// Begins the declarations of types that hold strings or vectors of the standard library. In each mode of the standard
/// library they have another layout, so in each mode but the usual one they are in an inline namespace: parts of a
/// program that were built in different modes can be linked, and each uses its own types.
/// @def ZANBASE_MODE_END
/// Ends them.
#if defined(_LIBCPP_VERSION)
#define ZANBASE_MODE_BEGIN inline namespace zanbase_libcxx {
#define ZANBASE_MODE_END }
#elif defined(_GLIBCXX_DEBUG) && defined(_GLIBCXX_USE_CXX11_ABI) && _GLIBCXX_USE_CXX11_ABI == 0
#define ZANBASE_MODE_BEGIN inline namespace zanbase_old_strings_debug {
#define ZANBASE_MODE_END }
#elif defined(_GLIBCXX_DEBUG)
#define ZANBASE_MODE_BEGIN inline namespace zanbase_debug {
#define ZANBASE_MODE_END }
#elif defined(_GLIBCXX_USE_CXX11_ABI) && _GLIBCXX_USE_CXX11_ABI == 0
#define ZANBASE_MODE_BEGIN inline namespace zanbase_old_strings {
#define ZANBASE_MODE_END }
#else
#define ZANBASE_MODE_BEGIN
#define ZANBASE_MODE_END
#endif

/// @def ZANBASE_HOME_LAYOUT
/// Defined if the containers of the standard library have the layout that the library was built with. Otherwise no
/// code of the caller may access members of such a type.
#if !defined(_LIBCPP_VERSION) && !defined(_GLIBCXX_DEBUG)
#define ZANBASE_HOME_LAYOUT
#endif

// Defined if the caller uses another C++ standard library than the library was built with. Then no object of such a
// library may be shared.
#if defined(_LIBCPP_VERSION)
#define ZANBASE_FOREIGN_LIBRARY
#endif

/// @def ZANBASE_THROW_BAD_ALLOC
/// Reports that memory is exhausted: throws `std::bad_alloc`, or aborts in code that is built without exceptions.
#if defined(__cpp_exceptions)
#define ZANBASE_THROW_BAD_ALLOC() throw std::bad_alloc()
#else
#define ZANBASE_THROW_BAD_ALLOC() std::abort()
#endif

#endif

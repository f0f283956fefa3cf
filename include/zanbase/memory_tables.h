/// @file
/// For code that reads the tracker's tables through a class derived from `HMemory`: includes Boost's map and
/// defines the saved state. Not part of zanbase/zanbase.h, because it requires Boost, in the version that the
/// library was built with: each version has a layout of its own.
#ifndef ZANBASE_MEMORY_TABLES_H
#define ZANBASE_MEMORY_TABLES_H

#include <cstddef>
#include <list>

#include <boost/unordered_map.hpp>
#include <boost/version.hpp>

#include "zanbase/boost_version.h"
#include "zanbase/memory.h"

/// @addtogroup memory
/// @{

#ifndef ZANBASE_HOME_LAYOUT
#error \
    "zanbase/memory_tables.h shows the library's own containers: it works with libstdc++ without _GLIBCXX_DEBUG only"
#endif
#if BOOST_VERSION != ZANBASE_BOOST_VERSION
#error "zanbase was built with another version of Boost: see ZANBASE_BOOST_VERSION in zanbase/boost_version.h"
#endif

/// What `HMemory::Push` saved: copies that share nothing with the live tables.
struct HMemory::MemoryState {
    FileMap moFileMap;         ///< usage of each site
    MemoryMap moMemoryMap;     ///< live blocks by address
    std::size_t mnSavedTotal;  ///< bytes
    std::size_t mnSavedPeek;   ///< bytes
};

/// @}

#endif

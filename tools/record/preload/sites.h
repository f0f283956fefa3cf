// Call sites: from the frame that called an allocator to the number of the line that is credited.
#ifndef ZANBASE_RECORD_SITES_H
#define ZANBASE_RECORD_SITES_H

#include <string>
#include <vector>

#include "block_table.h"
#include "thread_state.h"

namespace recorder {

// The site of a call from `caller`. Requires: the thread is inside the recorder.
SiteId SiteOfCaller(const Frame& caller);

// From now on debug information and unwind tables are read; before, a site is its return address.
void StartReadingModules();

// Modules may have been unmapped: forgets what is known of their addresses.
void RetireUnmappedSites();

// The text and line of every site so far, by number: a source file and line, or else `module!function` or
// `module+0xoffset` and 0. Equal texts have one pointer and live as long as the process.
struct SiteText {
    const char* file;
    int line;
};
std::vector<SiteText> DescribeSites();

// Around fork: the child must not find the tables halfway through a change.
void LockSites();
void UnlockSites();

}  // namespace recorder

#endif

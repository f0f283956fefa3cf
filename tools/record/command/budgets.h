// Limits of a run.
#ifndef ZANBASE_RECORD_BUDGETS_H
#define ZANBASE_RECORD_BUDGETS_H

#include <string>

#include "options.h"
#include "zanbase/snapshot.h"

namespace recorder {

// A line for each limit that was exceeded, with the figure and the sites or files that have most of it; empty
// if all were kept. A figure that is equal to its limit keeps it.
std::string BrokenBudgets(const Budgets& budgets, const HMemorySnapshot& memory, const HDiskIOSnapshot& disk);

}  // namespace recorder

#endif

// The two memory reports, as functions of what they show.
#ifndef ZANBASE_MEMORY_MEMORY_REPORT_TEXT_H
#define ZANBASE_MEMORY_MEMORY_REPORT_TEXT_H

#include <cstddef>
#include <vector>

#include "memory/report_text.h"

// The live blocks of one call site.
struct LeakGroup {
    std::size_t size = 0;  // bytes
    int blocks = 0;
    const char* file = nullptr;
    int line = 0;
};

// What one call site allocated and freed, in bytes and calls.
struct UsageRow {
    const char* file;
    int line;
    std::size_t allocated;
    std::size_t freed;
    unsigned int alloc_count;
    unsigned int free_count;
};

// A table of `groups`, largest last, with totals; groups of one size stay in their order.
void WriteLeakReport(const std::vector<LeakGroup>& groups, const ReportWriter& write);

// A section for each of `rows`, largest last, with totals and the peak; rows of one size stay in their order,
// and those below a small share of the total are summed up.
void WriteUsageReport(const std::vector<UsageRow>& rows, std::size_t peak, const ReportWriter& write);

#endif

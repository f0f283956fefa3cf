// Texts of the disk reports, as functions of what they show.
#ifndef ZANBASE_DISKIO_DISK_IO_REPORT_TEXT_H
#define ZANBASE_DISKIO_DISK_IO_REPORT_TEXT_H

#include <string>

#include "diskio/ledger.h"

// Hours, minutes, seconds and hundredths, "00:00:00.00", each cut and never rounded. Hours take as many
// digits as they need; the parts of a negative time are negative. NaN counts as 0, and a time whose whole
// seconds a 32-bit integer can't hold as the nearest that it can.
std::string DiskIOTimeText(double seconds);

// The block of one file, blank line included. A kind of operation that never happened has no line, but for
// opens and closes.
std::string DiskIOFileText(const std::string& name, const DiskIOUsage& usage);

// The table of sums over `files`.
std::string DiskIOSummaryText(const DiskIOFileMap& files);

// The blocks of all files that moved bytes, fewest first, or a line that there are none.
std::string DiskIOUsageText(const DiskIOFileMap& files);

#endif

// The disk reports, as functions of what they show.
#ifndef ZANBASE_DISKIO_DISK_IO_REPORT_TEXT_H
#define ZANBASE_DISKIO_DISK_IO_REPORT_TEXT_H

#include <string>
#include <vector>

#include "diskio/ledger.h"

// Hours, minutes, seconds and hundredths, "00:00:00.00", each cut and never rounded. Hours take as many
// digits as they need; the parts of a negative time are negative. NaN counts as 0. A time whose whole seconds
// don't fit a 32-bit integer counts as the nearest time that does.
std::string DiskIOTimeText(double seconds);

// The block of one file with its blank line. Open and close always have a line, other operations only if
// their count is not 0.
std::string DiskIOFileText(const std::string& name, const DiskIOUsage& usage);

// The table of sums over `files`.
std::string DiskIOSummaryText(const DiskIOFileMap& files);

// The names of the files that moved bytes, fewest first; equal numbers in the order of the names.
std::vector<std::string> DiskIOUsedFiles(const DiskIOFileMap& files);

constexpr char kDiskIOUsageTitle[] = "Disk I/O Usage Report:\n\n";
constexpr char kDiskIONoUsage[] = "No disk I/O usage to report.\n\n";  // if no file moved bytes

#endif

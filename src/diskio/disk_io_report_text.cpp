// The texts of the three disk reports.
#include "diskio/disk_io_report_text.h"

#include <algorithm>
#include <cmath>
#include <map>

#include "memory/report_text.h"
#include "zanbase/string_makers.h"

namespace {

// Counts are unsigned, but the reports print them as signed numbers.
std::string CountText(unsigned int count) { return MkString("%d", static_cast<int>(count)); }

DiskIOUsage SumOf(const DiskIOFileMap& files) {
    DiskIOUsage sum;
    for (const auto& [name, usage] : files) {
        sum.mdOpenTime += usage.mdOpenTime;
        sum.mnOpenCount += usage.mnOpenCount;
        sum.mdCloseTime += usage.mdCloseTime;
        sum.mnCloseCount += usage.mnCloseCount;
        sum.mdSeekTime += usage.mdSeekTime;
        sum.mnSeekCount += usage.mnSeekCount;
        sum.mdReadTime += usage.mdReadTime;
        sum.mnReadCount += usage.mnReadCount;
        sum.mnReadSize += usage.mnReadSize;
        sum.mdWriteTime += usage.mdWriteTime;
        sum.mnWriteCount += usage.mnWriteCount;
        sum.mnWriteSize += usage.mnWriteSize;
    }
    return sum;
}

// A figure has one blank between itself and the rule on its right. A cell without a figure is blank.
std::string Cell(const std::string& text, unsigned int width) {
    return FitField(text.empty() ? text : text + " ", width, true);
}

std::string SummaryRow(const char* label, unsigned int count, const std::string& time = "",
                       const std::string& size = "") {
    return MkString("| %-5s |%s|%s|%s|\n", label, Cell(CountText(count), 9).c_str(), Cell(time, 13).c_str(),
                    Cell(size, 10).c_str());
}

}  // namespace

std::string DiskIOTimeText(double seconds) {
    constexpr double kEnd = 2147483648.0;  // truncating this or more to 32 bits, or NaN, is undefined
    const double low = std::nextafter(-kEnd - 1.0, 0.0);
    const double high = std::nextafter(kEnd, 0.0);
    const double time = std::isnan(seconds) ? 0.0 : std::clamp(seconds, low, high);
    const int whole_time = static_cast<int>(time);
    const int hours = whole_time / 3600;
    const int minutes = whole_time % 3600 / 60;
    const double rest = time - hours * 3600.0 - minutes * 60.0;
    const int whole_seconds = static_cast<int>(rest);
    const int hundredths = static_cast<int>((rest - whole_seconds) * 100.0);
    return MkString("%02d:%02d:%02d.%02d", hours, minutes, whole_seconds, hundredths);
}

std::string DiskIOFileText(const std::string& name, const DiskIOUsage& usage) {
    std::size_t width = 0;
    for (const unsigned int count :
         {usage.mnOpenCount, usage.mnCloseCount, usage.mnSeekCount, usage.mnReadCount, usage.mnWriteCount})
        width = std::max(width, CountText(count).size());
    const auto line = [width](const char* label, unsigned int count, double time,
                              const std::string& size = "") {
        return MkString("%s (%s): %s%s\n", label,
                        FitField(CountText(count), static_cast<unsigned int>(width), true).c_str(),
                        DiskIOTimeText(time).c_str(), size.c_str());
    };
    std::string text = MkString("File: %s\n", name.c_str());
    text += line("Open ", usage.mnOpenCount, usage.mdOpenTime);
    text += line("Close", usage.mnCloseCount, usage.mdCloseTime);
    if (usage.mnSeekCount != 0) text += line("Seek ", usage.mnSeekCount, usage.mdSeekTime);
    if (usage.mnReadCount != 0)
        text += line("Read ", usage.mnReadCount, usage.mdReadTime, ", " + SizeText(usage.mnReadSize));
    if (usage.mnWriteCount != 0)
        text += line("Write", usage.mnWriteCount, usage.mdWriteTime, ", " + SizeText(usage.mnWriteSize));
    return text + "\n";
}

std::string DiskIOSummaryText(const DiskIOFileMap& files) {
    const DiskIOUsage sum = SumOf(files);
    return "Disk I/O Summary Report:\n"
           " __________________________________________ \n"
           "|       |         |             |          |\n"
           "|       |  Count  |    Time     |   Size   |\n"
           "|_______|_________|_____________|__________|\n"
           "|       |         |             |          |\n" +
           SummaryRow("File", static_cast<unsigned int>(files.size())) +
           "|       |         |             |          |\n" +
           SummaryRow("Open", sum.mnOpenCount, DiskIOTimeText(sum.mdOpenTime)) +
           SummaryRow("Close", sum.mnCloseCount, DiskIOTimeText(sum.mdCloseTime)) +
           SummaryRow("Seek", sum.mnSeekCount, DiskIOTimeText(sum.mdSeekTime)) +
           SummaryRow("Read", sum.mnReadCount, DiskIOTimeText(sum.mdReadTime), SizeText(sum.mnReadSize)) +
           SummaryRow("Write", sum.mnWriteCount, DiskIOTimeText(sum.mdWriteTime), SizeText(sum.mnWriteSize)) +
           "|_______|_________|_____________|__________|\n"
           "\n";
}

std::vector<std::string> DiskIOUsedFiles(const DiskIOFileMap& files) {
    std::multimap<unsigned long long, const std::string*> by_size;
    for (const auto& [name, usage] : files) {
        const unsigned long long moved = usage.mnReadSize + usage.mnWriteSize;
        if (moved != 0) by_size.emplace(moved, &name);
    }
    std::vector<std::string> names;
    names.reserve(by_size.size());
    for (const auto& [moved, name] : by_size) names.push_back(*name);
    return names;
}

// The JSON documents: snapshots by their schema, and timers as Chrome trace events.
#include <algorithm>
#include <cmath>
#include <string_view>

#include "snapshot/text_sink.h"
#include "zanbase/account_data.h"

namespace {

// "KEY":"text", and with it "KEY_hex" for a text that is not UTF-8.
void AddText(TextSink& sink, std::string_view key, const HTextData& data) {
    const std::string_view text = ViewOf(data);
    sink.Add("\"").Add(key).Add("\":").AddJsonString(text);
    if (!IsUtf8(text)) sink.Add(",\"").Add(key).Add("_hex\":\"").AddHex(text).Add("\"");
}

void AddSeconds(TextSink& sink, double seconds) { sink.AddNumber(seconds, "null"); }

void AddRow(TextSink& sink, const HMemorySiteData& row) {
    AddText(sink, "file", row.moFile);
    sink.Add(",\"line\":").AddNumber(static_cast<long long>(row.mnLine));
    sink.Add(",\"live_blocks\":").AddNumber(row.mnLiveBlocks);
    sink.Add(",\"live_bytes\":").AddNumber(row.mnLiveBytes);
    sink.Add(",\"allocated\":").AddNumber(row.mnAllocated);
    sink.Add(",\"freed\":").AddNumber(row.mnFreed);
    sink.Add(",\"alloc_count\":").AddNumber(row.mnAllocCount);
    sink.Add(",\"free_count\":").AddNumber(row.mnFreeCount);
}

void AddOperation(TextSink& sink, std::string_view key, const HDiskIOOperation& operation, bool moves_bytes) {
    sink.Add(",\"").Add(key).Add("\":{\"count\":").AddNumber(operation.mnCount);
    AddSeconds(sink.Add(",\"seconds\":"), operation.mdSeconds);
    if (moves_bytes) sink.Add(",\"bytes\":").AddNumber(operation.mnBytes);
    sink.Add("}");
}

void AddRow(TextSink& sink, const HDiskIOFileData& row) {
    AddText(sink, "name", row.moName);
    AddOperation(sink, "open", row.moOpen, false);
    AddOperation(sink, "close", row.moClose, false);
    AddOperation(sink, "seek", row.moSeek, false);
    AddOperation(sink, "read", row.moRead, true);
    AddOperation(sink, "write", row.moWrite, true);
}

void AddRow(TextSink& sink, const HTimerRowData& row) {
    AddText(sink, "name", row.moName);
    AddSeconds(sink.Add(",\"seconds\":"), row.mdSeconds);
    sink.Add(",\"threads\":[");
    std::string_view separator;
    for (std::size_t thread = 0; thread < row.mnThreads; ++thread) {
        AddSeconds(sink.Add(separator), row.mpdThreadSeconds[thread]);
        separator = ",";
    }
    AddSeconds(sink.Add("],\"open_seconds\":"), row.mdOpenSeconds);
}

// The member "rows", each row on a line of its own.
template <class Data>
void AddRows(TextSink& sink, const Data& data) {
    sink.Add("\"rows\":[");
    std::string_view separator = "\n{";
    for (std::size_t row = 0; row < data.mnRows; ++row) {
        AddRow(sink.Add(separator), data.mpoRows[row]);
        sink.Add("}");
        separator = ",\n{";
    }
    sink.Add("]}");
}

// What is known of when and where an account was taken.
template <class Data>
void AddOrigin(TextSink& sink, const Data& data) {
    if (data.mdTime != 0) AddSeconds(sink.Add("\"time\":"), data.mdTime);
    if (data.mdTime != 0) sink.Add(",");
    if (data.mnProcess != 0) sink.Add("\"process\":").AddNumber(data.mnProcess).Add(",");
}

std::size_t ThreadCount(const HTimerData& timers) {
    std::size_t count = 0;
    for (std::size_t row = 0; row < timers.mnRows; ++row)
        count = std::max(count, timers.mpoRows[row].mnThreads);
    return count;
}

// A trace viewer keeps processes apart by their numbers; one that is unknown is 1.
TextSink& AddThreadMembers(TextSink& sink, const HTimerData& timers, std::size_t thread) {
    sink.Add("\"pid\":").AddNumber(timers.mnProcess != 0 ? timers.mnProcess : 1LL);
    return sink.Add(",\"tid\":").AddNumber(static_cast<long long>(thread));
}

// The timers of one thread, one after the other.
void AddThreadEvents(TextSink& sink, const HTimerData& timers, std::size_t thread) {
    double start = 0;
    for (std::size_t index = 0; index < timers.mnRows; ++index) {
        const HTimerRowData& row = timers.mpoRows[index];
        const double seconds = thread < row.mnThreads ? row.mpdThreadSeconds[thread] : 0;
        if (!(seconds > 0) || !std::isfinite(seconds)) continue;
        const double duration = std::round(seconds * 1e6);
        AddThreadMembers(sink.Add(",\n{\"ph\":\"X\",\"cat\":\"timer\","), timers, thread);
        sink.Add(",\"ts\":").AddNumber(start, "0").Add(",\"dur\":").AddNumber(duration, "0").Add(",");
        AddText(sink, "name", row.moName);
        AddSeconds(sink.Add(",\"args\":{\"seconds\":"), seconds);
        AddSeconds(sink.Add(",\"seconds_of_all_threads\":"), row.mdSeconds);
        sink.Add("}}");
        start += duration;
    }
}

}  // namespace

bool HWriteJsonData(const HTextOutput& output, const HMemoryData* memory, const HDiskIOData* diskIO,
                    const HTimerData* timers) {
    TextSink sink(output);
    sink.Add("{\"schema\":\"zanbase-snapshot\",\"version\":").AddNumber(kSnapshotJsonVersion + 0LL);
    if (memory != nullptr) {
        AddOrigin(sink.Add(",\n\"memory\":{"), *memory);
        sink.Add("\"total\":").AddNumber(memory->mnTotal);
        sink.Add(",\"peak\":").AddNumber(memory->mnPeak).Add(",");
        AddRows(sink, *memory);
    }
    if (diskIO != nullptr) {
        AddOrigin(sink.Add(",\n\"disk_io\":{"), *diskIO);
        AddRows(sink, *diskIO);
    }
    if (timers != nullptr) {
        AddOrigin(sink.Add(",\n\"timers\":{"), *timers);
        AddRows(sink, *timers);
    }
    return sink.Add("}\n").Finish();
}

bool HWriteChromeTraceData(const HTextOutput& output, const HTimerData& timers) {
    TextSink sink(output);
    sink.Add("{\"displayTimeUnit\":\"ms\",\"traceEvents\":[\n{\"ph\":\"M\",");
    AddThreadMembers(sink, timers, 0).Add(",\"name\":\"process_name\",\"args\":{\"name\":\"timers\"}}");
    for (std::size_t thread = 0; thread < ThreadCount(timers); ++thread) {
        AddThreadMembers(sink.Add(",\n{\"ph\":\"M\","), timers, thread);
        sink.Add(",\"name\":\"thread_name\",\"args\":{\"name\":\"OpenMP thread ")
            .AddNumber(static_cast<long long>(thread))
            .Add("\"}}");
        AddThreadEvents(sink, timers, thread);
    }
    return sink.Add("]}\n").Finish();
}

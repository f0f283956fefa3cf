// The JSON documents: snapshots by their schema, and timers as Chrome trace events.
#include <algorithm>
#include <cmath>
#include <string_view>
#include <vector>

#include "snapshot/text_sink.h"
#include "zanbase/snapshot_text.h"

namespace {

// "KEY":"text", and with it "KEY_hex" for a text that is not UTF-8.
void AddText(TextSink& sink, std::string_view key, std::string_view text) {
    sink.Add("\"").Add(key).Add("\":").AddJsonString(text);
    if (!IsUtf8(text)) sink.Add(",\"").Add(key).Add("_hex\":\"").AddHex(text).Add("\"");
}

void AddSeconds(TextSink& sink, double seconds) { sink.AddNumber(seconds, "null"); }

void AddRow(TextSink& sink, const HMemorySnapshot::Row& row) {
    AddText(sink, "file", row.moFile);
    sink.Add(",\"line\":").AddNumber(static_cast<long long>(row.mnLine));
    sink.Add(",\"live_blocks\":").AddNumber(row.mnLiveBlocks);
    sink.Add(",\"live_bytes\":").AddNumber(row.mnLiveBytes);
    sink.Add(",\"allocated\":").AddNumber(row.mnAllocated);
    sink.Add(",\"freed\":").AddNumber(row.mnFreed);
    sink.Add(",\"alloc_count\":").AddNumber(row.mnAllocCount);
    sink.Add(",\"free_count\":").AddNumber(row.mnFreeCount);
}

void AddOperation(TextSink& sink, std::string_view key, const HDiskIOSnapshot::Operation& operation,
                  bool moves_bytes) {
    sink.Add(",\"").Add(key).Add("\":{\"count\":").AddNumber(operation.mnCount);
    AddSeconds(sink.Add(",\"seconds\":"), operation.mdSeconds);
    if (moves_bytes) sink.Add(",\"bytes\":").AddNumber(operation.mnBytes);
    sink.Add("}");
}

void AddRow(TextSink& sink, const HDiskIOSnapshot::Row& row) {
    AddText(sink, "name", row.moName);
    AddOperation(sink, "open", row.moOpen, false);
    AddOperation(sink, "close", row.moClose, false);
    AddOperation(sink, "seek", row.moSeek, false);
    AddOperation(sink, "read", row.moRead, true);
    AddOperation(sink, "write", row.moWrite, true);
}

void AddRow(TextSink& sink, const GlobalTimerSnapshot::Row& row) {
    AddText(sink, "name", row.moName);
    AddSeconds(sink.Add(",\"seconds\":"), row.mdSeconds);
    sink.Add(",\"threads\":[");
    std::string_view separator;
    for (const double seconds : row.maThreadSeconds) {
        AddSeconds(sink.Add(separator), seconds);
        separator = ",";
    }
    sink.Add("]");
}

// The member "rows", each row on a line of its own.
template <class Row>
void AddRows(TextSink& sink, const std::vector<Row>& rows) {
    sink.Add("\"rows\":[");
    std::string_view separator = "\n{";
    for (const Row& row : rows) {
        AddRow(sink.Add(separator), row);
        sink.Add("}");
        separator = ",\n{";
    }
    sink.Add("]}");
}

std::size_t ThreadCount(const GlobalTimerSnapshot& timers) {
    std::size_t count = 0;
    for (const auto& row : timers.maRows) count = std::max(count, row.maThreadSeconds.size());
    return count;
}

constexpr char kThreadMember[] = "\"pid\":1,\"tid\":";

// The timers of one thread, one after the other.
void AddThreadEvents(TextSink& sink, const GlobalTimerSnapshot& timers, std::size_t thread) {
    double start = 0;
    for (const auto& row : timers.maRows) {
        const double seconds = thread < row.maThreadSeconds.size() ? row.maThreadSeconds[thread] : 0;
        if (!(seconds > 0) || !std::isfinite(seconds)) continue;
        const double duration = std::round(seconds * 1e6);
        sink.Add(",\n{\"ph\":\"X\",\"cat\":\"timer\",").Add(kThreadMember);
        sink.AddNumber(static_cast<long long>(thread)).Add(",\"ts\":").AddNumber(start, "0");
        sink.Add(",\"dur\":").AddNumber(duration, "0").Add(",\"name\":").AddJsonString(row.moName);
        sink.Add(",\"args\":{");
        if (!IsUtf8(row.moName)) sink.Add("\"name_hex\":\"").AddHex(row.moName).Add("\"");
        sink.Add("}}");
        start += duration;
    }
}

}  // namespace

bool HWriteJson(std::ostream& stream, const HMemorySnapshot* memory, const HDiskIOSnapshot* diskIO,
                const GlobalTimerSnapshot* timers) {
    TextSink sink(stream);
    sink.Add("{\"schema\":\"zanbase-snapshot\",\"version\":").AddNumber(kSnapshotJsonVersion + 0LL);
    if (memory != nullptr) {
        sink.Add(",\n\"memory\":{\"total\":").AddNumber(memory->mnTotal);
        sink.Add(",\"peak\":").AddNumber(memory->mnPeak).Add(",");
        AddRows(sink, memory->maRows);
    }
    if (diskIO != nullptr) AddRows(sink.Add(",\n\"disk_io\":{"), diskIO->maRows);
    if (timers != nullptr) AddRows(sink.Add(",\n\"timers\":{"), timers->maRows);
    return sink.Add("}\n").Finish();
}

bool HWriteJson(std::ostream& stream, const HMemorySnapshot& memory) {
    return HWriteJson(stream, &memory, nullptr, nullptr);
}

bool HWriteJson(std::ostream& stream, const HDiskIOSnapshot& diskIO) {
    return HWriteJson(stream, nullptr, &diskIO, nullptr);
}

bool HWriteJson(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    return HWriteJson(stream, nullptr, nullptr, &timers);
}

bool HWriteChromeTrace(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    TextSink sink(stream);
    sink.Add("{\"displayTimeUnit\":\"ms\",\"traceEvents\":[\n");
    sink.Add("{\"ph\":\"M\",\"pid\":1,\"tid\":0,\"name\":\"process_name\",\"args\":{\"name\":\"timers\"}}");
    for (std::size_t thread = 0; thread < ThreadCount(timers); ++thread) {
        const auto number = static_cast<long long>(thread);
        sink.Add(",\n{\"ph\":\"M\",").Add(kThreadMember).AddNumber(number);
        sink.Add(",\"name\":\"thread_name\",\"args\":{\"name\":\"OpenMP thread ")
            .AddNumber(number)
            .Add("\"}}");
        AddThreadEvents(sink, timers, thread);
    }
    return sink.Add("]}\n").Finish();
}

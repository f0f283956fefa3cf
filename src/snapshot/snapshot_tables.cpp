// The texts that have a line for each row: CSV, and call sites as folded stacks.
#include <algorithm>
#include <initializer_list>
#include <string_view>

#include "snapshot/text_sink.h"
#include "zanbase/account_data.h"

namespace {

// A field in quotes, with the quotes in it doubled.
void AddQuoted(TextSink& sink, const HTextData& data) {
    std::string_view text = ViewOf(data);
    sink.Add("\"");
    for (std::size_t quote; (quote = text.find('"')) != std::string_view::npos; text.remove_prefix(quote + 1))
        sink.Add(text.substr(0, quote)).Add("\"\"");
    sink.Add(text).Add("\"");
}

void AddFields(TextSink& sink, std::initializer_list<long long> numbers) {
    for (const long long number : numbers) sink.Add(",").AddNumber(number);
}

void AddOperation(TextSink& sink, const HDiskIOOperation& operation) {
    sink.Add(",").AddNumber(operation.mnCount).Add(",").AddNumber(operation.mdSeconds, "");
}

void AddTransfer(TextSink& sink, const HDiskIOOperation& operation) {
    AddOperation(sink, operation);
    sink.Add(",").AddNumber(operation.mnBytes);
}

long long FigureOf(const HMemorySiteData& row, HMemoryFigure figure) {
    switch (figure) {
        case HMemoryFigure::kLiveBytes:
            return row.mnLiveBytes;
        case HMemoryFigure::kLiveBlocks:
            return row.mnLiveBlocks;
        case HMemoryFigure::kAllocated:
            return row.mnAllocated;
        case HMemoryFigure::kAllocCount:
            return row.mnAllocCount;
    }
    return 0;
}

// The parts of `path` as frames, without empty ones.
void AddFrames(TextSink& sink, std::string_view path) {
    bool has_frame = false;
    while (!path.empty()) {
        const std::string_view part = path.substr(0, path.find_first_of("/\\"));
        path.remove_prefix(std::min(part.size() + 1, path.size()));
        if (part.empty()) continue;
        if (has_frame) sink.Add(";");
        has_frame = true;
        sink.AddUtf8(part, [](char byte) -> std::string_view {
            const bool is_control = static_cast<unsigned char>(byte) < ' ' || byte == '\x7F';
            return byte == ';' || is_control ? "_" : "";
        });
    }
}

}  // namespace

bool HWriteCsvData(const HTextOutput& output, const HMemoryData& memory) {
    TextSink sink(output);
    sink.Add("file,line,live_blocks,live_bytes,allocated,freed,alloc_count,free_count\n");
    for (std::size_t index = 0; index < memory.mnRows; ++index) {
        const HMemorySiteData& row = memory.mpoRows[index];
        AddQuoted(sink, row.moFile);
        AddFields(sink, {row.mnLine, row.mnLiveBlocks, row.mnLiveBytes, row.mnAllocated, row.mnFreed,
                         row.mnAllocCount, row.mnFreeCount});
        sink.Add("\n");
    }
    return sink.Finish();
}

bool HWriteCsvData(const HTextOutput& output, const HDiskIOData& diskIO) {
    TextSink sink(output);
    sink.Add("name,open_count,open_seconds,close_count,close_seconds,seek_count,seek_seconds,")
        .Add("read_count,read_seconds,read_bytes,write_count,write_seconds,write_bytes\n");
    for (std::size_t index = 0; index < diskIO.mnRows; ++index) {
        const HDiskIOFileData& row = diskIO.mpoRows[index];
        AddQuoted(sink, row.moName);
        for (const auto* operation : {&row.moOpen, &row.moClose, &row.moSeek}) AddOperation(sink, *operation);
        for (const auto* operation : {&row.moRead, &row.moWrite}) AddTransfer(sink, *operation);
        sink.Add("\n");
    }
    return sink.Finish();
}

bool HWriteCsvData(const HTextOutput& output, const HTimerData& timers) {
    TextSink sink(output);
    sink.Add("name,thread,seconds\n");
    for (std::size_t index = 0; index < timers.mnRows; ++index) {
        const HTimerRowData& row = timers.mpoRows[index];
        for (std::size_t thread = 0; thread < row.mnThreads; ++thread) {
            AddQuoted(sink, row.moName);
            sink.Add(",").AddNumber(static_cast<long long>(thread)).Add(",");
            sink.AddNumber(row.mpdThreadSeconds[thread], "").Add("\n");
        }
    }
    return sink.Finish();
}

bool HWriteFoldedStacksData(const HTextOutput& output, const HMemoryData& memory, HMemoryFigure figure) {
    TextSink sink(output);
    for (std::size_t index = 0; index < memory.mnRows; ++index) {
        const HMemorySiteData& row = memory.mpoRows[index];
        const long long value = FigureOf(row, figure);
        if (value <= 0) continue;
        AddFrames(sink, ViewOf(row.moFile));
        if (row.mnLine > 0) sink.Add(":").AddNumber(static_cast<long long>(row.mnLine));
        sink.Add(" ").AddNumber(value).Add("\n");
    }
    return sink.Finish();
}

// The texts that have a line for each row: CSV, and call sites as folded stacks.
#include <initializer_list>
#include <string>
#include <string_view>

#include "snapshot/text_sink.h"
#include "zanbase/snapshot_text.h"

namespace {

// A field in quotes, with the quotes in it doubled.
void AddQuoted(TextSink& sink, std::string_view text) {
    sink.Add("\"");
    for (std::size_t quote; (quote = text.find('"')) != std::string_view::npos; text.remove_prefix(quote + 1))
        sink.Add(text.substr(0, quote)).Add("\"\"");
    sink.Add(text).Add("\"");
}

void AddFields(TextSink& sink, std::initializer_list<long long> numbers) {
    for (const long long number : numbers) sink.Add(",").AddNumber(number);
}

void AddOperation(TextSink& sink, const HDiskIOSnapshot::Operation& operation) {
    sink.Add(",").AddNumber(operation.mnCount).Add(",").AddNumber(operation.mdSeconds, "");
}

void AddTransfer(TextSink& sink, const HDiskIOSnapshot::Operation& operation) {
    AddOperation(sink, operation);
    sink.Add(",").AddNumber(operation.mnBytes);
}

long long FigureOf(const HMemorySnapshot::Row& row, HMemoryFigure figure) {
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
std::string FramesOf(std::string_view path) {
    std::string frames;
    while (!path.empty()) {
        const char byte = path.front();
        const std::size_t length = Utf8CharacterLength(path);
        if (byte == '/' || byte == '\\') {
            if (!frames.empty() && frames.back() != ';') frames += ';';
        } else if (length == 0) {
            frames += "\xEF\xBF\xBD";
        } else if (byte == ';' || byte == '\x7F' || static_cast<unsigned char>(byte) < ' ') {
            frames += '_';
        } else {
            frames += path.substr(0, length);
        }
        path.remove_prefix(length == 0 ? 1 : length);
    }
    return frames;
}

}  // namespace

bool HWriteCsv(std::ostream& stream, const HMemorySnapshot& memory) {
    TextSink sink(stream);
    sink.Add("file,line,live_blocks,live_bytes,allocated,freed,alloc_count,free_count\n");
    for (const auto& row : memory.maRows) {
        AddQuoted(sink, row.moFile);
        AddFields(sink, {row.mnLine, row.mnLiveBlocks, row.mnLiveBytes, row.mnAllocated, row.mnFreed,
                         row.mnAllocCount, row.mnFreeCount});
        sink.Add("\n");
    }
    return sink.Finish();
}

bool HWriteCsv(std::ostream& stream, const HDiskIOSnapshot& diskIO) {
    TextSink sink(stream);
    sink.Add("name,open_count,open_seconds,close_count,close_seconds,seek_count,seek_seconds,")
        .Add("read_count,read_seconds,read_bytes,write_count,write_seconds,write_bytes\n");
    for (const auto& row : diskIO.maRows) {
        AddQuoted(sink, row.moName);
        for (const auto* operation : {&row.moOpen, &row.moClose, &row.moSeek}) AddOperation(sink, *operation);
        for (const auto* operation : {&row.moRead, &row.moWrite}) AddTransfer(sink, *operation);
        sink.Add("\n");
    }
    return sink.Finish();
}

bool HWriteCsv(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    TextSink sink(stream);
    sink.Add("name,thread,seconds\n");
    for (const auto& row : timers.maRows) {
        long long thread = 0;
        for (const double seconds : row.maThreadSeconds) {
            AddQuoted(sink, row.moName);
            sink.Add(",").AddNumber(thread++).Add(",").AddNumber(seconds, "").Add("\n");
        }
    }
    return sink.Finish();
}

bool HWriteFoldedStacks(std::ostream& stream, const HMemorySnapshot& memory, HMemoryFigure figure) {
    TextSink sink(stream);
    for (const auto& row : memory.maRows) {
        const long long value = FigureOf(row, figure);
        if (value <= 0) continue;
        sink.Add(FramesOf(row.moFile));
        if (row.mnLine > 0) sink.Add(":").AddNumber(static_cast<long long>(row.mnLine));
        sink.Add(" ").AddNumber(value).Add("\n");
    }
    return sink.Finish();
}

// Snapshots as text, read back by other programs' readers: a JSON library, a JSON Schema.
#include "zanbase/snapshot_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>
#include <valijson/adapters/nlohmann_json_adapter.hpp>
#include <valijson/schema.hpp>
#include <valijson/schema_parser.hpp>
#include <valijson/validator.hpp>

#include "snapshot/text_sink.h"

namespace {

using nlohmann::json;

const HMemorySnapshot kMemory{
    {{"/src/a b.cpp", 7, 1, 64, 96, 32, 2, 1}, {"gone.cpp", 3, -1, -8, 0, 8, 0, 1}}, 64, 96};
const HDiskIOSnapshot kDiskIO{
    {{"run.dat", {1, 0.1, 0}, {2, 1e-9, 0}, {3, -4, 0}, {5, 1e300, 1LL << 62}, {0, 0, 0}}}};
const GlobalTimerSnapshot kTimers{
    {{"load", 1.5, {1, 0.5}, 0.25}, {"lost", NAN, {NAN, -1}}, {"idle", 2, {0, 2}}}, 1.5, 4711};

// Quotes, separators, control bytes, and every way in which bytes can fail to be UTF-8.
const std::string kHostileNames[] = {"",
                                     "\"quoted\", \\ and ,",
                                     "line\nreturn\r\ttab",
                                     std::string("nul\0byte\x1F\x7F", 10),
                                     "umlaut \xC3\xA4, clef \xF0\x9D\x84\x9E",
                                     "lone \x80",
                                     "cut \xE2\x82",
                                     "long form \xC0\xAF",
                                     "surrogate \xED\xA0\x80",
                                     "too high \xF4\x90\x80\x80",
                                     "no lead \xFF"
                                     "A"};

template <class... Arguments>
std::string Written(bool (*write)(std::ostream&, Arguments...), Arguments... arguments) {
    std::ostringstream stream;
    EXPECT_TRUE(write(stream, arguments...));
    return stream.str();
}

template <class Snapshot>
std::string Json(const Snapshot& snapshot) {
    return Written<const Snapshot&>(HWriteJson, snapshot);
}

template <class Snapshot>
std::string Csv(const Snapshot& snapshot) {
    return Written<const Snapshot&>(HWriteCsv, snapshot);
}

void ExpectValid(const std::string& text) {
    const json schema_document = json::parse(std::ifstream(ZANBASE_TEST_SCHEMA));
    valijson::Schema schema;
    valijson::SchemaParser().populateSchema(valijson::adapters::NlohmannJsonAdapter(schema_document), schema);
    const json document = json::parse(text);
    valijson::ValidationResults results;
    valijson::Validator().validate(schema, valijson::adapters::NlohmannJsonAdapter(document), &results);
    for (valijson::ValidationResults::Error error; results.popError(error);)
        ADD_FAILURE() << error.description;
}

std::string FromHex(const std::string& digits) {
    std::string bytes;
    for (std::size_t index = 0; index < digits.size(); index += 2)
        bytes += static_cast<char>(std::stoi(digits.substr(index, 2), nullptr, 16));
    return bytes;
}

TEST(SnapshotJson, HasEveryFigure) {
    std::ostringstream stream;
    EXPECT_TRUE(HWriteJson(stream, &kMemory, &kDiskIO, &kTimers));
    ExpectValid(stream.str());
    EXPECT_EQ(json::parse(stream.str()), json::parse(R"({
        "schema": "zanbase-snapshot", "version": 1,
        "memory": {"total": 64, "peak": 96, "rows": [
            {"file": "/src/a b.cpp", "line": 7, "live_blocks": 1, "live_bytes": 64, "allocated": 96, "freed": 32,
             "alloc_count": 2, "free_count": 1},
            {"file": "gone.cpp", "line": 3, "live_blocks": -1, "live_bytes": -8, "allocated": 0, "freed": 8,
             "alloc_count": 0, "free_count": 1}]},
        "disk_io": {"rows": [{"name": "run.dat",
            "open": {"count": 1, "seconds": 0.1}, "close": {"count": 2, "seconds": 1e-9},
            "seek": {"count": 3, "seconds": -4},
            "read": {"count": 5, "seconds": 1e300, "bytes": 4611686018427387904},
            "write": {"count": 0, "seconds": 0, "bytes": 0}}]},
        "timers": {"time": 1.5, "process": 4711, "rows": [
            {"name": "load", "seconds": 1.5, "threads": [1, 0.5], "open_seconds": 0.25},
            {"name": "lost", "seconds": null, "threads": [null, -1], "open_seconds": 0},
            {"name": "idle", "seconds": 2, "threads": [0, 2], "open_seconds": 0}]}})"));
}

TEST(SnapshotJson, ReadsBackAnyName) {
    for (const std::string& name : kHostileNames) {
        const std::string text = Json(HMemorySnapshot{{{name, 1}}});
        ExpectValid(text);
        const json row = json::parse(text)["memory"]["rows"][0];
        EXPECT_EQ(row.contains("file_hex"), !IsUtf8(name)) << text;
        EXPECT_EQ(row.contains("file_hex") ? FromHex(row["file_hex"]) : row["file"].get<std::string>(), name);
    }
}

TEST(SnapshotCsv, HasEveryFigure) {
    EXPECT_EQ(Csv(kMemory),
              "file,line,live_blocks,live_bytes,allocated,freed,alloc_count,free_count\n"
              "\"/src/a b.cpp\",7,1,64,96,32,2,1\n\"gone.cpp\",3,-1,-8,0,8,0,1\n");
    EXPECT_THAT(Csv(kDiskIO),
                testing::EndsWith("\n\"run.dat\",1,0.1,2,1e-09,3,-4,5,1e+300,4611686018427387904,0,0,0\n"));
    EXPECT_THAT(Csv(HMemorySnapshot{{{"a \"b\",\n", 1}}}), testing::HasSubstr("\n\"a \"\"b\"\",\n\",1,0,"));
    EXPECT_EQ(Csv(kTimers),
              "name,thread,seconds\n\"load\",0,1\n\"load\",1,0.5\n\"lost\",0,\n\"lost\",1,-1\n"
              "\"idle\",0,0\n\"idle\",1,2\n");
}

TEST(SnapshotFoldedStacks, SplitsPathsIntoFrames) {
    const struct {
        const char* file;
        int line;
        const char* frames;
    } cases[] = {{"/src//core/a b.cpp", 7, "src;core;a b.cpp:7 9\n"},
                 {"C:\\src\\a.cpp", 7, "C:;src;a.cpp:7 9\n"},
                 {"libm!sin", 0, "libm!sin 9\n"},
                 {"a;b\n\x7F\xFFz", 1, "a_b__\xEF\xBF\xBDz:1 9\n"}};
    for (const auto& [file, line, frames] : cases) {
        const HMemorySnapshot memory{{{file, line, 0, 9}, {"gone.cpp", 1, 0, -9}, {"none.cpp", 1}}};
        EXPECT_EQ((Written<const HMemorySnapshot&, HMemoryFigure>(HWriteFoldedStacks, memory,
                                                                  HMemoryFigure::kLiveBytes)),
                  frames);
    }
}

// The fields that the trace event format documents for complete and metadata events.
TEST(SnapshotChromeTrace, LaysTheTimersOfAThreadEndToEnd) {
    const json trace = json::parse(Written<const GlobalTimerSnapshot&>(HWriteChromeTrace, kTimers));
    EXPECT_EQ(trace, json::parse(R"({"displayTimeUnit": "ms", "traceEvents": [
        {"ph": "M", "pid": 4711, "tid": 0, "name": "process_name", "args": {"name": "timers"}},
        {"ph": "M", "pid": 4711, "tid": 0, "name": "thread_name", "args": {"name": "OpenMP thread 0"}},
        {"ph": "X", "cat": "timer", "pid": 4711, "tid": 0, "ts": 0, "dur": 1000000, "name": "load",
         "args": {"seconds": 1, "seconds_of_all_threads": 1.5}},
        {"ph": "M", "pid": 4711, "tid": 1, "name": "thread_name", "args": {"name": "OpenMP thread 1"}},
        {"ph": "X", "cat": "timer", "pid": 4711, "tid": 1, "ts": 0, "dur": 500000, "name": "load",
         "args": {"seconds": 0.5, "seconds_of_all_threads": 1.5}},
        {"ph": "X", "cat": "timer", "pid": 4711, "tid": 1, "ts": 500000, "dur": 2000000, "name": "idle",
         "args": {"seconds": 2, "seconds_of_all_threads": 2}}]})"));
}

TEST(SnapshotWriters, ReportAStreamThatFails) {
    std::ofstream full("/dev/full", std::ios::binary);
    EXPECT_FALSE(HWriteJson(full, kMemory));
    std::ostream nowhere(nullptr);
    EXPECT_FALSE(HWriteCsv(nowhere, kDiskIO));
}

}  // namespace

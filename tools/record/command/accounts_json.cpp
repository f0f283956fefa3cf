// Reading a report that was written as JSON.
#include <fstream>
#include <stdexcept>
#include <vector>

#include <nlohmann/json.hpp>

#include "compare.h"

namespace recorder {
namespace {

using Json = nlohmann::json;

// The row's file, function and line in that; empty if the report does not know the function.
std::string PlaceOf(const Json& row) {
    if (!row.contains("function")) return {};
    const long long line = row.at("line").get<int>();
    const long long function_line = row.at("function_line").get<int>();
    const std::string file = row.at("file");
    const std::string function = row.at("function");
    return file + " " + function + "+" + std::to_string(line - function_line);
}

// Names that are not text have their bytes in hexadecimal beside them; for a comparison the readable form will do.
void ReadMemory(const Json& json, Accounts& accounts) {
    HMemorySnapshot& memory = accounts.memory;
    memory.mnTotal = json.at("total");
    memory.mnPeak = json.at("peak");
    for (const Json& row : json.at("rows")) {
        memory.maRows.push_back({row.at("file"), row.at("line"), row.at("live_blocks"), row.at("live_bytes"),
                                 row.at("allocated"), row.at("freed"), row.at("alloc_count"),
                                 row.at("free_count")});
        accounts.places.push_back(PlaceOf(row));
    }
}

// The program and how it ended, in a line; empty for a report of the library's own.
std::string ReadRun(const Json& run) {
    if (!run.contains("arguments")) return run.contains("processes") ? "several processes" : "";
    std::string text;
    for (const std::string& word : run.at("arguments").get<std::vector<std::string>>()) text += word + " ";
    return text + "(" + run.at("started").get_ref<const std::string&>() + ", " +
           run.at("end").get_ref<const std::string&>() + ")";
}

HDiskIOSnapshot::Operation ReadOperation(const Json& json) {
    HDiskIOSnapshot::Operation operation;
    operation.mnCount = json.at("count");
    operation.mnBytes = json.value("bytes", 0LL);
    return operation;
}

HDiskIOSnapshot ReadDisk(const Json& json) {
    HDiskIOSnapshot disk;
    for (const Json& row : json.at("rows"))
        disk.maRows.push_back({row.at("name"), ReadOperation(row.at("open")), ReadOperation(row.at("close")),
                               ReadOperation(row.at("seek")), ReadOperation(row.at("read")),
                               ReadOperation(row.at("write"))});
    return disk;
}

}  // namespace

Accounts ReadAccounts(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) throw std::runtime_error("cannot read " + path);
    try {
        const Json json = Json::parse(file);
        Accounts accounts;
        if (json.contains("memory")) ReadMemory(json.at("memory"), accounts);
        if (json.contains("disk_io")) accounts.disk = ReadDisk(json.at("disk_io"));
        if (json.contains("run")) accounts.run = ReadRun(json.at("run"));
        return accounts;
    } catch (const Json::exception& error) {
        throw std::runtime_error(path + " is not a report in JSON: " + error.what());
    }
}

}  // namespace recorder

// Reading a report that was written as JSON.
#include <fstream>
#include <stdexcept>

#include <nlohmann/json.hpp>

#include "compare.h"

namespace recorder {
namespace {

using Json = nlohmann::json;

// Names that are no text have their bytes in hexadecimal beside them; for a comparison the readable form will
// do.
HMemorySnapshot ReadMemory(const Json& json) {
    HMemorySnapshot memory;
    memory.mnTotal = json.at("total");
    memory.mnPeak = json.at("peak");
    for (const Json& row : json.at("rows"))
        memory.maRows.push_back({row.at("file"), row.at("line"), row.at("live_blocks"), row.at("live_bytes"),
                                 row.at("allocated"), row.at("freed"), row.at("alloc_count"),
                                 row.at("free_count")});
    return memory;
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
        if (json.contains("memory")) accounts.memory = ReadMemory(json.at("memory"));
        if (json.contains("disk_io")) accounts.disk = ReadDisk(json.at("disk_io"));
        return accounts;
    } catch (const Json::exception& error) {
        throw std::runtime_error(path + " is no report in JSON: " + error.what());
    }
}

}  // namespace recorder

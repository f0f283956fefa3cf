/// @file
/// Reads back the JSON documents of `HWriteJson`. Requires the library nlohmann-json (3.10 or later) and exceptions.
///
///     std::ifstream file("memory.json", std::ios::binary);
///     HSnapshots before;
///     std::string error;
///     if (!HReadJson(file, before, error)) throw std::runtime_error(error);
///     const auto growth = HMemorySnapshot::Take().Since(*before.moMemory);
#ifndef ZANBASE_INTEGRATIONS_SNAPSHOT_JSON_H
#define ZANBASE_INTEGRATIONS_SNAPSHOT_JSON_H

#include <istream>
#include <limits>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include <nlohmann/json.hpp>

#include "zanbase/account_data.h"
#include "zanbase/snapshot.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// The accounts of a document; those that it does not have are empty. Thread-safe, as any plain value.
struct HSnapshots {
    std::optional<HMemorySnapshot> moMemory;      ///< the tracker's
    std::optional<HDiskIOSnapshot> moDiskIO;      ///< the disk ledger's
    std::optional<GlobalTimerSnapshot> moTimers;  ///< the timers'
};

/// @cond
// The parts of a document. Each function throws an exception of the JSON library, or std::runtime_error, if its part is not
// as the schema has it.
class HSnapshotJson {
public:
    static HSnapshots Read(const nlohmann::json& document) {
        if (document.at("schema") != "zanbase-snapshot") throw std::runtime_error("not a zanbase-snapshot");
        if (Whole(document.at("version")) != kSnapshotJsonVersion)
            throw std::runtime_error("version " + document.at("version").dump() + " is not supported");
        HSnapshots snapshots;
        if (const auto part = document.find("memory"); part != document.end()) {
            snapshots.moMemory = ReadRows<HMemorySnapshot>(*part, ReadSite);
            snapshots.moMemory->mnTotal = Whole(part->at("total"));
            snapshots.moMemory->mnPeak = Whole(part->at("peak"));
        }
        if (const auto part = document.find("disk_io"); part != document.end())
            snapshots.moDiskIO = ReadRows<HDiskIOSnapshot>(*part, ReadFile);
        if (const auto part = document.find("timers"); part != document.end())
            snapshots.moTimers = ReadRows<GlobalTimerSnapshot>(*part, ReadTimer);
        return snapshots;
    }

private:
    using Json = nlohmann::json;

    static long long Whole(const Json& number) {
        if (!number.is_number_integer() ||
            (number.is_number_unsigned() &&
             number.get<unsigned long long>() >
                 static_cast<unsigned long long>(std::numeric_limits<long long>::max())))
            throw std::runtime_error(number.dump() + " is not a whole number of 64 bits");
        return number.get<long long>();
    }

    static double Seconds(const Json& number) {
        if (number.is_null()) return std::numeric_limits<double>::quiet_NaN();
        if (!number.is_number()) throw std::runtime_error(number.dump() + " is not a number of seconds");
        return number.get<double>();
    }

    // The text of member `key`, or the bytes of its hexadecimal form.
    static std::string Text(const Json& row, const std::string& key) {
        const auto hex = row.find(key + "_hex");
        if (hex == row.end()) return row.at(key).get<std::string>();
        const auto digits = hex->get<std::string>();
        std::string bytes;
        for (std::size_t digit = 0; digit < digits.size(); digit += 2) {
            const std::string pair = digits.substr(digit, 2);
            if (pair.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos || pair.size() != 2)
                throw std::runtime_error(key + "_hex is not hexadecimal");
            bytes += static_cast<char>(std::stoi(pair, nullptr, 16));
        }
        return bytes;
    }

    template <class Snapshot, class ReadRow>
    static Snapshot ReadRows(const Json& part, ReadRow read_row) {
        Snapshot snapshot;
        for (const Json& row : part.at("rows")) snapshot.maRows.push_back(read_row(row));
        if (const auto time = part.find("time"); time != part.end()) snapshot.mdTime = Seconds(*time);
        if (const auto process = part.find("process"); process != part.end())
            snapshot.mnProcess = Whole(*process);
        return snapshot;
    }

    static HMemorySnapshot::Row ReadSite(const Json& row) {
        const long long line = Whole(row.at("line"));
        if (line != static_cast<int>(line))
            throw std::runtime_error(row.at("line").dump() + " is not a line");
        return {Text(row, "file"),
                static_cast<int>(line),
                Whole(row.at("live_blocks")),
                Whole(row.at("live_bytes")),
                Whole(row.at("allocated")),
                Whole(row.at("freed")),
                Whole(row.at("alloc_count")),
                Whole(row.at("free_count"))};
    }

    static HDiskIOOperation ReadOperation(const Json& operation) {
        const auto bytes = operation.find("bytes");
        return {Whole(operation.at("count")), Seconds(operation.at("seconds")),
                bytes != operation.end() ? Whole(*bytes) : 0};
    }

    static HDiskIOSnapshot::Row ReadFile(const Json& row) {
        return {Text(row, "name"),
                ReadOperation(row.at("open")),
                ReadOperation(row.at("close")),
                ReadOperation(row.at("seek")),
                ReadOperation(row.at("read")),
                ReadOperation(row.at("write"))};
    }

    static GlobalTimerSnapshot::Row ReadTimer(const Json& row) {
        GlobalTimerSnapshot::Row timer;
        timer.moName = Text(row, "name");
        timer.mdSeconds = Seconds(row.at("seconds"));
        for (const Json& seconds : row.at("threads")) timer.maThreadSeconds.push_back(Seconds(seconds));
        if (const auto open = row.find("open_seconds"); open != row.end())
            timer.mdOpenSeconds = Seconds(*open);
        return timer;
    }
};
/// @endcond

/// Reads a document of `HWriteJson` to the end of the stream. Returns false with the reason in `error` if the text is not
/// JSON, not such a document, or of another version; `snapshots` is then unchanged. Members that the version does not
/// know are ignored. Any snapshot that was written is read back equal, names of any bytes included; times that are not
/// finite become NaN. If memory runs out, `std::bad_alloc` reaches the caller. Thread-safe for different objects.
[[nodiscard]] inline bool HReadJson(std::istream& stream, HSnapshots& snapshots, std::string& error) {
    try {
        snapshots = HSnapshotJson::Read(nlohmann::json::parse(stream));
        return true;
    } catch (const nlohmann::json::exception& failure) {
        error = failure.what();
    } catch (const std::runtime_error& failure) {
        error = failure.what();
    }
    return false;
}

ZANBASE_MODE_END

/// @}

#endif

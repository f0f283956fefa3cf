/// @file
/// The tracker's account as a profile that `pprof` and other profile viewers read: a compressed protocol buffer. Requires the
/// libraries protozero (1.7 or later, headers alone) and zlib; link with `-lz`.
///
///     std::ofstream file("memory.pb.gz", std::ios::binary);
///     if (!HWritePprof(file, HMemorySnapshot::Take())) std::perror("memory.pb.gz");
///
///     $ go tool pprof -top memory.pb.gz
#ifndef ZANBASE_INTEGRATIONS_PPROF_H
#define ZANBASE_INTEGRATIONS_PPROF_H

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <map>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include <zlib.h>

#include <protozero/pbf_builder.hpp>

#include "zanbase/account_data.h"
#include "zanbase/snapshot.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// @cond
// Builds the message `Profile` of pprof's format. The tags are its field numbers.
class HPprofProfile {
public:
    explicit HPprofProfile(const HMemorySnapshot& memory) {
        (void)IndexOf("");  // the first string has to be empty
        AddSampleType("alloc_objects", "count");
        AddSampleType("alloc_space", "bytes");
        AddSampleType("inuse_objects", "count");
        AddSampleType("inuse_space", "bytes");
        std::uint64_t id = 0;
        for (const HMemorySnapshot::Row& row : memory.maRows) AddSite(row, ++id);
        moProfile.add_int64(Tag::kTimeNanos, std::llround(memory.mdTime * 1e3) * 1000000);
        moProfile.add_int64(Tag::kDefaultSampleType, IndexOf("inuse_space"));
        for (const std::string& text : maTexts) moProfile.add_string(Tag::kStringTable, text);
    }

    [[nodiscard]] const std::string& GetBytes() const { return moBytes; }

private:
    enum class Tag : protozero::pbf_tag_type {
        kSampleType = 1,
        kSample = 2,
        kLocation = 4,
        kFunction = 5,
        kStringTable = 6,
        kTimeNanos = 9,
        kDefaultSampleType = 14
    };
    enum class ValueTypeTag : protozero::pbf_tag_type { kType = 1, kUnit = 2 };
    enum class SampleTag : protozero::pbf_tag_type { kLocationId = 1, kValue = 2 };
    enum class LocationTag : protozero::pbf_tag_type { kId = 1, kLine = 4 };
    enum class LineTag : protozero::pbf_tag_type { kFunctionId = 1, kLine = 2 };
    enum class FunctionTag : protozero::pbf_tag_type { kId = 1, kName = 2, kSystemName = 3, kFilename = 4 };

    void AddSampleType(const char* type, const char* unit) {
        protozero::pbf_builder<ValueTypeTag> message(moProfile, Tag::kSampleType);
        message.add_int64(ValueTypeTag::kType, IndexOf(type));
        message.add_int64(ValueTypeTag::kUnit, IndexOf(unit));
    }

    // A call site is a function "file:line" of its own, with one location.
    void AddSite(const HMemorySnapshot::Row& row, std::uint64_t id) {
        const std::string file = Utf8(row.moFile);
        const std::int64_t name = IndexOf(row.mnLine > 0 ? file + ":" + std::to_string(row.mnLine) : file);
        {
            protozero::pbf_builder<FunctionTag> message(moProfile, Tag::kFunction);
            message.add_uint64(FunctionTag::kId, id);
            message.add_int64(FunctionTag::kName, name);
            message.add_int64(FunctionTag::kSystemName, name);
            message.add_int64(FunctionTag::kFilename, IndexOf(file));
        }
        {
            protozero::pbf_builder<LocationTag> message(moProfile, Tag::kLocation);
            message.add_uint64(LocationTag::kId, id);
            protozero::pbf_builder<LineTag> line(message, LocationTag::kLine);
            line.add_uint64(LineTag::kFunctionId, id);
            line.add_int64(LineTag::kLine, row.mnLine);
        }
        const std::array<std::int64_t, 4> values = {row.mnAllocCount, row.mnAllocated, row.mnLiveBlocks,
                                                    row.mnLiveBytes};
        protozero::pbf_builder<SampleTag> message(moProfile, Tag::kSample);
        message.add_packed_uint64(SampleTag::kLocationId, &id, &id + 1);
        message.add_packed_int64(SampleTag::kValue, values.begin(), values.end());
    }

    // Of a text in the string table.
    std::int64_t IndexOf(const std::string& text) {
        const auto [entry, is_new] = moIndices.emplace(text, static_cast<std::int64_t>(maTexts.size()));
        if (is_new) maTexts.push_back(text);
        return entry->second;
    }

    // The text with U+FFFD in place of each byte that is not well-formed UTF-8.
    static std::string Utf8(std::string_view text) {
        std::string result;
        while (!text.empty()) {
            const std::size_t length = HUtf8CharacterLength(text.data(), text.size());
            result += length != 0 ? text.substr(0, length) : std::string_view("\xEF\xBF\xBD");
            text.remove_prefix(length != 0 ? length : 1);
        }
        return result;
    }

    std::string moBytes;
    protozero::pbf_builder<Tag> moProfile{moBytes};
    std::map<std::string, std::int64_t> moIndices;
    std::vector<std::string> maTexts;
};

// Writes `bytes` compressed by gzip; false if the stream or the compression fails.
inline bool HWriteCompressed(std::ostream& stream, const std::string& bytes) {
    constexpr int kGzip = 16;  // added to the window's size: a gzip header
    z_stream deflation{};
    if (deflateInit2(&deflation, Z_DEFAULT_COMPRESSION, Z_DEFLATED, MAX_WBITS + kGzip, 8,
                     Z_DEFAULT_STRATEGY) != Z_OK)
        return false;
    std::vector<char> piece(std::size_t{64} * 1024);
    std::string_view rest = bytes;
    int result = Z_OK;
    while (result == Z_OK && stream.good()) {
        const auto part =
            static_cast<uInt>(std::min<std::size_t>(rest.size(), 1U << 30U));  // zlib counts in 32 bits
        deflation.next_in = const_cast<Bytef*>(reinterpret_cast<const Bytef*>(rest.data()));
        deflation.avail_in = part;
        deflation.next_out = reinterpret_cast<Bytef*>(piece.data());
        deflation.avail_out = static_cast<uInt>(piece.size());
        result = deflate(&deflation, part == rest.size() ? Z_FINISH : Z_NO_FLUSH);
        rest.remove_prefix(part - deflation.avail_in);
        stream.write(piece.data(), static_cast<std::streamsize>(piece.size() - deflation.avail_out));
    }
    deflateEnd(&deflation);
    return result == Z_STREAM_END && stream.flush().good();
}
/// @endcond

/// Writes the call sites as a profile with the sample types `alloc_objects`, `alloc_space`, `inuse_objects` and
/// `inuse_space` (the default), as heap profiles have them. A call site is a frame "file:line"; the tracker knows no
/// callers. Bytes that are not UTF-8 become U+FFFD. Flushes the stream and returns true if it took everything; open files
/// as binary. If memory runs out, `std::bad_alloc` reaches the caller before the first byte is written. Thread-safe for
/// different streams.
[[nodiscard]] inline bool HWritePprof(std::ostream& stream, const HMemorySnapshot& memory) {
    const HTrackerPause pause;
    return HWriteCompressed(stream, HPprofProfile(memory).GetBytes());
}

ZANBASE_MODE_END

/// @}

#endif

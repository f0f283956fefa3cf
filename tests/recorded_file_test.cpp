// Recorded files: what they record, and what they report when the layer below fails.
#include <gtest/gtest.h>

#include <filesystem>
#include <vector>

#include "zanbase/adapters/recorded_file.h"
#include "zanbase/snapshot.h"

namespace {

HDiskIOSnapshot::Row FileNamed(const std::string& name) {
    for (const auto& row : HDiskIOSnapshot::Take().maRows)
        if (row.moName == name) return row;
    return {};
}

struct Step {
    long long result;
    int reason;  // what errno is set to; -1: it is left as it is
};

// A file layer whose next results are scripted.
struct ScriptedCalls {
    using Native = int;
    using Mode = int;
    static constexpr Native kClosed = -1;
    static inline std::vector<Step> steps;
    static long long Next() {
        const Step step = steps.front();
        steps.erase(steps.begin());
        if (step.reason >= 0) errno = step.reason;
        return step.result;
    }
    static Native Open(const char*, Mode) { return static_cast<int>(Next()); }
    static long long Read(Native, void*, std::size_t) { return Next(); }
    static long long Write(Native, const void*, std::size_t) { return Next(); }
    static long long Seek(Native, long long, int) { return Next(); }
    static int Close(Native) { return static_cast<int>(Next()); }
};
using ScriptedFile = HRecorded<ScriptedCalls>;

TEST(RecordedFile, RepeatsInterruptedCallsAndShortWrites) {
    ScriptedCalls::steps = {{-1, EINTR}, {3, 0}, {-1, EINTR}, {7, EINTR}, {4, 0},
                            {-1, EINTR}, {6, 0}, {2, 0},      {0, 0}};
    std::error_code error;
    auto file = ScriptedFile::Open("scripted", 0, error);
    ASSERT_TRUE(file.IsOpen());
    EXPECT_EQ(file.Read(nullptr, 100, error), 7U);
    EXPECT_EQ(file.Write("twelve bytes", 12, error), 12U);
    file.Close(error);
    EXPECT_FALSE(error) << error.message();
    const HDiskIOSnapshot::Row row = FileNamed("scripted");
    EXPECT_EQ(row.moOpen.mnCount, 1);
    EXPECT_EQ(row.moRead.mnBytes, 7);
    EXPECT_EQ(row.moWrite.mnCount, 3);
    EXPECT_EQ(row.moWrite.mnBytes, 12);
    EXPECT_EQ(row.moClose.mnCount, 1);
}

TEST(RecordedFile, ReportsAFailureWithoutAReason) {
    std::error_code error;
    errno = EINTR;  // of an earlier call
    ScriptedCalls::steps = {{-1, -1}, {3, -1}, {-1, -1}, {5, -1}, {-1, -1}, {-1, 0}};
    EXPECT_FALSE(ScriptedFile::Open("scripted", 0, error).IsOpen());
    EXPECT_EQ(error, std::errc::io_error);
    auto file = ScriptedFile::Open("scripted", 0, error);
    EXPECT_EQ(file.Read(nullptr, 100, error), 0U);
    EXPECT_EQ(error, std::errc::io_error);
    EXPECT_EQ(file.Write("twelve bytes", 12, error), 5U);
    EXPECT_EQ(error, std::errc::io_error);
    file.Close(error);
    EXPECT_EQ(error, std::errc::io_error);
}

TEST(RecordedFile, RefusesWhatIsNoNameOrMode) {
    std::error_code error;
    const struct {
        std::string_view name;
        const char* mode;
    } cases[] = {{{"a\0b", 3}, "wb"}, {"a", nullptr}, {"a", ""}, {"a", "q"}};
    for (const auto& [name, mode] : cases) {
        EXPECT_FALSE(HRecordedFile::Open(name, mode, error).IsOpen());
        EXPECT_EQ(error, std::errc::invalid_argument) << name << ", " << (mode == nullptr ? "null" : mode);
    }
    EXPECT_THROW((void)HRecordedFile::Open(static_cast<const char*>(nullptr), "rb"), std::system_error);
}

// The second name is longer than the 260 characters that Windows takes without more.
TEST(RecordedFile, OpensNamesInUtf8OfAnyLength) {
    namespace fs = std::filesystem;
    const std::string folder = testing::TempDir() + std::string(100, 'a');
    fs::create_directory(folder);
    for (const std::string& name : {testing::TempDir() + "\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80",
                                    folder + '/' + std::string(200, 'b')}) {
        auto file = HRecordedDescriptor::Open(name, {O_WRONLY | O_CREAT | O_TRUNC});
        file.Write("text");
        file.Close();
        char text[5] = {};
        EXPECT_EQ(HRecordedFile::Open(name, "rb").Read(text, 4), 4U);
        EXPECT_STREQ(text, "text");
    }
    EXPECT_TRUE(fs::remove(fs::u8path(testing::TempDir() + "\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80")));
}

TEST(RecordedFile, AdoptsAndReleasesAnOpenFile) {
    const std::string name = testing::TempDir() + "adopted";
    HRecordedFile file = HRecordedFile::Adopt(std::fopen(name.c_str(), "wb"), "under this name");
    file.Write("text");
    std::FILE* const released = file.Release();
    EXPECT_FALSE(file.IsOpen());
    EXPECT_EQ(std::ftell(released), 4);
    std::fclose(released);
    std::remove(name.c_str());
    EXPECT_EQ(FileNamed("under this name").moWrite.mnBytes, 4);
    EXPECT_EQ(FileNamed("under this name").moClose.mnCount, 0);
}

}  // namespace

// Recorded files and streams: what they record, what they report when the layer below fails, and that a stream does what
// the standard's does.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <random>
#include <vector>

#include "zanbase/adapters/recorded_stream.h"
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
    EXPECT_FALSE(ScriptedFile::Open("failing", 0, error).IsOpen());
    EXPECT_EQ(error, std::errc::io_error);
    auto file = ScriptedFile::Open("failing", 0, error);
    EXPECT_EQ(file.Read(nullptr, 100, error), 0U);
    EXPECT_EQ(error, std::errc::io_error);
    EXPECT_EQ(file.Write("twelve bytes", 12, error), 5U);
    EXPECT_EQ(error, std::errc::io_error);
    file.Close(error);
    EXPECT_EQ(error, std::errc::io_error);
    EXPECT_EQ(FileNamed("failing").moRead.mnCount, 0);
    EXPECT_EQ(FileNamed("failing").moClose.mnCount, 0);
}

TEST(RecordedFile, RefusesWhatIsNotANameOrMode) {
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

// One of a stream buffer's operations, with random arguments; what it gave, and what it read.
std::string Operate(std::streambuf& buffer, std::minstd_rand& random, int operation) {
    const auto below = [&](unsigned int limit) { return static_cast<std::streamoff>(random() % limit); };
    static constexpr unsigned int kLimits[] = {1, 10, 1000, 9000, 70000, 150000};
    std::string block(static_cast<std::size_t>(1 + below(kLimits[below(6)])),
                      static_cast<char>('a' + below(26)));
    const auto size = static_cast<std::streamsize>(block.size());
    switch (operation) {
        case 0:
            return std::to_string(buffer.sgetc());
        case 1:
            return std::to_string(buffer.sgetn(block.data(), size)) + block;
        case 2:
            return std::to_string(buffer.sputn(block.data(), size));
        case 3:
            return std::to_string(buffer.sputc('-'));
        case 4:
            return std::to_string(buffer.pubseekpos(below(300000)));
        case 5:
            return std::to_string(buffer.pubseekoff(below(10000) - 5000, std::ios_base::cur));
        case 6:
            return std::to_string(buffer.pubseekoff(-below(1000), std::ios_base::end));
        case 7:
            return std::to_string(buffer.pubseekoff(0, std::ios_base::cur));
        case 8:
            return std::to_string(buffer.sbumpc());
        default:
            return std::to_string(buffer.sbumpc() == EOF || buffer.sungetc() != EOF);
    }
}

TEST(RecordedStream, DoesWhatTheStandardsDoes) {
    const std::string names[] = {testing::TempDir() + "standard", testing::TempDir() + "recorded"};
    for (const std::string& name : names)
        std::ofstream(name, std::ios_base::binary) << std::string(100000, '.');
    std::filebuf standard;
    standard.open(names[0], std::ios_base::in | std::ios_base::out | std::ios_base::binary);
    HRecordedStreambuf recorded(HRecordedDescriptor::Open(names[1], {O_RDWR}));
    std::minstd_rand random;
    for (int count = 0; count < 5000; ++count) {
        const int operation = static_cast<int>(random() % 10);
        std::minstd_rand same = random;
        const std::string expected = Operate(standard, random, operation);
        ASSERT_EQ(Operate(recorded, same, operation), expected)
            << "operation " << operation << ", number " << count;
    }
    // Another byte than the file's, put back, is read once: the standard's has a wrong position then.
    recorded.pubseekpos(0);
    const int first = recorded.sbumpc();
    recorded.sputbackc('?');
    EXPECT_EQ(recorded.sgetc(), '?');
    recorded.pubseekpos(0);
    EXPECT_EQ(recorded.sgetc(), first);
    EXPECT_TRUE(recorded.Close());
    for (const std::string& name : names) std::remove(name.c_str());
    EXPECT_EQ(FileNamed(names[1]).moClose.mnCount, 1);
}

}  // namespace

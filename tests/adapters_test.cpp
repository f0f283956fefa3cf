// The adapters: what they record, and what they do when the layer below or the tracker fails.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <sstream>
#include <vector>

#include "zanbase/adapters/recorded_stream.h"
#include "zanbase/adapters/tracked_memory.h"
#include "zanbase/snapshot.h"

namespace {

using testing::ElementsAre;

// Live blocks and bytes of each site that has any, and calls so far.
std::string Sites() {
    std::ostringstream text;
    for (const auto& row : HMemorySnapshot::Take().maRows)
        text << row.mnLine << ':' << row.mnLiveBlocks << '/' << row.mnLiveBytes << " of " << row.mnAllocCount
             << ' ';
    return text.str();
}

struct Base {
    virtual ~Base() = default;
    long mnFirst = 0;
};
struct Other {
    virtual ~Other() = default;
    long mnSecond = 0;
};
struct Derived : Base, Other {};
struct Thrower {
    Thrower() { throw 1; }
};

TEST(TrackedMemory, RecordsAtTheLineOfTheCall) {
    const int line = __LINE__ + 1;
    HTrackedResource memory;
    std::vector<int, HTrackedAllocator<int>> numbers(HCallSite::Here());
    numbers.reserve(4);
    void* const block = memory.allocate(8);
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line) + ":1/8 of 1 "));
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line + 1) + ":1/16 of 1 "));
    memory.deallocate(block, 8);
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line) + ":0/0 of 1 "));
    HMemory::Reset();
}

TEST(TrackedMemory, FollowsAnObjectThroughItsSecondBase) {
    {
        const HTrackedPtr<const Other> object = HMakeTracked<Derived>({"a.cpp", 1});
        EXPECT_EQ(Sites(), "1:1/32 of 1 ");
    }
    EXPECT_EQ(Sites(), "1:0/0 of 1 ");
    EXPECT_THROW((void)HMakeTracked<Thrower>({"a.cpp", 1}), int);
    EXPECT_EQ(Sites(), "1:0/0 of 2 ");
    HMemory::Reset();
}

TEST(TrackedMemory, CopiesAContainerWithTheUpstreamForCopies) {
    std::pmr::monotonic_buffer_resource arena;
    using Allocator = HTrackedAllocator<int, std::pmr::polymorphic_allocator<int>>;
    const std::vector<int, Allocator> numbers(Allocator(HCallSite::Here(), &arena));
    const auto copy = numbers;
    EXPECT_EQ(copy.get_allocator().GetUpstream().resource(), std::pmr::get_default_resource());
}

TEST(TrackedMemory, GivesBackWhatWasNeverRecorded) {
    HTrackedResource memory(std::pmr::new_delete_resource(), {"a.cpp", 1});
    void* block = nullptr;
    {
        const HTrackerPause pause;
        block = memory.allocate(8);
    }
    EXPECT_EQ(Sites(), "");
    memory.deallocate(block, 8);  // the address sanitizer finds it otherwise
    EXPECT_EQ(Sites(), "");
}

// A file layer whose next results are scripted: counts, or -1 with EINTR.
struct ScriptedCalls {
    using Native = int;
    using Mode = int;
    static constexpr Native kClosed = -1;
    static inline std::vector<long long> results;
    static long long Next() {
        const long long result = results.front();
        results.erase(results.begin());
        errno = EINTR;
        return result;
    }
    static Native Open(const char*, Mode) { return static_cast<int>(Next()); }
    static long long Read(Native, void*, std::size_t) { return Next(); }
    static long long Write(Native, const void*, std::size_t) { return Next(); }
    static long long Seek(Native, long long, int) { return Next(); }
    static int Close(Native) { return static_cast<int>(Next()); }
};

HDiskIOSnapshot::Row FileNamed(const std::string& name) {
    for (const auto& row : HDiskIOSnapshot::Take().maRows)
        if (row.moName == name) return row;
    return {};
}

TEST(RecordedFile, RepeatsInterruptedCallsAndShortWrites) {
    ScriptedCalls::results = {-1, 3, -1, 7, 4, -1, 6, 2, 0};
    std::error_code error;
    auto file = HRecorded<ScriptedCalls>::Open("scripted", 0, error);
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

template <class File>
void ExpectFailuresTold(typename File::Mode read, typename File::Mode write) {
    std::error_code error;
    File missing = File::Open("/no/such/file", read, error);
    EXPECT_EQ(error, std::errc::no_such_file_or_directory);
    EXPECT_EQ(missing.Seek(0, SEEK_SET, error), -1);
    EXPECT_EQ(error, std::errc::bad_file_descriptor);
    File directory = File::Open("/", read, error);
    char byte;
    EXPECT_EQ(directory.Read(&byte, 1, error), 0U);
    EXPECT_EQ(error, std::errc::is_a_directory);
    File full = File::Open("/dev/full", write, error);
    const std::vector<char> block(100000);
    full.Write(block.data(), block.size(), error);
    EXPECT_EQ(error, std::errc::no_space_on_device);
    EXPECT_EQ(FileNamed("/dev/full").moWrite.mnCount, 0);
    EXPECT_EQ(FileNamed("/no/such/file").moOpen.mnCount, 0);
    HDiskIOReset();
}

TEST(RecordedFile, TellsFailuresAndRecordsNone) {
    ExpectFailuresTold<HRecordedFile>("r", "w");
    ExpectFailuresTold<HRecordedDescriptor>({}, {O_WRONLY});
}

TEST(RecordedStream, ReadsWritesAndSeeksInOneFile) {
    const std::string name = testing::TempDir() + "recorded_stream";
    std::error_code error;
    HRecordedStreambuf buffer(HRecordedDescriptor::Open(name, {O_RDWR | O_CREAT | O_TRUNC}, error));
    std::iostream stream(&buffer);
    const std::string large(200000, 'x');
    stream << "one two " << large;
    stream.seekg(4);
    std::string word;
    stream >> word;
    EXPECT_EQ(word, "two");
    EXPECT_EQ(stream.tellg(), 7);
    stream.seekp(0) << "six";
    EXPECT_TRUE(buffer.Close());
    std::remove(name.c_str());
    EXPECT_EQ(FileNamed(name).moWrite.mnBytes, 200011);
    EXPECT_EQ(FileNamed(name).moClose.mnCount, 1);
    HDiskIOReset();
}

TEST(RecordedStream, StepsBackBeyondWhatItHasBuffered) {
    const std::string name = testing::TempDir() + "recorded_step_back";
    std::ofstream(name, std::ios::binary) << std::string(65536, 'a') << "bc";
    std::error_code error;
    HRecordedStreambuf buffer(HRecordedDescriptor::Open(name, {}, error));
    std::istream stream(&buffer);
    stream.ignore(65536);
    EXPECT_EQ(stream.peek(), 'b');
    EXPECT_EQ(stream.tellg(), 65536);
    EXPECT_EQ(stream.unget().get(), 'a');
    EXPECT_EQ(stream.get(), 'b');
    EXPECT_TRUE(buffer.Close());
    std::remove(name.c_str());
}

TEST(RecordedStream, KeepsTheFirstError) {
    std::error_code error;
    HRecordedStreambuf buffer(HRecordedDescriptor::Open("/dev/full", {O_WRONLY}, error));
    std::ostream stream(&buffer);
    EXPECT_FALSE((stream << "text").flush().good());
    EXPECT_EQ(buffer.GetError(), std::errc::no_space_on_device);
    HRecordedStreambuf closed((HRecordedDescriptor()));
    EXPECT_EQ(std::istream(&closed).get(), EOF);
    EXPECT_EQ(closed.GetError(), std::errc::bad_file_descriptor);
}

}  // namespace

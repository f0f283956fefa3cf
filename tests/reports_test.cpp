// How the reports write and what they lock, on streams with write functions of the test's own (fopencookie).
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <mutex>
#include <string>
#include <thread>

#include "platform/stream.h"
#include "zanbase/disk_io.h"
#include "zanbase/memory.h"
#include "zanbase/semaphore.h"

namespace {

using Write = std::function<void(const std::string&)>;

// An unbuffered stream: each output call on it is one call of `write`.
class Stream {
public:
    explicit Stream(Write write) : moWrite(std::move(write)) { std::setvbuf(mpoFile, nullptr, _IONBF, 0); }
    ~Stream() { std::fclose(mpoFile); }
    operator std::FILE*() const { return mpoFile; }

private:
    static ssize_t Call(void* stream, const char* text, std::size_t size) {
        static_cast<Stream*>(stream)->moWrite({text, size});
        return static_cast<ssize_t>(size);
    }

    const Write moWrite;
    std::FILE* const mpoFile = fopencookie(this, "w", {nullptr, Call, nullptr, nullptr});
};

struct Tracker : HMemory {
    using HMemory::moMutex;
};

char handles[2];

// Two rows in each account.
void Record() {
    HMemory::Alloc(&handles[0], 10, "a", 1);
    HMemory::Alloc(&handles[1], 10, "b", 2);
    for (char& handle : handles) HDiskIOOpen(&handle == handles ? "a" : "b", &handle, 0);
    for (char& handle : handles) HDiskIORead(&handle, 5, 0);
}

// The number of lines in each write.
std::string WritesOf(const std::function<void(std::FILE*)>& report) {
    std::string lines;
    report(Stream([&](const std::string& text) {
        lines += std::to_string(std::count(text.begin(), text.end(), '\n')) + " ";
    }));
    return lines;
}

TEST(Reports, WriteEachPartInOneCall) {
    HDiskIOOpen("unused", nullptr, 0);
    EXPECT_EQ(WritesOf(HDiskIOUsageReport), "2 2 ");
    Record();
    EXPECT_EQ(WritesOf(HMemory::LeakReport), "6 1 1 4 ");
    EXPECT_EQ(WritesOf(HMemory::UsageReport), "2 4 4 7 ");
    EXPECT_EQ(WritesOf([](std::FILE* stream) { HDiskIOReportFile(stream, "a"); }), "5 ");
    EXPECT_EQ(WritesOf(HDiskIOSummaryReport), "15 ");
    EXPECT_EQ(WritesOf(HDiskIOUsageReport), "2 5 5 ");
}

TEST(Reports, ReturnWithoutTheStreamIfTheyHaveNothingToWrite) {
    HMemory::Reset();
    HDiskIOReset();
    const Stream stream([](const std::string&) {});
    const HSemaphore owned(0), done(0);
    std::thread owner([&] {
        const StreamLock lock(stream);
        owned.Unlock();
        done.Lock();
    });
    owned.Lock();
    for (const auto report :
         {HMemory::LeakReport, HMemory::UsageReport, HDiskIOSummaryReport, HDiskIOUsageReport})
        report(stream);
    EXPECT_FALSE(HDiskIOReportFile(stream, "a"));
    done.Unlock();
    owner.join();
}

void Repeat(const std::function<void()>& act) {
    for (int round = 0; round < 1000; ++round) act();
}

// Each thread owns one of a report's two locks when it acquires, or waits for, the other.
TEST(Reports, DeadlockWithNoThreadThatOwnsOneOfTheirLocks) {
    Record();
    const Stream other([](const std::string&) {});
    const Stream recording([](const std::string&) { HDiskIORead(&handles[0], 5, 0); });
    const Stream writing([&](const std::string& text) { std::fputs(text.c_str(), other); });
    const Stream reporting([&](const std::string&) { HMemory::UsageReport(other); });
    struct Case {
        const Stream& stream;  // of the report that runs beside `act`
        std::function<void()> act;
    };
    const auto owning_mutex = [](const std::function<void()>& act) {
        return [=] {
            const HMutexLock lock(&Tracker::moMutex);
            act();
        };
    };
    const Case cases[] = {
        {other, owning_mutex([&] { std::fputs("text", other); })},
        {other, owning_mutex([&] { HMemory::UsageReport(other); })},
        {other, owning_mutex([] { std::fclose(std::fopen("/dev/null", "w")); })},
        {other,
         [&] {
             const StreamLock lock(other);
             HMemory::Free(nullptr);
             HDiskIORead(&handles[0], 5, 0);
         }},
        {recording, [&] { std::fputs("text", recording); }},
        {writing, [&] { HMemory::UsageReport(other); }},
        {reporting, [&] { HMemory::LeakReport(other); }},
    };
    for (const Case& each : cases) {
        std::thread flusher([] { Repeat([] { std::fflush(nullptr); }); });
        std::thread actor([&] { Repeat(each.act); });
        Repeat([&] {
            HMemory::LeakReport(each.stream);
            HDiskIOUsageReport(each.stream);
        });
        actor.join();
        flusher.join();
    }
}

// The lines of another thread stay out of a table.
TEST(Reports, OwnTheStreamFromTheFirstWriteToTheLast) {
    Record();
    std::mutex mutex;  // the thread sanitizer does not see the lock of a stream
    std::string starts;
    const Stream stream([&](const std::string& text) {
        const std::lock_guard lock(mutex);
        starts += text[0];
    });
    std::thread other([&] { Repeat([&] { std::fputs("-", stream); }); });
    Repeat([&] { HMemory::LeakReport(stream); });
    other.join();
    for (std::size_t title = 0; (title = starts.find('M', title)) != std::string::npos; ++title)
        EXPECT_EQ(starts.substr(title, 4), "M|||");
}

}  // namespace

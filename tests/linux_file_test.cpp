// Recorded files where Linux loses, refuses or cuts what was to be written: limits, pipes, full devices.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <istream>
#include <ostream>
#include <string>

#include "zanbase/adapters/recorded_stream.h"

namespace {

// No file of the process can be longer than `bytes` in the scope.
class FileSizeLimit {
public:
    explicit FileSizeLimit(rlim_t bytes) {
        signal(SIGXFSZ, SIG_IGN);
        getrlimit(RLIMIT_FSIZE, &moBefore);
        const rlimit limit{bytes, moBefore.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~FileSizeLimit() { setrlimit(RLIMIT_FSIZE, &moBefore); }

private:
    rlimit moBefore{};
};

TEST(RecordedFile, KeepsTheErrorOfALostBufferUntilItIsCleared) {
    const std::string name = testing::TempDir() + "limited";
    HRecordedFile file = HRecordedFile::Open(name, "wb");
    const std::string text(100000, 'x');
    std::error_code error;
    {
        const FileSizeLimit limit(27616);
        EXPECT_EQ(file.Write(text, error), 27616U);
        EXPECT_EQ(error, std::errc::file_too_large);
    }
    EXPECT_EQ(file.Write("more", error), 0U);
    EXPECT_EQ(error, std::errc::file_too_large);
    EXPECT_NE(std::ferror(file.GetNative()), 0);
    file.ClearError();
    EXPECT_EQ(file.Seek(0, SEEK_CUR), 27616);
    {
        const FileSizeLimit limit(30000);
        file.Write(std::string(3000, 'y'));  // fits into the buffer of the C library, and not into the file
        file.Close(error);
        EXPECT_EQ(error, std::errc::file_too_large);
    }
    unlink(name.c_str());
}

TEST(RecordedFile, IsNotInheritedUnlessAskedFor) {
    const HRecordedDescriptor own = HRecordedDescriptor::Open("/", {});
    const HRecordedDescriptor inherited = HRecordedDescriptor::Open("/", {O_RDONLY, 0, true});
    const HRecordedFile stream = HRecordedFile::Open("/dev/null", "rb+");
    EXPECT_EQ(fcntl(own.GetNative(), F_GETFD), FD_CLOEXEC);
    EXPECT_EQ(fcntl(inherited.GetNative(), F_GETFD), 0);
    EXPECT_EQ(fcntl(fileno(stream.GetNative()), F_GETFD), FD_CLOEXEC);
}

// A pipe whose ends don't wait.
struct Pipe {
    Pipe() {
        int ends[2];
        EXPECT_EQ(pipe2(ends, O_NONBLOCK), 0);
        moIn = HRecordedDescriptor::Adopt(ends[0], "pipe");
        moOut = HRecordedDescriptor::Adopt(ends[1], "pipe");
    }
    HRecordedDescriptor moIn, moOut;
};

TEST(RecordedStream, LosesNothingByWhatAPipeRefuses) {
    Pipe pipe;
    pipe.moOut.Write("text");
    HRecordedStreambuf buffer(std::move(pipe.moIn));
    std::istream stream(&buffer);
    EXPECT_EQ(stream.tellg(), -1);
    EXPECT_EQ(buffer.GetRefusal(), std::errc::invalid_seek);
    EXPECT_EQ(buffer.sbumpc(), 't');
    EXPECT_EQ(buffer.sungetc(), 't');
    EXPECT_EQ(buffer.sungetc(), EOF);
    EXPECT_EQ(buffer.sbumpc(), 't');
    EXPECT_TRUE(buffer.Close());
}

TEST(RecordedStream, WritesLaterWhatAFullPipeDidNotTake) {
    Pipe pipe;
    HRecordedStreambuf buffer(std::move(pipe.moOut));
    std::ostream stream(&buffer);
    stream << std::string(60000, 'a') << std::flush << std::string(20000, 'b');
    EXPECT_FALSE(stream.flush().good());  // the pipe holds 65536 or less
    EXPECT_EQ(buffer.GetError(), std::errc::resource_unavailable_try_again);
    std::string read(100000, ' ');
    std::size_t size = pipe.moIn.Read(read.data(), read.size());
    EXPECT_LT(size, 80000U);
    buffer.ClearError();
    stream.clear();
    stream << 'c';
    EXPECT_TRUE(buffer.Close());
    size += pipe.moIn.Read(read.data() + size, read.size() - size);
    EXPECT_EQ(read.substr(0, size), std::string(60000, 'a') + std::string(20000, 'b') + 'c');
}

}  // namespace

// Writes a file through an output stream, reads it twice (by lines and in blocks), and prints what the ledger says.
#include <zanbase/adapters/recorded_stream.h>

#include <cstdio>
#include <istream>
#include <ostream>
#include <string>

namespace {

int Fail(const char* what, const std::error_code& error) {
    std::fprintf(stderr, "%s: %s\n", what, error.message().c_str());
    return 1;
}

}  // namespace

int main(int count, char** arguments) {
    const std::string name = count > 1 ? arguments[1] : "recorded_file.txt";
    std::error_code error;

    HRecordedStreambuf target(HRecordedDescriptor::Open(name, {O_WRONLY | O_CREAT | O_TRUNC}, error));
    if (error) return Fail(name.c_str(), error);
    std::ostream out(&target);
    for (int line = 1; line <= 10000; ++line) out << "line " << line << '\n';
    if (!target.Close()) return Fail(name.c_str(), target.GetError());

    HRecordedStreambuf source(HRecordedDescriptor::Open(name, {}, error));
    if (error) return Fail(name.c_str(), error);
    std::istream in(&source);
    int lines = 0;
    for (std::string line; std::getline(in, line);) ++lines;

    HRecordedFile file = HRecordedFile::Open(name, "rb", error);
    if (error) return Fail(name.c_str(), error);
    file.Seek(-11, SEEK_END, error);
    char end[11] = {};
    const std::size_t size = file.Read(end, sizeof end, error);
    file.Close(error);
    if (error) return Fail(name.c_str(), error);

    std::printf("%d lines, the last is %.*s", lines, static_cast<int>(size), end);
    HDiskIOReportFile(stdout, name);
    std::remove(name.c_str());
    return 0;
}

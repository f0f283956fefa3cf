// The input of a fuzz target as a file in memory, for code that reads a file by its path.
#ifndef ZANBASE_TESTS_INPUT_FILE_H
#define ZANBASE_TESTS_INPUT_FILE_H

#include <cstdio>
#include <cstdlib>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

class InputFile {
public:
    InputFile(const unsigned char* data, std::size_t size)
        : mnDescriptor(memfd_create("input", MFD_CLOEXEC)) {
        if (write(mnDescriptor, data, size) != static_cast<ssize_t>(size)) std::abort();
    }
    ~InputFile() { close(mnDescriptor); }
    InputFile(const InputFile&) = delete;
    InputFile& operator=(const InputFile&) = delete;

    std::string Path() const { return "/proc/self/fd/" + std::to_string(mnDescriptor); }

private:
    int mnDescriptor;
};

#endif

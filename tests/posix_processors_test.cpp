// The count of cores where the kernel's files are the test's own: two processors to a core.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "platform/processors.h"

int described = 0;  // processors that have a file, with the odd numbers from 3 on

extern "C" std::FILE* __real_fopen(const char* path, const char* mode);
extern "C" std::FILE* __wrap_fopen(const char* path, const char* mode) {
    int number = 0;
    if (std::sscanf(path, "/sys/devices/system/cpu/cpu%d/topology", &number) != 1)
        return __real_fopen(path, mode);
    const int index = (number - 3) / 2;
    if (number < 3 || number % 2 == 0 || index >= described) return nullptr;
    static std::string list;  // outlives the stream
    list = std::to_string(number - index % 2 * 2) + ",9999";
    return fmemopen(list.data(), list.size(), "r");
}

TEST(PosixProcessors, AreCountedAtTheFirstOfTheirCore) {
    described = CountLogicalProcessors();
    EXPECT_EQ(CountProcessorCores(), (described + 1) / 2);
    --described;  // a processor that is described nowhere
    EXPECT_EQ(CountProcessorCores(), 0);
}

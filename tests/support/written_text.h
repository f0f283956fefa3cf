// What a report writes to a stream, as a text.
#ifndef ZANBASE_TESTS_WRITTEN_TEXT_H
#define ZANBASE_TESTS_WRITTEN_TEXT_H

#include <cstdio>
#include <string>

#include "support/environment.h"

// All that was written to `file`, which is closed.
inline std::string TakeText(std::FILE* file) {
    std::string text;
    std::rewind(file);
    for (int c = std::fgetc(file); c != EOF; c = std::fgetc(file)) text += static_cast<char>(c);
    std::fclose(file);
    return text;
}

template <class Report>
std::string WrittenBy(Report report) {
    std::FILE* const file = OpenTemporaryFile();
    report(file);
    return TakeText(file);
}

#endif

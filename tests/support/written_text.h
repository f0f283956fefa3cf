// What a report writes to a stream, as a text.
#ifndef ZANBASE_TESTS_WRITTEN_TEXT_H
#define ZANBASE_TESTS_WRITTEN_TEXT_H

#include <cstdio>
#include <cstdlib>
#include <string>

// Calls `report` with a stream that writes into memory and returns all it wrote.
template <class Report>
std::string WrittenBy(Report report) {
    char* text = nullptr;
    std::size_t size = 0;
    std::FILE* const stream = open_memstream(&text, &size);
    report(stream);
    std::fclose(stream);
    const std::string result(text, size);
    std::free(text);
    return result;
}

#endif

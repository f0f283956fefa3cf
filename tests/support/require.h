// What a stress program checks at each step.
#ifndef ZANBASE_TESTS_REQUIRE_H
#define ZANBASE_TESTS_REQUIRE_H

#include <cstdio>
#include <cstdlib>

// Aborts the process with the text of the broken promise unless it holds.
inline void Require(bool holds, const char* promise) {
    if (holds) return;
    std::fprintf(stderr, "broken: %s\n", promise);
    std::abort();
}

#endif

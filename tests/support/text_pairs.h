// Tables of texts, several pairs to a line.
#ifndef ZANBASE_TESTS_TEXT_PAIRS_H
#define ZANBASE_TESTS_TEXT_PAIRS_H

#include <gtest/gtest.h>

#include <string>

// Compares texts two by two: what came out, and what should have.
template <class... Texts>
void ExpectPairs(const Texts&... texts) {
    const std::string all[] = {texts...};
    for (std::size_t i = 0; i < sizeof...(texts); i += 2) EXPECT_EQ(all[i], all[i + 1]) << "pair " << i / 2;
}

#endif

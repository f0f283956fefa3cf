// What the scoped holders of all locks have in common.
#ifndef ZANBASE_TESTS_HOLDER_RULES_H
#define ZANBASE_TESTS_HOLDER_RULES_H

#include <gtest/gtest.h>

#include <type_traits>

template <class Holder, class = void>
constexpr bool kAllowsArrayNew = false;
template <class Holder>
constexpr bool kAllowsArrayNew<Holder, std::void_t<decltype(new Holder[1]{nullptr})>> = true;

// `held(lock)` is how often `lock` is acquired.
template <class Holder, class Lock, class Held>
void ExpectHolderRules(Lock& first, Lock& second, Held held) {
    static_assert(!kAllowsArrayNew<Holder>);
    {
        Holder empty(nullptr);
        empty.Release();
        Holder lock(&first);
        Holder copy(lock);
        EXPECT_EQ(held(first), 2);
        Holder& same = lock;
        lock = same;
        EXPECT_EQ(held(first), 2);
        lock.Release();
        lock.Release();
        EXPECT_EQ(held(first), 1);
        lock = copy;
        EXPECT_EQ(held(first), 2);
        copy.Reset(&second);
        EXPECT_EQ(held(first), 1);
        EXPECT_EQ(held(second), 1);
        copy = empty;
        EXPECT_EQ(held(second), 0);
    }
    EXPECT_EQ(held(first), 0);
}

#endif

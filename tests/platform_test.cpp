// The platform contracts by themselves, in the words of their headers: every back end runs this file.
#include <gtest/gtest.h>

#include <chrono>

#include "platform/clock.h"
#include "platform/console.h"
#include "platform/messages.h"
#include "platform/processors.h"

TEST(PlatformClock, GivesTheWallTimeInMilliseconds) {
    const WallClock before = ReadWallClock();
    const long long now = std::chrono::system_clock::now().time_since_epoch() / std::chrono::milliseconds(1);
    const WallClock after = ReadWallClock();
    EXPECT_LE(before.seconds * 1000 + before.milliseconds, now);
    EXPECT_GE(after.seconds * 1000 + after.milliseconds, now);
    EXPECT_LT(after.milliseconds, 1000);
}

TEST(PlatformClock, PausesForAtLeastTheTimeGiven) {
    const unsigned int start = ReadTicks();
    const auto before = std::chrono::steady_clock::now();
    for (const unsigned int ms : {0U, 1U, 29U}) PauseFor(ms);
    EXPECT_GE(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(30));
    EXPECT_GE(ReadTicks() - start, 30U);
}

TEST(PlatformProcessors, AreKnownAndAtLeastAsManyAsCores) {
    EXPECT_GE(CountLogicalProcessors(), 1);
    EXPECT_LE(CountProcessorCores(), CountLogicalProcessors());
}

TEST(Messages, AreTheirOwnTranslationWithoutACatalogue) {
    SetMessageLocale("no such locale");
    BindMessages("no_such_domain", nullptr);
    EXPECT_STREQ(Translate("text"), "text");
}

TEST(Console, IsLeftAloneWhereNoneIsOpen) {
    ShowConsoleWindow(false);
    EXPECT_FALSE(CloseConsole());
}

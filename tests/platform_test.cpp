// The platform contracts by themselves, in the words of their headers: every back end runs this file.
#include <gtest/gtest.h>

#include <chrono>

#include "platform/clock.h"
#include "platform/console.h"
#include "platform/messages.h"
#include "platform/processors.h"

namespace {

TEST(Clock, GivesTheWallTimeInMilliseconds) {
    const WallClock before = ReadWallClock();
    const long long now = std::chrono::system_clock::now().time_since_epoch() / std::chrono::milliseconds(1);
    const WallClock after = ReadWallClock();
    EXPECT_LT(before.milliseconds, 1000);
    EXPECT_LE(before.seconds * 1000 + before.milliseconds, now);
    EXPECT_GE(after.seconds * 1000 + after.milliseconds, now);
}

TEST(Clock, PausesForAtLeastTheTimeGiven) {
    for (const unsigned int ms : {0U, 1U, 2U, 30U}) {
        const unsigned int ticks_before = ReadTicks();
        const auto before = std::chrono::steady_clock::now();
        PauseFor(ms);
        const auto passed = (std::chrono::steady_clock::now() - before) / std::chrono::milliseconds(1);
        EXPECT_GE(passed, ms);
        EXPECT_GE(ReadTicks() - ticks_before, ms);
    }
}

TEST(Processors, AreKnownAndMakeUpCores) {
    EXPECT_GE(CountLogicalProcessors(), 1);
    EXPECT_GE(CountProcessorCores(), 1);
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

}  // namespace

// Translation from a real catalogue, one process for each configuration, and the texts of the test mode.
#include <gmock/gmock.h>

#define _(text) "a macro of the same name" text
#include "zanbase/message_catalogue.h"

#include <clocale>
#include <functional>
#include <map>
#include <thread>

#include "environment/message_catalogue.h"
#include "support/run_in_child.h"

namespace {

using testing::_;

TEST(MessageCatalogue, KeepsTheTextOfTheFirstLookUp) {
    const ChildResult child = RunInChild([] {
        (::_)("early");  // works before anything is set up
        setenv("LANGUAGE", "de", 1);
        setenv("LC_ALL", "de_DE.UTF-8", 1);
        if (std::setlocale(LC_ALL, "") == nullptr) setenv("LOCPATH", ZANBASE_TEST_LOCALE_FOLDER, 1);
        if (std::setlocale(LC_ALL, "") == nullptr) setenv("LC_ALL", "C.UTF-8", 1);  // has no decimal comma
        std::setlocale(LC_ALL, "C");
        InitLocale(nullptr);
        InitLocaleDir(ZANBASE_TEST_LOCALE_FOLDER);
        std::printf((::_)("Cannot open %s"), "x");
        SetIntlTest(true);
        std::printf("|%s|%s|%s", (::_)("early"), (::_)("marked"), (::_)(""));
        std::printf((::_)("|Cannot open %s"), "x");
        SetIntlTest(false);
        std::printf("|%s|%s|%s|%.1f", (::_)("marked"), (::_)("late"), (::_)("unknown"), 1.5);
        return 0;
    });
    EXPECT_EQ(child.out,
              "x läßt sich nicht öffnen|early|marked#marked|#|Cannot open x#|Cannot open %s"
              "|marked#marked|spät|unknown|1.5");
}

TEST(MessageCatalogue, GivesEveryThreadTheSamePointersForGood) {
    std::map<std::string, char*> texts[2];
    const auto ask_in_turn = [](std::map<std::string, char*>& asked, int message, int step) {
        for (; message >= 0 && message < 20000; message += step) {
            const std::string buffer = std::to_string(message);
            asked[buffer] = (::_)(buffer.c_str());
        }
    };
    std::thread backwards(ask_in_turn, std::ref(texts[1]), 19999, -1);
    ask_in_turn(texts[0], 0, 1);
    backwards.join();
    EXPECT_TRUE(texts[0] == texts[1]);
    for (const auto& [message, text] : texts[0]) ASSERT_EQ(text, message);
}

TEST(IntlTestText, MarksEachFormatCode) {
    for (const auto& [message, text] : std::map<const char*, const char*>{
             {"", "#"},
             {"%d items of %s", "%d items of %s#%%d items of %%s"},
             {"50% done%\t%\n%-5d%", "50% done%\t%\n%-5d%#50% done%\t%\n%%-5d%"},
             {"%%d%%%s%% x", "%%d%%%s%% x#%%%d%%%%s%% x"},
             {"%\xc3\xa4", "%\xc3\xa4#%%\xc3\xa4"},
         })
        EXPECT_EQ(IntlTestText(message), text);
}

}  // namespace

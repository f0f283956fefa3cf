// Translation from a real catalogue, one process for each configuration, and the texts of the test mode.
#include <gmock/gmock.h>

#define _(text) "a macro of the same name" text
#include "zanbase/message_catalogue.h"

#include <clocale>
#include <map>

#include "environment/message_catalogue.h"
#include "support/run_in_child.h"

namespace {

using testing::_;

TEST(MessageCatalogue, KeepsTheTextOfTheFirstLookUp) {
    const ChildResult child = RunInChild([] {
        setenv("LC_ALL", "C.UTF-8", 1);
        setenv("LANGUAGE", "de", 1);
        (::_)("early");  // works before anything is set up
        InitLocale(nullptr);
        InitLocaleDir(ZANBASE_TEST_LOCALE_FOLDER);
        std::printf((::_)("Cannot open %s"), "x");
        SetIntlTest(true);
        std::printf("|%s|%s|%s", (::_)("early"), (::_)("marked"), (::_)(""));
        std::printf((::_)("|Cannot open %s"), "x");
        SetIntlTest(false);
        std::printf("|%s|%s|%s", (::_)("marked"), (::_)("late"), (::_)("unknown"));
        return 0;
    });
    EXPECT_EQ(child.out,
              "x läßt sich nicht öffnen|early|marked#marked|#|Cannot open x#|Cannot open %s"
              "|marked#marked|spät|unknown");
}

TEST(MessageCatalogue, KeepsEveryPointerGood) {
    std::map<std::string, char*> texts;
    for (int i = 0; i < 100000; ++i) texts[std::to_string(i)] = (::_)(std::to_string(i).c_str());
    for (const auto& [message, text] : texts) {
        ASSERT_EQ((::_)(message.c_str()), text);  // another buffer, the same pointer
        ASSERT_EQ(text, message);
    }
}

TEST(MessageCatalogue, LeavesNumbersTheirPoint) {
    const ChildResult child = RunInChild([] {
        const char* const name = "de_DE.UTF-8";
        setenv("LC_ALL", name, 1);
        if (std::setlocale(LC_ALL, name) == nullptr) setenv("LOCPATH", ZANBASE_TEST_LOCALE_FOLDER, 1);
        if (std::setlocale(LC_ALL, name) == nullptr) return 77;
        std::printf("%.1f", 1.5);
        std::setlocale(LC_ALL, "C");
        InitLocale(nullptr);
        std::printf("|%.1f %s", 1.5, std::setlocale(LC_TIME, nullptr));
        return 0;
    });
    if (child.exit_code == 77) GTEST_SKIP() << "no locale with a decimal comma: install `locales`";
    EXPECT_EQ(child.out, "1,5|1.5 de_DE.UTF-8");
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

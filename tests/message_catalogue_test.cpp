// Translation from a real catalogue, and the texts of the test mode.
#include <gtest/gtest.h>

#define _(text) "a macro of the same name" text
#include "zanbase/message_catalogue.h"

#include <clocale>
#include <functional>
#include <thread>
#include <vector>

#include "environment/message_catalogue.h"
#include "support/environment.h"
#include "support/run_in_child.h"
#include "zanbase/name_ring.h"

namespace {

TEST(MessageCatalogue, KeepsTheTextOfTheFirstLookUp) {
    const ChildResult child = RunInChild([] {
        (::_)("early");  // works before anything is set up
        SetEnvironment("LANGUAGE", "de");
        SetEnvironment("LC_ALL", "de_DE.UTF-8");
        if (std::setlocale(LC_ALL, "") == nullptr) SetEnvironment("LOCPATH", ZANBASE_TEST_LOCALE_FOLDER);
        if (std::setlocale(LC_ALL, "") == nullptr)
            SetEnvironment("LC_ALL", "C.UTF-8");  // has no decimal comma
        std::setlocale(LC_ALL, "C");
        InitLocale(nullptr);
        InitLocaleDir(ZANBASE_TEST_LOCALE_FOLDER);
        std::printf((::_)("Cannot open %s"), "x");
        SetIntlTest(true);
        std::printf("|%s|%s|%s", (::_)("early"), (::_)("marked"), (::_)(""));
        SetIntlTest(false);
        std::printf("|%s|%s|%s|%.1f", (::_)("marked"), (::_)("late"), (::_)("unknown"), 1.5);
        std::setlocale(LC_NUMERIC, "");
        const std::string half = MkName(0.5, 2000);  // behind a comma no zeros are removed
        return half.size() == (half[1] == ',' ? 2002U : 3U) ? 0 : 1;
    });
    EXPECT_EQ(child.exit_code, 0);
    EXPECT_EQ(child.out, "x läßt sich nicht öffnen|early|marked#marked|#|marked#marked|spät|unknown|1.5");
}

TEST(MessageCatalogue, GivesBothThreadsTheSamePointersForGood) {
    const auto ask_all = [](std::vector<char*>& texts) {
        for (int message = 0; message < 100000; ++message)
            texts.push_back((::_)(std::to_string(message).c_str()));
    };
    std::vector<char*> texts, others;
    std::thread other(ask_all, std::ref(others));
    ask_all(texts);
    other.join();
    EXPECT_EQ(texts, others);
    for (std::size_t message = 0; message < texts.size(); ++message)
        ASSERT_EQ(texts[message], std::to_string(message));
}

TEST(IntlTestText, MarksEachFormatCode) {
    const std::pair<std::string, const char*> rows[] = {{"50% done%\t%\n%-5d%", "50% done%\t%\n%%-5d%"},
                                                        {"%%d%%%s%% x", "%%%d%%%%s%% x"},
                                                        {"%\xc3\xa4", "%%\xc3\xa4"}};
    for (const auto& [message, marked] : rows) EXPECT_EQ(IntlTestText(message), message + "#" + marked);
}

}  // namespace

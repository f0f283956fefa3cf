// Translation under real catalogues, one process for each configuration, and the texts of the test mode.
#include <gmock/gmock.h>

// Another `_` of each kind is about, as in a caller's file.
#define _(text) "macro " text
#include "zanbase/message_catalogue.h"

#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "environment/message_catalogue.h"
#include "support/run_in_child.h"

namespace {

using testing::_;

const char* const kFolder = ZANBASE_TEST_LOCALE_FOLDER;

void Choose(const char* locale, const char* language) {
    setenv("LC_ALL", locale, 1);
    setenv("LANGUAGE", language, 1);
    unsetenv("LOCPATH");
}

struct Configuration {
    const char* locale;
    const char* language;
    const char* folder;
    bool test_mode;
    const char* shown;
};

TEST(MessageCatalogue, ShowsEachMessageAsTheConfigurationHasIt) {
    for (const Configuration& configuration : {
             Configuration{"C.UTF-8", "de", kFolder, false, "x läßt sich nicht öffnen|other"},
             Configuration{"C.UTF-8", "fr:de", kFolder, false, "x läßt sich nicht öffnen|other"},
             Configuration{"C.UTF-8", "fr", kFolder, false, "Cannot open x|other"},
             Configuration{"C.UTF-8", "de", "/nowhere", false, "Cannot open x|other"},
             Configuration{"no_SUCH", "de", kFolder, false, "Cannot open x|other"},
             Configuration{"C.UTF-8", "de", kFolder, true, "Cannot open x#Cannot open %s|other#other"},
         }) {
        const ChildResult child = RunInChild([&] {
            Choose(configuration.locale, configuration.language);
            InitLocale(nullptr);
            InitLocaleDir(configuration.folder);
            SetIntlTest(configuration.test_mode);
            std::printf((::_)("Cannot open %s"), "x");
            std::printf("|%s", (::_)("other"));
            return 0;
        });
        EXPECT_EQ(child.out, configuration.shown) << configuration.language << " " << configuration.folder;
    }
}

TEST(MessageCatalogue, KeepsTheTextOfTheFirstLookUp) {
    const ChildResult child = RunInChild([] {
        Choose("C.UTF-8", "de");
        std::string shown = (::_)("Cannot open %s");  // works before anything is set up
        InitLocale("");
        InitLocaleDir(kFolder);
        SetIntlTest(true);
        shown = shown + "|" + (::_)("Cannot open %s") + "|" + (::_)("marked") + "|" + (::_)("");
        SetIntlTest(false);
        InitLocaleDir(nullptr);
        std::printf("%s|%s|%s", shown.c_str(), (::_)("marked"), (::_)("late"));
        return 0;
    });
    EXPECT_EQ(child.out, "Cannot open %s|Cannot open %s|marked#marked|#|marked#marked|spät");
}

TEST(MessageCatalogue, KnowsAMessageByItsText) {
    char first[] = "the same";
    char second[] = "the same";
    EXPECT_EQ((::_)(first), (::_)(second));
    first[0] = 'T';
    EXPECT_STREQ((::_)(second), "the same");
    EXPECT_NE((::_)(second), second);
}

TEST(MessageCatalogue, KeepsEveryPointerGoodThroughAHundredThousandMessages) {
    constexpr std::size_t kMessages = 100000;
    const auto message = [](std::size_t number) { return "message " + std::to_string(number); };
    std::vector<char*> texts;
    for (std::size_t i = 0; i < kMessages; ++i) texts.push_back((::_)(message(i).c_str()));
    int wrong = 0;
    for (std::size_t i = 0; i < kMessages; ++i) {
        if (texts[i] != message(i) || (::_)(message(i).c_str()) != texts[i]) ++wrong;
    }
    EXPECT_EQ(wrong, 0);
}

TEST(MessageCatalogue, GivesAllThreadsTheSamePointers) {
    constexpr std::size_t kThreads = 4;
    std::vector<std::vector<char*>> texts(kThreads);
    std::vector<std::thread> threads;
    for (std::vector<char*>& mine : texts) {
        threads.emplace_back([&mine] {
            for (int i = 0; i < 500; ++i) {
                SetIntlTest(i % 2 == 0);
                mine.push_back((::_)(("shared " + std::to_string(i)).c_str()));
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(std::set<std::vector<char*>>(texts.begin(), texts.end()).size(), 1U);
}

TEST(MessageCatalogue, LeavesNumbersTheirPoint) {
    constexpr int kNoSuchLocale = 77;
    const ChildResult child = RunInChild([] {
        const char* const name = "de_DE.UTF-8";
        Choose(name, "");
        if (std::setlocale(LC_NUMERIC, name) == nullptr) {  // not the system's own: the build made one
            setenv("LOCPATH", kFolder, 1);
            if (std::setlocale(LC_NUMERIC, name) == nullptr) return kNoSuchLocale;
        }
        std::printf("%.1f", 1.5);
        for (const char* const locale : {static_cast<const char*>(nullptr), name}) {
            InitLocale(locale);
            std::printf("|%.1f %s", 1.5, std::setlocale(LC_TIME, nullptr));
            std::setlocale(LC_ALL, "C");
        }
        return 0;
    });
    if (child.exit_code == kNoSuchLocale) GTEST_SKIP() << "no locale with a decimal comma: install `locales`";
    EXPECT_EQ(child.out, "1,5|1.5 de_DE.UTF-8|1.5 de_DE.UTF-8");
}

TEST(IntlTestText, MarksEachFormatCode) {
    for (const auto& [message, text] : std::vector<std::pair<const char*, const char*>>{
             {"", "#"},
             {"no codes", "no codes#no codes"},
             {"%d items of %s", "%d items of %s#%%d items of %%s"},
             {"100%", "100%#100%"},
             {"50% done", "50% done#50% done"},
             {"%\t%\n%-5d", "%\t%\n%-5d#%\t%\n%%-5d"},
             {"50%% done", "50%% done#50%% done"},
             {"%%d%%%s", "%%d%%%s#%%%d%%%%s"},
             {"%\xc3\xa4", "%\xc3\xa4#%%\xc3\xa4"},
         }) {
        EXPECT_EQ(IntlTestText(message), text);
    }
}

}  // namespace

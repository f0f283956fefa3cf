// The console on real pseudo-terminals, with and without a controlling terminal, and in a window. Streams and
// sessions are a process's own, so each test works in a child.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <pty.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <termios.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string>

#include "platform/console.h"
#include "support/run_in_child.h"
#include "zanbase/terminal.h"

namespace {

// Ends the child with the number of the line whose claim doesn't hold.
#define CLAIM(claim) \
    if (!(claim)) std::_Exit(__LINE__)

std::string TextUntilTheEnd(int descriptor) {
    std::string text;
    char bytes[256];
    for (ssize_t count = 0; (count = read(descriptor, bytes, sizeof(bytes))) > 0;)
        text.append(bytes, static_cast<std::size_t>(count));
    close(descriptor);
    return text;
}

// What stands on the terminal after `body` ran in a session on it, with `typed` waiting there and its
// standard streams redirected to the null device.
std::string ShownInTerminal(const std::string& typed, const std::function<void()>& body) {
    int screen = -1;
    const pid_t child = forkpty(&screen, nullptr, nullptr, nullptr);
    if (child == 0) {
        dup(STDIN_FILENO);  // keeps the terminal open: the screen is read until nothing uses it any more
        const int null_device = open("/dev/null", O_RDWR);
        for (int stream = 0; stream < 3; ++stream) dup2(null_device, stream);
        body();
        std::_Exit(0);  // nothing is flushed: only what was written unbuffered is there
    }
    EXPECT_EQ(write(screen, typed.data(), typed.size()), static_cast<ssize_t>(typed.size()));
    const std::string shown = TextUntilTheEnd(screen);
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0) << "line " << WEXITSTATUS(status) << ", up to a multiple of 256";
    return shown;
}

int LowestFreeDescriptor() {
    const int lowest = dup(0);
    close(lowest);
    return lowest;
}

// Runs `body` in a session without a terminal.
ChildResult RunDetached(const std::function<void()>& body) {
    return RunInChild([&] {
        setsid();
        unsetenv("DISPLAY");
        body();
        return 0;
    });
}

TEST(Console, IsTheTerminalOfTheSession) {
    const std::string shown = ShownInTerminal("typed\n", [] {
        const int free_descriptor = LowestFreeDescriptor();
        std::printf("earlier");
        CLAIM(std::getchar() == EOF);
        CLAIM(CreateConsole() == 1);
        CLAIM(!std::feof(stdin));
        char word[8];
        CLAIM(std::scanf("%7s", word) == 1);
        std::printf("[%s]", word);
        std::fprintf(stderr, "[error]");
        ShowConsole(0);
        CLAIM(DestroyConsole() == 1);
        CLAIM(std::printf("late") == 4 && std::getchar() == EOF && std::fputs("late", stderr) >= 0);
        CLAIM(std::ferror(stdout) == 0);
        CLAIM(DestroyConsole() == 0);
        CLAIM(CreateConsole() == 1);
        std::printf("none");
        CLAIM(LowestFreeDescriptor() == free_descriptor);
    });
    EXPECT_EQ(shown, "typed\r\n[typed][error]");
}

TEST(Console, LeavesStreamsThatMovedOnAlone) {
    const std::string shown = ShownInTerminal("", [] {
        CLAIM(CreateConsole() == 1);
        std::FILE* const file = std::tmpfile();
        dup2(fileno(file), STDOUT_FILENO);
        CLAIM(CreateConsole() == 1);
        std::printf("one ");
        CLAIM(DestroyConsole() == 1);
        std::printf("two");
        std::rewind(file);
        char text[8] = "";
        CLAIM(std::fgets(text, sizeof(text), file) != nullptr && std::string(text) == "one two");
    });
    EXPECT_EQ(shown, "");
}

TEST(Console, TakesTheStreamsItCanGet) {
    const std::string shown = ShownInTerminal("", [] {
        close(STDIN_FILENO);
        std::fclose(stdout);
        CLAIM(CreateConsole() == 1);
        std::printf("lost");
        std::fprintf(stderr, "error");
        CLAIM(isatty(STDIN_FILENO) && isatty(STDOUT_FILENO));
    });
    EXPECT_EQ(shown, "error");
    const std::string cut = ShownInTerminal("", [] {
        CLAIM(OpenConsole());
        const rlimit limit{2, 2};  // no descriptor 2 can be made any more
        setrlimit(RLIMIT_NOFILE, &limit);
        ConnectStandardStreams();
        std::printf("output");
        CLAIM(std::fputs("lost", stderr) >= 0);
    });
    EXPECT_EQ(cut, "output");
}

TEST(Console, IsNotToBeHadWithoutTerminalAndDisplay) {
    for (const char* const display : {"", ":no_such"}) {
        const ChildResult child = RunDetached([=] {
            const int free_descriptor = LowestFreeDescriptor();
            if (*display != '\0') setenv("DISPLAY", display, 1);
            setenv("PATH", ZANBASE_TEST_XTERM_FOLDER, 1);
            std::printf("untouched");
            CLAIM(CreateConsole() == 0 && CreateConsole() == 0);
            ShowConsole(1);
            CLAIM(DestroyConsole() == 0);
            CLAIM(LowestFreeDescriptor() == free_descriptor);
        });
        EXPECT_EQ(child.exit_code, 0);
        EXPECT_EQ(child.out, "untouched");
    }
}

TEST(Console, IsAWindowWhereThereIsADisplay) {
    const std::string window = testing::TempDir() + "zanbase_window_" + std::to_string(getpid());
    ASSERT_EQ(mkfifo(window.c_str(), 0600), 0);
    const int shown = open(window.c_str(), O_RDONLY | O_NONBLOCK);
    fcntl(shown, F_SETFL, 0);
    const ChildResult child = RunDetached([&] {
        CLAIM(CreateConsole() == 0);  // tried in vain, and later not
        const int free_descriptor = LowestFreeDescriptor();
        setenv("DISPLAY", ":any", 1);
        setenv("PATH", (std::string(ZANBASE_TEST_XTERM_FOLDER ":") + std::getenv("PATH")).c_str(), 1);
        setenv("WINDOW", window.c_str(), 1);
        std::printf("earlier");
        CLAIM(CreateConsole() == 1);
        std::printf("hello\n");
        const int null_device = open("/dev/null", O_RDWR);
        dup2(null_device, STDOUT_FILENO);
        close(null_device);
        ShowConsole(0);
        ShowConsole(7);
        CLAIM(waitpid(-1, nullptr, WNOHANG) == -1);  // it is no child of ours
        CLAIM(DestroyConsole() == 1);
        CLAIM(std::fputs("late", stderr) >= 0);
        ShowConsole(1);
        CLAIM(LowestFreeDescriptor() == free_descriptor);
    });
    EXPECT_EQ(child.exit_code, 0);
    EXPECT_EQ(child.out, "earlier");
    EXPECT_EQ(TextUntilTheEnd(shown), "hello\r\n\033[2t\033[1t");
    unlink(window.c_str());
}

// Starts an X server without a screen. Its display, or an empty text if there is none to be had.
std::string StartXServer(pid_t& server) {
    int display[2];
    if (pipe(display) != 0) return "";
    server = fork();
    if (server == 0) {
        close(display[0]);
        const int null_device = open("/dev/null", O_RDWR);
        for (int stream = 0; stream < 3; ++stream) dup2(null_device, stream);
        execlp("Xvfb", "Xvfb", "-displayfd", std::to_string(display[1]).c_str(), nullptr);
        _exit(127);
    }
    close(display[1]);
    std::string number = TextUntilTheEnd(display[0]);
    if (!number.empty() && number.back() == '\n') number.pop_back();
    return number.empty() ? "" : ":" + number;
}

TEST(Console, IsAnXtermThatAnswers) {
    if (std::system("command -v xterm >/dev/null") != 0) GTEST_SKIP() << "xterm is not installed";
    pid_t server = -1;
    const std::string display = StartXServer(server);
    if (display.empty()) GTEST_SKIP() << "Xvfb is not installed, or does not start";
    const ChildResult child = RunDetached([&] {
        setenv("DISPLAY", display.c_str(), 1);
        CLAIM(CreateConsole() == 1);
        termios modes{};
        CLAIM(tcgetattr(STDIN_FILENO, &modes) == 0 && (modes.c_lflag & ECHO) != 0);
        modes.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
        tcsetattr(STDIN_FILENO, TCSANOW, &modes);
        std::printf("one\nabc\033[6n");  // asks where the cursor stands
        char place[8] = "";
        CLAIM(std::scanf("\033[%7[0-9;]R", place) == 1 && std::string(place) == "2;4");
        CLAIM(DestroyConsole() == 1);
    });
    EXPECT_EQ(child.exit_code, 0);
    kill(server, SIGTERM);
    waitpid(server, nullptr, 0);
}

}  // namespace

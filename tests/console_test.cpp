// The console on the terminal of the session, in a window, and on streams in use. Streams and sessions belong to a
// process, so each test uses a child.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <pty.h>
#include <sys/resource.h>
#include <utmp.h>

#include <thread>

#include "support/run_in_child.h"
#include "zanbase/terminal.h"

namespace {

// Exits the child with the line number of a false claim; flushes nothing.
#define CLAIM(claim) \
    if (!(claim)) std::_Exit(__LINE__)

std::string TextUntilTheEnd(int descriptor) {
    std::string text;
    for (char byte = 0; read(descriptor, &byte, 1) == 1;) text += byte;
    close(descriptor);
    return text;
}

TEST(Console, IsTheTerminalOfTheSession) {
    int screen = -1, terminal = -1;
    ASSERT_EQ(openpty(&screen, &terminal, nullptr, nullptr, nullptr), 0);
    ASSERT_EQ(write(screen, "word\n", 5), 5);
    const ChildResult child = RunInChild([&] {
        login_tty(terminal);
        dup2(open("/dev/null", O_RDONLY), STDIN_FILENO);  // at its end at once
        std::fclose(stdout);
        std::FILE* const file = std::tmpfile();  // gets the descriptor that the output had
        CLAIM(std::getchar() == EOF);
        CLAIM(CreateConsole() == 1);
        char word[8] = "";
        CLAIM(std::scanf("%7s", word) == 1);
        std::fprintf(stderr, "[%s]", word);
        dup2(fileno(file), STDERR_FILENO);
        CLAIM(CreateConsole() == 1);
        CLAIM(DestroyConsole() == 1);
        std::fputs("text", stderr);
        CLAIM(lseek(fileno(file), 0, SEEK_CUR) == 4);
        CLAIM(DestroyConsole() == 0);
        CLAIM(CreateConsole() == 1);
        CLAIM(std::getchar() == EOF);
        return 0;
    });
    EXPECT_EQ(child.exit_code, 0);
    close(terminal);
    EXPECT_EQ(TextUntilTheEnd(screen), "word\r\n[word]");
}

// Standard input is being read, standard output is `pipe`, standard error has wide text and no reader.
int MakeConsoleOnBusyStreams(int terminal, int pipe) {
    login_tty(terminal);
    int silent[2], broken[2];
    CLAIM(::pipe(silent) == 0);
    CLAIM(::pipe(broken) == 0);
    close(broken[0]);
    dup2(silent[0], STDIN_FILENO);
    dup2(pipe, STDOUT_FILENO);
    dup2(broken[1], STDERR_FILENO);
    std::thread([] { std::getchar(); }).detach();
    while (ftrylockfile(stdin) == 0) funlockfile(stdin);  // until the thread has it
    std::fputs("pending", stdout);
    std::setvbuf(stderr, nullptr, _IOFBF, 100);
    CLAIM(std::fputws(L"lost", stderr) >= 0);
    CLAIM(CreateConsole() == 1);
    std::fputws(L"wide", stderr);
    std::fputs(" narrow", stdout);
    std::_Exit(0);  // flushes nothing
}

TEST(Console, WaitsForNoReaderAndNoFullPipe) {
    for (const std::size_t filled : {0U, 65536U}) {
        int screen = -1, terminal = -1, output[2];
        ASSERT_EQ(openpty(&screen, &terminal, nullptr, nullptr, nullptr), 0);
        ASSERT_EQ(pipe(output), 0);
        const std::string filling(filled, '.');
        ASSERT_EQ(write(output[1], filling.data(), filled), static_cast<ssize_t>(filled));
        const ChildResult child = RunInChild([&] { return MakeConsoleOnBusyStreams(terminal, output[1]); });
        EXPECT_EQ(child.exit_code, 0);
        close(terminal);
        close(output[1]);
        EXPECT_EQ(TextUntilTheEnd(screen), "wide narrow");
        EXPECT_EQ(TextUntilTheEnd(output[0]), filled == 0 ? "pending" : filling);
    }
}

// Pending output needs two descriptors; here the console leaves none, one, or only that of the output.
TEST(Console, WritesPendingOutputThoughDescriptorsAreShort) {
    for (const int spare : {0, 1, -1}) {
        int screen = -1, terminal = -1, output[2];
        ASSERT_EQ(openpty(&screen, &terminal, nullptr, nullptr, nullptr), 0);
        ASSERT_EQ(pipe(output), 0);
        const ChildResult child = RunInChild([&] {
            login_tty(terminal);
            dup2(output[1], STDOUT_FILENO);
            close_range(STDERR_FILENO + 1, ~0U, 0);
            std::printf("pending");
            if (spare < 0) close(STDOUT_FILENO);
            const rlim_t most = STDERR_FILENO + 2 + static_cast<rlim_t>(spare < 0 ? 9 : spare);
            const rlimit limit{most, most};
            setrlimit(RLIMIT_NOFILE, &limit);
            CLAIM(CreateConsole() == 1);
            std::printf("text");
            std::_Exit(0);  // flushes nothing
            return 0;
        });
        EXPECT_EQ(child.exit_code, 0);
        close(terminal);
        close(output[1]);
        EXPECT_EQ(TextUntilTheEnd(screen), "text");
        EXPECT_EQ(TextUntilTheEnd(output[0]), spare < 0 ? "" : "pending");
    }
}

TEST(Console, IsAWindowWhereThereIsNoTerminal) {
    std::FILE* const server =
        popen("command -v xterm >/dev/null && exec timeout 60 Xvfb -terminate -displayfd 1 2>/dev/null", "r");
    char display[8] = ":";
    if (std::fscanf(server, "%6s", &display[1]) != 1) GTEST_SKIP() << "needs xterm, and Xvfb to start";
    const char* const log = "console_window.log";  // as the resources have it
    std::remove(log);
    const ChildResult child = RunInChild([&] {
        setsid();
        unsetenv("DISPLAY");
        CLAIM(CreateConsole() == 0);
        CLAIM(DestroyConsole() == 0);
        setenv("DISPLAY", ":nowhere", 1);
        CLAIM(CreateConsole() == 0);
        setenv("DISPLAY", display, 1);
        setenv("XENVIRONMENT", ZANBASE_TEST_XTERM_RESOURCES, 1);
        std::ungetc('x', stdin);
        std::printf("earlier");
        CLAIM(CreateConsole() == 1);
        CLAIM(waitpid(-1, nullptr, WNOHANG | __WALL) == -1);
        std::printf("text\n");
        ShowConsole(0);
        ShowConsole(7);
        CLAIM(DestroyConsole() == 1);
        CLAIM(std::printf("late") == 4);
        CLAIM(std::getchar() == EOF);
        ShowConsole(1);
        return 0;
    });
    EXPECT_EQ(child.exit_code, 0);
    EXPECT_EQ(child.out, "earlier");
    pclose(server);  // waits for Xvfb, which exits after its last client, xterm
    EXPECT_EQ(TextUntilTheEnd(open(log, O_RDONLY)), "text\r\n\033[2t\033[1t");
    std::remove(log);
}

}  // namespace

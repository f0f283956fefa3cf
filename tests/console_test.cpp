// The console on real terminals: that of the session, a window, and none. Streams and sessions belong to a
// process, so each test works in a child.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <pty.h>

#include "support/run_in_child.h"
#include "zanbase/terminal.h"

namespace {

// Ends the child, with the number of a line whose claim doesn't hold; nothing is flushed.
#define CLAIM(claim) \
    if (!(claim)) std::_Exit(__LINE__)

std::string TextUntilTheEnd(int descriptor) {
    std::string text;
    for (char byte = 0; read(descriptor, &byte, 1) == 1;) text += byte;
    close(descriptor);
    return text;
}

TEST(Console, IsTheTerminalOfTheSession) {
    int screen = -1;
    const pid_t child = forkpty(&screen, nullptr, nullptr, nullptr);
    if (child == 0) {
        dup(STDIN_FILENO);  // the screen is there until nothing uses the terminal any more
        for (int stream = 0; stream < 3; ++stream) close(stream);
        open("/dev/null", O_RDONLY);  // becomes the standard input, which is at its end at once
        std::fclose(stdout);          // can't be connected
        CLAIM(std::getchar() == EOF);
        CLAIM(CreateConsole() == 1);
        char word[8] = "";
        CLAIM(std::scanf("%7s", word) == 1);
        std::fprintf(stderr, "[%s]", word);
        std::printf("lost");
        ShowConsole(0);
        std::FILE* const file = std::tmpfile();
        dup2(fileno(file), STDERR_FILENO);
        CLAIM(CreateConsole() == 1 && DestroyConsole() == 1);
        CLAIM(std::fputs("text", stderr) >= 0 && lseek(fileno(file), 0, SEEK_CUR) == 4);
        CLAIM(DestroyConsole() == 0 && CreateConsole() == 1 && std::getchar() == EOF);
        std::_Exit(0);
    }
    EXPECT_EQ(write(screen, "word\n", 5), 5);
    EXPECT_EQ(TextUntilTheEnd(screen), "word\r\n[word]");
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
}

TEST(Console, IsNotToBeHadWithoutTerminalAndDisplay) {
    const ChildResult child = RunInChild([] {
        setsid();
        unsetenv("DISPLAY");
        ShowConsole(1);
        return CreateConsole() + DestroyConsole() + std::printf("here");
    });
    EXPECT_EQ(child.exit_code, 4);
    EXPECT_EQ(child.out, "here");
}

TEST(Console, IsAWindowOnADisplay) {
    if (std::system("command -v xterm >/dev/null") != 0) GTEST_SKIP() << "xterm is not installed";
    std::FILE* const server = popen("exec timeout 60 Xvfb -terminate -displayfd 1 2>/dev/null", "r");
    int display = 0;
    if (std::fscanf(server, "%d", &display) != 1) GTEST_SKIP() << "Xvfb is not installed, or does not start";
    const char* const log = "console_window.log";  // as the resources have it
    std::remove(log);
    const ChildResult child = RunInChild([&] {
        setsid();
        setenv("DISPLAY", ":nowhere", 1);
        CLAIM(CreateConsole() == 0);
        setenv("DISPLAY", (":" + std::to_string(display)).c_str(), 1);
        setenv("XENVIRONMENT", ZANBASE_TEST_XTERM_RESOURCES, 1);
        const int last_descriptor = dup(STDERR_FILENO);
        std::printf("earlier");
        CLAIM(CreateConsole() == 1);
        CLAIM(waitpid(-1, nullptr, WNOHANG) == -1);  // it is no child of ours
        std::printf("text\n");
        ShowConsole(0);
        ShowConsole(7);
        CLAIM(DestroyConsole() == 1 && std::printf("late") == 4);
        ShowConsole(1);
        CLAIM(dup(STDERR_FILENO) == last_descriptor + 1 && dup(STDERR_FILENO) == last_descriptor + 2);
        return 0;
    });
    EXPECT_EQ(child.exit_code, 0);
    EXPECT_EQ(child.out, "earlier");
    pclose(server);  // it ends with its last client, the xterm
    EXPECT_EQ(TextUntilTheEnd(open(log, O_RDONLY)), "text\r\n\033[2t\033[1t");
    std::remove(log);
}

}  // namespace

// Asks the user, wherever the standard streams go: try it with all three redirected, or without a terminal on
// a desktop, where it opens a window.
#include <zanbase/terminal.h>

#include <cstdio>
#include <cstring>

int main() {
    std::printf("asking the user\n");  // to where the standard output was sent
    if (CreateConsole() == 0) {
        std::fprintf(stderr, "there is no console to ask on\n");
        return 1;
    }
    std::printf("How many copies? ");
    char answer[32] = "";
    if (std::fgets(answer, sizeof(answer), stdin) != nullptr) answer[std::strcspn(answer, "\n")] = '\0';
    std::printf("Making %s copies. Press return to go on without a console.\n", answer);
    while (std::getchar() != '\n' && std::feof(stdin) == 0) {
    }
    DestroyConsole();
    std::printf("this is dropped\n");
    return 0;
}

// A program for the UCRT: files, blocks and environment variables pass between it and the library.
#include <zanbase/zanbase.h>

#include <io.h>
#include <windows.h>

#include <cstdlib>
#include <stdexcept>

namespace {
struct Thrower : HThread {
    void Run() override { throw std::runtime_error("thrown by the program"); }
};
}  // namespace

int main() {
    std::FILE* const earlier_output = _fdopen(_dup(1), "w");
    void* const block = HRealloc(std::malloc(1), 512);
    HMemory::Alloc(block, 512, "program.cpp", 1);
    HMemory::LeakReport(stdout);
    std::free(block);
    _putenv_s("OMP_NUM_THREADS", "3");
    std::printf("threads %d\n", OMPGetMaxThreads());
    Thrower thrower;
    thrower.Start(true);
    thrower.Wait();
    FreeConsole();
    const int created = CreateConsole();
    const bool is_moved = std::printf("on the console") > 0 && _isatty(_fileno(stdout)) != 0;
    std::fprintf(earlier_output, "console %d %d\n", created, is_moved);
}

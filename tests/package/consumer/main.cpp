// A program that takes the library as a stranger would: one header, and a call
// into every corner that could miss a dependency at compile, link or load time.
#include <zanbase/zanbase.h>

#include <cstdio>
#include <cstring>

extern bool worked_at_load;  // early.cpp

static_assert(ZANBASE_VERSION >= 100, "version macros");

namespace {

class Worker : public HThread {
public:
    HSemaphore done{0};

private:
    void Run() override { done.Unlock(); }
};

int failures = 0;

void Check(bool holds, const char* what) {
    if (holds) return;
    std::fprintf(stderr, "consumer: %s\n", what);
    ++failures;
}

}  // namespace

int main() {
    HMutex mutex;
    const HMutexLock lock = &mutex;
    HWritePrefMutex table;
    const HReaderLock reader = &table;
    Worker worker;
    worker.Start(true);
    worker.done.Lock();
    worker.Wait();

    HDiskIOOpen("a file", &mutex, 0.5);
    unsigned int opens = 1;
    unsigned long long bytes = 0;
    HDiskIORead(&mutex, 100, 0.25);
    HDiskIOAccessFileData("a file", nullptr, &opens, &bytes, nullptr, nullptr, nullptr);
    int numbers[] = {3, 1, 2};
    ZAN_qsort(numbers, 3, sizeof *numbers, [](const void* one, const void* other) {
        return *static_cast<const int*>(one) - *static_cast<const int*>(other);
    });
    const HTimer timer;

    Check(worked_at_load, "a static initialiser of another library");
    Check(lock.GetMutex() == &mutex, "mutex");
    Check(!worker.IsRunning(), "thread");
    Check(opens == 1 && bytes == 100, "ledger");
    Check(numbers[0] == 1, "sort");
    Check(timer.GetTimeInSeconds() < 3600, "clock");
    Check(std::strcmp(MkName("%d", 7), "7") == 0, "name ring");
    Check(std::strcmp(MkNameC("%s", "c"), "c") == 0, "plain name");
    Check(std::strcmp(_("untranslated"), "untranslated") == 0, "catalogue");
    Check(OMPGetMaxThreads() >= 1 && GetLogicalProcessorCount() >= 1, "processors");
    Check(IMPTerminal("VT100") == 2, "terminal");
    return failures;
}

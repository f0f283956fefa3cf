// A program of another project: one header, and a call of each family that could miss a dependency at compile,
// link or load time.
#include <zanbase/zanbase.h>

#include <cstring>
#include <string>

// Static initialisers may call the library: the objects that these calls need are already built.
static const bool worked_at_load = [] {
    static int block;
    HMemory::Alloc(&block, sizeof block, __FILE__, __LINE__);
    HMemory::Free(&block);
    return std::strcmp(MkName(42), "42") == 0 && std::strcmp(_("early"), "early") == 0;
}();

// The package, the headers and the library state one version.
static bool VersionsAgree() {
    const std::string header =
        MkString("%d.%d.%d", ZANBASE_VERSION_MAJOR, ZANBASE_VERSION_MINOR, ZANBASE_VERSION_PATCH);
    return header == PACKAGE_VERSION && IMPGetVersion() == ZANBASE_VERSION;
}

class Worker : public HThread {
public:
    HSemaphore moDone{0};

private:
    void Run() override { moDone.Unlock(); }
};

int main() {
    HMutex mutex;
    const HMutexLock lock = &mutex;
    HWritePrefMutex table;
    const HReaderLock reader = &table;
    Worker worker;
    worker.Start(true);
    worker.moDone.Lock();
    worker.Wait();
    HDiskIOOpen("a file", &mutex, 0.5);
    HDiskIORead(&mutex, 100, 0.25);
    unsigned long long bytes = 0;
    HDiskIOAccessFileData("a file", nullptr, nullptr, &bytes, nullptr, nullptr, nullptr);
    char letters[] = "cab";
    ZAN_qsort(letters, 3, 1, [](const void* one, const void* other) { return std::memcmp(one, other, 1); });
    const bool holds = worked_at_load && VersionsAgree() && !worker.IsRunning() && bytes == 100 &&
                       std::strcmp(letters, "abc") == 0 && HTimer().GetTimeInSeconds() < 3600 &&
                       std::strcmp(MkName("%d", 7), "7") == 0 && std::strcmp(MkNameC("%s", "c"), "c") == 0 &&
                       std::strcmp(_("untranslated"), "untranslated") == 0 && OMPGetMaxThreads() >= 1 &&
                       GetLogicalProcessorCount() >= 1 && IMPTerminal("VT100") == 2;
    return holds ? 0 : 1;
}

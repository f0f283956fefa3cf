// A program that takes the library as a stranger would: one header, and a call into every corner that could miss
// a dependency at compile, link or load time.
#include <zanbase/zanbase.h>

static_assert(ZANBASE_VERSION >= 100, "version macros");

int main() {
    HMutex mutex;
    const HMutexLock lock = &mutex;
    return lock.GetMutex() == &mutex ? 0 : 1;
}

// The look-up behind the recorder.
#include "next_function.h"

#include <initializer_list>

#include <dlfcn.h>

#include "thread_state.h"

namespace recorder {
namespace {

__thread bool gLookingUp __attribute__((tls_model("initial-exec"))) = false;

}  // namespace

bool IsLookingUp() { return gLookingUp; }

void* FindNext(const char* name) {
    const InsideScope scope;
    gLookingUp = true;
    void* found = dlsym(RTLD_NEXT, name);
    // A C program may load a C++ library as a private one, whose runtime is no part of the global scope then.
    for (const char* runtime : {"libstdc++.so.6", "libc++.so.1"}) {
        if (found != nullptr) break;
        void* const library = dlopen(runtime, RTLD_LAZY | RTLD_NOLOAD);
        if (library == nullptr) continue;
        found = dlsym(library, name);
        dlclose(library);
    }
    gLookingUp = false;
    return found;
}

}  // namespace recorder

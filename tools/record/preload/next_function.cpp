// The look-up behind the recorder.
#include "next_function.h"

#include <initializer_list>

#include <dlfcn.h>

#include "thread_state.h"

// Set by the linker: the functions that ZANBASE_NEXT has declared.
extern "C" {
extern recorder::NextSymbol* const __start_zanbase_hooks[] __attribute__((visibility("hidden")));
extern recorder::NextSymbol* const __stop_zanbase_hooks[] __attribute__((visibility("hidden")));
}

namespace recorder {
namespace {

__thread bool gLookingUp __attribute__((tls_model("initial-exec"))) = false;

__attribute__((constructor)) void LookAllUp() {
    for (NextSymbol* const* symbol = __start_zanbase_hooks; symbol != __stop_zanbase_hooks; ++symbol)
        if ((*symbol)->Known() == nullptr) (*symbol)->Find();
}

}  // namespace

bool IsLookingUp() { return gLookingUp; }

void* NextSymbol::Find() {
    const RecursionGuard guard;
    gLookingUp = true;
    void* found = dlsym(RTLD_NEXT, mpcName);
    // A C program may load a C++ library as a private one, whose runtime is not part of the global scope then.
    const bool is_operator = mpcName[0] == '_' && mpcName[1] == 'Z';
    for (const char* runtime : {"libstdc++.so.6", "libc++.so.1"}) {
        if (found != nullptr || !is_operator) break;
        void* const library = dlopen(runtime, RTLD_LAZY | RTLD_NOLOAD);
        if (library == nullptr) continue;
        found = dlsym(library, mpcName);
        dlclose(library);
    }
    gLookingUp = false;
    mpoFunction.store(found, std::memory_order_relaxed);
    return found;
}

}  // namespace recorder

// The functions behind the hooks: those that the program would have reached without the recorder, be they the
// C library's or those of an allocator that is preloaded too.
#ifndef ZANBASE_RECORD_NEXT_FUNCTION_H
#define ZANBASE_RECORD_NEXT_FUNCTION_H

#include <atomic>

namespace recorder {

// One function, looked up at its first call. Constant-initialised, so it can be used before any constructor
// ran.
class NextSymbol {
public:
    constexpr explicit NextSymbol(const char* name) : mpcName(name) {}

    // Looks the name up behind this library, also among libraries that were loaded for one other library
    // only. Null if there is none. What the loader allocates meanwhile does not reach a hook that needs the
    // same look-up.
    void* Find();
    // The function if it has been looked up.
    void* Known() const { return mpoFunction.load(std::memory_order_relaxed); }

private:
    const char* const mpcName;
    std::atomic<void*> mpoFunction{nullptr};
};

// True while this thread looks a function up.
bool IsLookingUp();

template <class Function>
class NextFunction : public NextSymbol {
public:
    using NextSymbol::NextSymbol;

    // Null if there is no such function.
    Function* Get() {
        void* const known = Known();
        return reinterpret_cast<Function*>(known != nullptr ? known : Find());
    }
    template <class... Arguments>
    auto operator()(Arguments... arguments) {
        return Get()(arguments...);
    }
};

}  // namespace recorder

// Declares the function behind the hook `name` as recorder::next::name. All that are declared so are looked
// up before the program runs: a look-up takes a lock of the loader, which must not happen in a signal handler
// of the program.
#define ZANBASE_NEXT(name, ...)                                                                  \
    namespace recorder::next {                                                                   \
    static NextFunction<__VA_ARGS__> name{#name};                                                \
    [[gnu::used, gnu::section("zanbase_hooks")]] static NextSymbol* const symbol_##name = &name; \
    }

// Begins the definition of a hook, whose body follows. The linker's list of what the library exports is made
// from the uses of this macro.
#define ZANBASE_HOOK(result, name, parameters, exceptions) \
    ZANBASE_NEXT(name, decltype(::name))                   \
    extern "C" result name parameters exceptions

#endif

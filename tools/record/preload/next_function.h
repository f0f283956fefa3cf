// The functions behind the hooks: those that the program would have reached without the recorder, be they the
// C library's or those of an allocator that is preloaded too.
#ifndef ZANBASE_RECORD_NEXT_FUNCTION_H
#define ZANBASE_RECORD_NEXT_FUNCTION_H

#include <atomic>

namespace recorder {

// Looks `name` up behind this library, also among libraries that were loaded for one other library only. Null
// if there is none. What the loader allocates meanwhile does not reach a hook that needs the same look-up.
void* FindNext(const char* name);

// True while this thread is in FindNext.
bool IsLookingUp();

// One function, looked up at its first call. Constant-initialised, so it can be used before any constructor
// ran.
template <class Function>
class NextFunction {
public:
    constexpr explicit NextFunction(const char* name) : mpcName(name) {}

    // Null if there is no such function.
    Function* Get() {
        Function* function = mpoFunction.load(std::memory_order_relaxed);
        if (function == nullptr) {
            function = reinterpret_cast<Function*>(FindNext(mpcName));
            mpoFunction.store(function, std::memory_order_relaxed);
        }
        return function;
    }

    // The function if it has been looked up.
    Function* Known() const { return mpoFunction.load(std::memory_order_relaxed); }

    template <class... Arguments>
    auto operator()(Arguments... arguments) {
        return Get()(arguments...);
    }

private:
    const char* const mpcName;
    std::atomic<Function*> mpoFunction{nullptr};
};

}  // namespace recorder

#endif

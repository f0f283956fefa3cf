// The hooks of operator new and delete. Most runtimes take memory from malloc, whose hook then does the
// recording: the caller that asked is left for it in the thread's state. An allocator that serves operator
// new by itself never gets there, and the block is recorded after it was taken. No hook needs a cleanup when
// the program's operator throws.
#include <cstddef>
#include <new>

#include "next_function.h"
#include "recording.h"

namespace recorder {
namespace {

template <class Function, class... Arguments>
[[gnu::always_inline]] inline void* New(NextFunction<Function>& next, std::size_t size,
                                        Arguments... arguments) {
    // The runtime's form for arrays jumps to the plain one, whose caller is this library then.
    if (gThread.has_request || !Wants(kMemory)) return next(size, arguments...);
    const Frame caller = CallerOfHook();
    gThread.request = caller;
    gThread.has_request = true;
    void* const block = next(size, arguments...);
    if (gThread.has_request && block != nullptr) RecordBlock(block, size, caller);
    gThread.has_request = false;
    return block;
}

template <class Function, class... Arguments>
[[gnu::always_inline]] inline void Delete(NextFunction<Function>& next, void* block, Arguments... arguments) {
    if (block == nullptr || !Wants(kMemory)) {
        next(block, arguments...);
        return;
    }
    ForgetBlock(block);
    const RecursionGuard guard;
    next(block, arguments...);
}

using Size = std::size_t;
using Align = std::align_val_t;
using Nothrow = const std::nothrow_t&;

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the operators have no namespace

// An operator, with its name for the linker. The first time that it is needed may be when a C++ library is
// loaded, so they are looked up then.
// NOLINTBEGIN(bugprone-macro-parentheses): these are definitions
#define ZANBASE_NEW(form, symbol, parameters, exceptions, ...) \
    namespace recorder::next {                                 \
    static NextFunction<void * parameters> symbol{#symbol};    \
    }                                                          \
    void* operator form parameters exceptions { return New(next::symbol, __VA_ARGS__); }
#define ZANBASE_DELETE(form, symbol, parameters, ...)     \
    namespace recorder::next {                            \
    static NextFunction<void parameters> symbol{#symbol}; \
    }                                                     \
    void operator form parameters noexcept { Delete(next::symbol, __VA_ARGS__); }
// NOLINTEND(bugprone-macro-parentheses)

ZANBASE_NEW(new, _Znwm, (Size size), , size)
ZANBASE_NEW(new, _ZnwmRKSt9nothrow_t, (Size size, Nothrow tag), noexcept, size, tag)
ZANBASE_NEW(new, _ZnwmSt11align_val_t, (Size size, Align align), , size, align)
ZANBASE_NEW(new, _ZnwmSt11align_val_tRKSt9nothrow_t, (Size size, Align align, Nothrow tag), noexcept, size,
            align, tag)
ZANBASE_NEW(new[], _Znam, (Size size), , size)
ZANBASE_NEW(new[], _ZnamRKSt9nothrow_t, (Size size, Nothrow tag), noexcept, size, tag)
ZANBASE_NEW(new[], _ZnamSt11align_val_t, (Size size, Align align), , size, align)
ZANBASE_NEW(new[], _ZnamSt11align_val_tRKSt9nothrow_t, (Size size, Align align, Nothrow tag), noexcept, size,
            align, tag)
ZANBASE_DELETE(delete, _ZdlPv, (void* block), block)
ZANBASE_DELETE(delete, _ZdlPvm, (void* block, Size size), block, size)
ZANBASE_DELETE(delete, _ZdlPvRKSt9nothrow_t, (void* block, Nothrow tag), block, tag)
ZANBASE_DELETE(delete, _ZdlPvSt11align_val_t, (void* block, Align align), block, align)
ZANBASE_DELETE(delete, _ZdlPvmSt11align_val_t, (void* block, Size size, Align align), block, size, align)
ZANBASE_DELETE(delete, _ZdlPvSt11align_val_tRKSt9nothrow_t, (void* block, Align align, Nothrow tag), block,
               align, tag)
ZANBASE_DELETE(delete[], _ZdaPv, (void* block), block)
ZANBASE_DELETE(delete[], _ZdaPvm, (void* block, Size size), block, size)
ZANBASE_DELETE(delete[], _ZdaPvRKSt9nothrow_t, (void* block, Nothrow tag), block, tag)
ZANBASE_DELETE(delete[], _ZdaPvSt11align_val_t, (void* block, Align align), block, align)
ZANBASE_DELETE(delete[], _ZdaPvmSt11align_val_t, (void* block, Size size, Align align), block, size, align)
ZANBASE_DELETE(delete[], _ZdaPvSt11align_val_tRKSt9nothrow_t, (void* block, Align align, Nothrow tag), block,
               align, tag)

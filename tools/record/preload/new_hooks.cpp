// The hooks of operator new and delete. Most runtimes take memory from malloc, whose hook then does the
// recording: the caller that asked is left for it in the thread's state. An allocator that serves operator
// new by itself never gets there, and the block is recorded after it was taken. No hook needs a cleanup when
// the program's operator throws.
#include <cstddef>
#include <cstdlib>
#include <new>

#include "next_function.h"
#include "recording.h"

namespace recorder {
namespace {

// The recorder's own memory. Without it no report is possible; what the recorder does ends where this throws.
void* TakeForRecorder(std::size_t size) {
    void* const block = std::malloc(size != 0 ? size : 1);
    if (block == nullptr) throw std::bad_alloc();
    return block;
}

template <class Function, class... Arguments>
[[gnu::always_inline]] inline void* New(NextFunction<Function>& next, std::size_t size,
                                        Arguments... arguments) {
    // The runtime's form for arrays jumps to the plain one, whose caller is this library then.
    if (gThread.has_request && !gThread.inside) return next(size, arguments...);
    const Frame caller = CallerOfHook();
    if (IsOwnCode(caller.pc) || next.Get() == nullptr) return TakeForRecorder(size);
    if (!Wants(kMemory)) return next(size, arguments...);
    gThread.request = caller;
    gThread.has_request = true;
    void* const block = next(size, arguments...);
    if (gThread.has_request && block != nullptr) RecordBlock(block, size, caller);
    gThread.has_request = false;
    return block;
}

template <class Function, class... Arguments>
[[gnu::always_inline]] inline void Delete(NextFunction<Function>& next, void* block, Arguments... arguments) {
    if (IsOwnCode(CallerOfHook().pc) || next.Get() == nullptr) {
        std::free(block);
        return;
    }
    if (block == nullptr || !Wants(kMemory)) {
        next(block, arguments...);
        return;
    }
    const InsideScope scope;
    DropBlock(block);
    next(block, arguments...);
}

using Size = std::size_t;
using Align = std::align_val_t;
using Nothrow = const std::nothrow_t&;

NextFunction<void*(Size)> gNew{"_Znwm"};
NextFunction<void*(Size)> gNewArray{"_Znam"};
NextFunction<void*(Size, Nothrow)> gNewNothrow{"_ZnwmRKSt9nothrow_t"};
NextFunction<void*(Size, Nothrow)> gNewArrayNothrow{"_ZnamRKSt9nothrow_t"};
NextFunction<void*(Size, Align)> gNewAligned{"_ZnwmSt11align_val_t"};
NextFunction<void*(Size, Align)> gNewArrayAligned{"_ZnamSt11align_val_t"};
NextFunction<void*(Size, Align, Nothrow)> gNewAlignedNothrow{"_ZnwmSt11align_val_tRKSt9nothrow_t"};
NextFunction<void*(Size, Align, Nothrow)> gNewArrayAlignedNothrow{"_ZnamSt11align_val_tRKSt9nothrow_t"};

NextFunction<void(void*)> gDelete{"_ZdlPv"};
NextFunction<void(void*)> gDeleteArray{"_ZdaPv"};
NextFunction<void(void*, Size)> gDeleteSized{"_ZdlPvm"};
NextFunction<void(void*, Size)> gDeleteArraySized{"_ZdaPvm"};
NextFunction<void(void*, Nothrow)> gDeleteNothrow{"_ZdlPvRKSt9nothrow_t"};
NextFunction<void(void*, Nothrow)> gDeleteArrayNothrow{"_ZdaPvRKSt9nothrow_t"};
NextFunction<void(void*, Align)> gDeleteAligned{"_ZdlPvSt11align_val_t"};
NextFunction<void(void*, Align)> gDeleteArrayAligned{"_ZdaPvSt11align_val_t"};
NextFunction<void(void*, Size, Align)> gDeleteSizedAligned{"_ZdlPvmSt11align_val_t"};
NextFunction<void(void*, Size, Align)> gDeleteArraySizedAligned{"_ZdaPvmSt11align_val_t"};
NextFunction<void(void*, Align, Nothrow)> gDeleteAlignedNothrow{"_ZdlPvSt11align_val_tRKSt9nothrow_t"};
NextFunction<void(void*, Align, Nothrow)> gDeleteArrayAlignedNothrow{"_ZdaPvSt11align_val_tRKSt9nothrow_t"};

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the operators have no namespace

void* operator new(Size size) { return New(gNew, size); }
void* operator new[](Size size) { return New(gNewArray, size); }
void* operator new(Size size, Nothrow tag) noexcept { return New(gNewNothrow, size, tag); }
void* operator new[](Size size, Nothrow tag) noexcept { return New(gNewArrayNothrow, size, tag); }
void* operator new(Size size, Align alignment) { return New(gNewAligned, size, alignment); }
void* operator new[](Size size, Align alignment) { return New(gNewArrayAligned, size, alignment); }
void* operator new(Size size, Align alignment, Nothrow tag) noexcept {
    return New(gNewAlignedNothrow, size, alignment, tag);
}
void* operator new[](Size size, Align alignment, Nothrow tag) noexcept {
    return New(gNewArrayAlignedNothrow, size, alignment, tag);
}

void operator delete(void* block) noexcept { Delete(gDelete, block); }
void operator delete[](void* block) noexcept { Delete(gDeleteArray, block); }
void operator delete(void* block, Size size) noexcept { Delete(gDeleteSized, block, size); }
void operator delete[](void* block, Size size) noexcept { Delete(gDeleteArraySized, block, size); }
void operator delete(void* block, Nothrow tag) noexcept { Delete(gDeleteNothrow, block, tag); }
void operator delete[](void* block, Nothrow tag) noexcept { Delete(gDeleteArrayNothrow, block, tag); }
void operator delete(void* block, Align alignment) noexcept { Delete(gDeleteAligned, block, alignment); }
void operator delete[](void* block, Align alignment) noexcept {
    Delete(gDeleteArrayAligned, block, alignment);
}
void operator delete(void* block, Size size, Align alignment) noexcept {
    Delete(gDeleteSizedAligned, block, size, alignment);
}
void operator delete[](void* block, Size size, Align alignment) noexcept {
    Delete(gDeleteArraySizedAligned, block, size, alignment);
}
void operator delete(void* block, Align alignment, Nothrow tag) noexcept {
    Delete(gDeleteAlignedNothrow, block, alignment, tag);
}
void operator delete[](void* block, Align alignment, Nothrow tag) noexcept {
    Delete(gDeleteArrayAlignedNothrow, block, alignment, tag);
}

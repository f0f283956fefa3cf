// Frames for machine faults, on the system's structured exceptions. The compiler has no `__try`, so the frame is an
// assembly routine that the runtime's own handler serves by a table of one row.
#include "platform/guard.h"

#include <cxxabi.h>
#include <malloc.h>

#include "platform/windows/system.h"

// CallGuarded's frame. The state of the floating-point units is that of the fault.
struct GuardFrame {
    char area_of_the_callee[32];
    DWORD fault;
    DWORD sse_control;
    DWORD x87_control;
};

extern "C" {

// Whether a fault ends the body; if so, its code is put into `frame`. All other exceptions pass, those of C++ too.
__attribute__((used)) LONG FilterFault(const EXCEPTION_POINTERS* exception, GuardFrame* frame) {
    constexpr DWORD kExceptionFlags = 0x3F;  // of the SSE unit
    const DWORD code = exception->ExceptionRecord->ExceptionCode;
    switch (code) {
        case EXCEPTION_ACCESS_VIOLATION:
        case EXCEPTION_ARRAY_BOUNDS_EXCEEDED:
        case EXCEPTION_DATATYPE_MISALIGNMENT:
        case EXCEPTION_FLT_DENORMAL_OPERAND:
        case EXCEPTION_FLT_DIVIDE_BY_ZERO:
        case EXCEPTION_FLT_INEXACT_RESULT:
        case EXCEPTION_FLT_INVALID_OPERATION:
        case EXCEPTION_FLT_OVERFLOW:
        case EXCEPTION_FLT_STACK_CHECK:
        case EXCEPTION_FLT_UNDERFLOW:
        case EXCEPTION_ILLEGAL_INSTRUCTION:
        case EXCEPTION_IN_PAGE_ERROR:
        case EXCEPTION_INT_DIVIDE_BY_ZERO:
        case EXCEPTION_INT_OVERFLOW:
        case EXCEPTION_PRIV_INSTRUCTION:
        case EXCEPTION_STACK_OVERFLOW:
        case STATUS_FLOAT_MULTIPLE_FAULTS:
        case STATUS_FLOAT_MULTIPLE_TRAPS:
            frame->fault = code;
            frame->sse_control = exception->ContextRecord->MxCsr & ~kExceptionFlags;
            frame->x87_control = exception->ContextRecord->FltSave.ControlWord;
            return EXCEPTION_EXECUTE_HANDLER;
        default:
            return EXCEPTION_CONTINUE_SEARCH;
    }
}

// Calls body(argument). 0 if it returned, else the code of the fault that ended it, with the floating-point units as the
// body had set them and no exception of theirs pending.
DWORD CallGuarded(void (*body)(void*), void* argument);

}  // extern "C"

// The row of the table of handlers: start and end of the guarded code, filter, and where to continue.
asm(R"(
    .text
    .p2align 4
    .globl CallGuarded
    .seh_proc CallGuarded
CallGuarded:
    subq $56, %rsp
    .seh_stackalloc 56
    .seh_endprologue
    movq %rcx, %rax
    movq %rdx, %rcx
.Lguard_from:
    call *%rax
    movl $0, 32(%rsp)
.Lguard_to:
    jmp .Lguard_end
.Lguard_fault:
    fninit
    fldcw 40(%rsp)
    ldmxcsr 36(%rsp)
.Lguard_end:
    movl 32(%rsp), %eax
    addq $56, %rsp
    ret
    .seh_handler __C_specific_handler, @except
    .seh_handlerdata
    .long 1
    .rva .Lguard_from, .Lguard_to, FilterFault, .Lguard_fault
    .text
    .seh_endproc
)");

namespace {

// A thread's exceptions, as the C++ ABI lays them out.
struct ExceptionState {
    void* mpoCaught;          // those whose handlers run, by a list
    unsigned int mnUncaught;  // those that are being thrown

    static ExceptionState& OfThread() noexcept {
        return *reinterpret_cast<ExceptionState*>(abi::__cxa_get_globals());
    }
};

}  // namespace

bool RunGuarded(void (*body)(void*), void* argument) {
    const ExceptionState exceptions = ExceptionState::OfThread();
    const DWORD fault = CallGuarded(body, argument);
    if (fault != 0) ExceptionState::OfThread() = exceptions;
    if (fault == EXCEPTION_STACK_OVERFLOW) _resetstkoflw();  // the page that guards the stack's end
    return fault != 0;
}

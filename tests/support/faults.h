// Machine faults. Not instrumented: a sanitizer would report them before the machine raises them.
#ifndef ZANBASE_TESTS_FAULTS_H
#define ZANBASE_TESTS_FAULTS_H

#define ZANBASE_AS_WRITTEN \
    __attribute__((noinline, no_sanitize("undefined", "address", "thread"))) inline void

ZANBASE_AS_WRITTEN WriteToNull() {
    volatile int* volatile nowhere = nullptr;
    *nowhere = 1;
}

// The processor must fault at these: 64-bit ARM divides by zero without one, and its trap is not a fault.
#if defined(__aarch64__)
ZANBASE_AS_WRITTEN RunIllegalInstruction() { __asm__ volatile("udf #0"); }
ZANBASE_AS_WRITTEN DivideByZero() { RunIllegalInstruction(); }
#else
ZANBASE_AS_WRITTEN RunIllegalInstruction() { __builtin_trap(); }
ZANBASE_AS_WRITTEN DivideByZero() {
    volatile int number = 7, zero = 0;
    number = number / zero;
}
#endif

// In steps below the size of the guard page at a stack's end, and without a call, which might fault instead.
ZANBASE_AS_WRITTEN UseUpStack() {
    for (;;) *static_cast<volatile char*>(__builtin_alloca(1024)) = 0;
}

#endif

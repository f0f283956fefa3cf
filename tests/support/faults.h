// Machine faults to order. The sanitizers are kept off them: they would report before the machine does.
#ifndef ZANBASE_TESTS_FAULTS_H
#define ZANBASE_TESTS_FAULTS_H

#define ZANBASE_AS_WRITTEN \
    __attribute__((noinline, no_sanitize("undefined", "address", "thread"))) inline void

ZANBASE_AS_WRITTEN WriteToNull() {
    volatile int* volatile nowhere = nullptr;
    *nowhere = 1;
}

// The processor must fault at these: 64-bit ARM divides by zero without one, and its trap is no fault.
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

// In steps of less than the page that guards a stack's end, and with no call, which might fault in its stead.
ZANBASE_AS_WRITTEN UseUpStack() {
    for (;;) *static_cast<volatile char*>(__builtin_alloca(1024)) = 0;
}

#endif

// The text rules on a slot of the ring.
#include "text/name_ring.h"

#include "zanbase/name_ring.h"

namespace {

// The text ends at the end of the slot; the bytes before it are left from earlier uses.
template <class Integer>
char* DecimalName(Integer value) {
    char* const terminator = goNameRing.TakeSlot() + kTextBytes - 1;
    *terminator = '\0';
    return WriteDecimal(value, terminator);
}

}  // namespace

char* NameRing::TakeSlot() {
    const HMutexLock lock(&moRingMutex);
    mnLastSlot = (mnLastSlot + 1) % kSlots;
    return maSlots[mnLastSlot];
}

char* MkName(short value) { return DecimalName(value); }
char* MkName(unsigned short value) { return DecimalName(value); }
char* MkName(int value) { return DecimalName(value); }
char* MkName(unsigned int value) { return DecimalName(value); }
char* MkName(long value) { return DecimalName(value); }
char* MkName(unsigned long value) { return DecimalName(value); }
char* MkName(long long value) { return DecimalName(value); }
char* MkName(unsigned long long value) { return DecimalName(value); }

char* MkName(double value, int decimals) {
    char* const slot = goNameRing.TakeSlot();
    WriteFixedPoint(value, decimals, slot, kTextBytes);
    return slot;
}

char* MkName(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    char* const name = MkNameV(format, arguments);
    va_end(arguments);
    return name;
}

char* MkNameV(const char* format, va_list arguments) {
    char* const slot = goNameRing.TakeSlot();
    WriteFormat(format, arguments, slot, kTextBytes);
    return slot;
}

char* MkNameC(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    char* const name = MkNameV(format, arguments);
    va_end(arguments);
    return name;
}

char* MkTokenName(const char* first, ...) {
    char* const slot = goNameRing.TakeSlot();
    va_list rest;
    va_start(rest, first);
    WriteTokens(first, rest, slot, kTextBytes);
    va_end(rest);
    return slot;
}

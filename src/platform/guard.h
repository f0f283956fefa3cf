// Contract: a frame that receives machine faults.
#ifndef ZANBASE_PLATFORM_GUARD_H
#define ZANBASE_PLATFORM_GUARD_H

// Calls body(argument). Returns false if the body returned, and true if a machine fault of the calling thread
// ended it: an invalid memory access, an integer division by zero, an illegal instruction; on a thread of
// StartThread also an exhausted stack. The frames of the body are abandoned without unwinding, and what they
// held stays held. Wake-ups that they had to forward are forwarded. Exceptions pass through. Frames nest; the
// innermost receives. After a fault the thread handles and throws the exceptions that it did at the call, and
// keeps rounding and traps of floating-point operations as the body had them.
//
// Where faults are signals: faults of threads without a frame, and fault signals that were sent, are passed to
// the handler that the program had before the first call of this function or of StartThread. A handler that
// the program installs later is called first; frames work only if it passes on the faults that it does not
// handle. The body must not block the signals of faults; the call itself unblocks them.
bool RunGuarded(void (*body)(void*), void* argument);

#endif

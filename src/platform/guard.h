// Contract: a frame that receives machine faults.
#ifndef ZANBASE_PLATFORM_GUARD_H
#define ZANBASE_PLATFORM_GUARD_H

// Calls body(argument). True if a machine fault of the calling thread (an access to memory that isn't there,
// an integer division by zero, an illegal instruction; on a thread of StartThread also an exhausted stack)
// ended the body: its frames are abandoned, not unwound, and what they held stays held. False if it returned.
// Exceptions pass through. Frames nest; the innermost one receives.
//
// Faults of threads without a frame, and fault signals that somebody merely sent, go to whoever received them
// before the first call of this function or of StartThread. A program that takes faults over afterwards gets
// them first, and frames work only if it hands on what it doesn't want.
bool RunGuarded(void (*body)(void*), void* argument);

#endif

// What a thread knows about itself.
#ifndef ZANBASE_PLATFORM_POSIX_SELF_H
#define ZANBASE_PLATFORM_POSIX_SELF_H

#include "platform/posix/futex.h"

// One a thread, all zero at its start.
struct Self {
    unsigned int mnNumber;  // 0: not asked for yet
};

extern ZANBASE_FAST_THREAD_LOCAL Self toSelf;

#endif

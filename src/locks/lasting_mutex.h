// The mutex of a public static member, which has to be a plain HMutex and to work until the process has ended.
#ifndef ZANBASE_LOCKS_LASTING_MUTEX_H
#define ZANBASE_LOCKS_LASTING_MUTEX_H

#include "zanbase/mutex.h"

// The destructor of this one mutex does nothing: its static object is destroyed while threads may still use it.
extern const HMutex* const gpoLastingMutex;  // constant; set in load_time.cpp

#endif

// HThread on the platform's threads.
#include "zanbase/thread.h"

#include "platform/thread.h"

unsigned long long HThread::GetCurrentThreadId() { return CurrentThreadNumber(); }

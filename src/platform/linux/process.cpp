// The process identifier of POSIX.
#include "platform/process.h"

#include <unistd.h>

long long ProcessNumber() noexcept { return getpid(); }

// This system doesn't copy processes.
#include "platform/fork.h"

void HoldAroundFork(const ForkLocks&) noexcept {}

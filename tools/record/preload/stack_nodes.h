// Stacks: from the frame that called an allocator to the number of the stack behind it.
#ifndef ZANBASE_RECORD_STACK_NODES_H
#define ZANBASE_RECORD_STACK_NODES_H

#include "common/account.h"
#include "thread_state.h"

namespace recorder {

// The stack of a call from `caller`: as far as the frame that the command credits, once it has marked that,
// and `callers` frames beyond; 64 at most. 0 if memory ran out. Requires: the thread is inside the recorder.
NodeId NodeOfCaller(Account& account, const Frame& caller, unsigned int callers);

// Finds out which file the program is, for as long as it may.
void KeepProgramPath();

// Modules may have been unmapped: their addresses stand for other code from now on.
void RetireUnmappedModules(Account& account);

// Forgets all stacks in a forked child. `parent` is its parent's account.
void ResetNodes(const Account& parent);

}  // namespace recorder

#endif

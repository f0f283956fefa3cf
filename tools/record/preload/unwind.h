// How the frame of any code leads to that of its caller, from the unwind tables that are loaded with the
// code.
#ifndef ZANBASE_RECORD_UNWIND_H
#define ZANBASE_RECORD_UNWIND_H

#include <cstddef>

#include "frame_rule.h"

namespace recorder {

// The rule at `pc`, an address in code that `index` covers, which is the module's section .eh_frame_hdr in
// memory. A rule that is not known if the tables have none, or one that is more than registers and offsets,
// as hand-written code has. Async-signal-safe. Requires: the module stays loaded.
FrameRule RuleAt(std::uintptr_t pc, const void* index);

}  // namespace recorder

#endif

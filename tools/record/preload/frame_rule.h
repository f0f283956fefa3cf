// The step from a frame to its caller's, packed into one word so that a table can be read without a lock.
#ifndef ZANBASE_RECORD_FRAME_RULE_H
#define ZANBASE_RECORD_FRAME_RULE_H

#include <cstdint>

#include "thread_state.h"

namespace recorder {

// The canonical frame address (CFA) is a register plus an offset; the return address lies in the word below
// it, and the caller's frame pointer is saved at an offset from it or still in its register.
struct FrameRule {
    bool known;
    bool from_frame_pointer;  // otherwise from the stack pointer
    bool saves_frame_pointer;
    std::int32_t cfa_offset;
    std::int32_t frame_pointer_offset;  // from the CFA
};

// The caller's frame, or one whose `pc` is 0 if the stack makes no sense.
inline Frame CallerOf(const Frame& frame, const FrameRule& rule) {
    constexpr std::uintptr_t kLargestFrame = std::uintptr_t{1} << 26;
    const std::uintptr_t base = rule.from_frame_pointer ? frame.fp : frame.sp;
    const std::uintptr_t cfa = base + static_cast<std::uintptr_t>(std::int64_t{rule.cfa_offset});
    if (cfa <= frame.sp || cfa - frame.sp > kLargestFrame || cfa % sizeof(cfa) != 0) return {};
    const auto word = [cfa](std::int64_t offset) {
        return *reinterpret_cast<const std::uintptr_t*>(cfa + static_cast<std::uintptr_t>(offset));
    };
    constexpr std::int64_t kReturnAddress = -8;
    return {word(kReturnAddress), cfa, rule.saves_frame_pointer ? word(rule.frame_pointer_offset) : frame.fp};
}

}  // namespace recorder

#endif

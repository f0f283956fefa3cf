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
    std::int64_t cfa_offset;
    std::int64_t frame_pointer_offset;  // from the CFA
};

// The packed rule: bit 0 is set if the caller can be found, bit 1 selects the register and bit 3 whether the
// frame pointer was saved; bit 2 is kStop. The offsets follow.
using PackedRule = std::uint64_t;
constexpr PackedRule kLeadsOn = 1;

inline PackedRule PackRule(const FrameRule& rule) {
    constexpr std::int64_t kLimit = 1 << 28;
    if (!rule.known || rule.cfa_offset < 0 || rule.cfa_offset >= kLimit || rule.frame_pointer_offset > 0 ||
        rule.frame_pointer_offset <= -kLimit)
        return 0;
    return kLeadsOn | (rule.from_frame_pointer ? 2U : 0U) | (rule.saves_frame_pointer ? 8U : 0U) |
           static_cast<PackedRule>(rule.cfa_offset) << 4 |
           static_cast<PackedRule>(-rule.frame_pointer_offset) << 36;
}

// The caller's frame, or one whose `pc` is 0 if the stack makes no sense.
inline Frame CallerOf(const Frame& frame, PackedRule rule) {
    constexpr std::uintptr_t kLargestFrame = std::uintptr_t{1} << 26;
    const std::uintptr_t cfa = ((rule & 2) != 0 ? frame.fp : frame.sp) + (rule >> 4 & 0xfffffff);
    if (cfa <= frame.sp || cfa - frame.sp > kLargestFrame || cfa % sizeof(cfa) != 0) return {};
    const auto word = [cfa](std::uintptr_t below) {
        return *reinterpret_cast<const std::uintptr_t*>(cfa - below);
    };
    return {word(sizeof(cfa)), cfa, (rule & 8) != 0 ? word(rule >> 36) : frame.fp};
}

}  // namespace recorder

#endif

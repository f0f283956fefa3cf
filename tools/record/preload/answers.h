// What is known of return addresses: a table that is read without a lock.
#ifndef ZANBASE_RECORD_ANSWERS_H
#define ZANBASE_RECORD_ANSWERS_H

#include <cstdint>

#include "block_table.h"
#include "frame_rule.h"

namespace recorder {

// What is known of one return address, in one word: a tag in the low bits, and above it a site's number, or
// the packed rule that leads to the caller's frame. 0 is no answer.
using Answer = std::uint64_t;
constexpr Answer kSiteTag = 1;
constexpr Answer kRuleTag = 2;
constexpr Answer kEndTag = 3;  // no way to the caller is known
constexpr Answer kTagMask = 3;

inline Answer PackSite(SiteId site) { return kSiteTag | Answer{site} << 2; }
inline SiteId SiteIn(Answer answer) { return static_cast<SiteId>(answer >> 2); }

// A rule that does not fit becomes kEndTag.
Answer PackRule(const FrameRule& rule);
FrameRule UnpackRule(Answer answer);

// The answer that was remembered for `key`, which is a return address or one with a bit of the caller's own
// in it; 0 if there is none. Any thread may call it at any time.
Answer AnswerFor(std::uintptr_t key);

// Requires: `key` is not 0 and has no answer; the thread holds the lock of the sites. An answer that
// finds no room is not kept.
void Remember(std::uintptr_t key, Answer answer);

// Forgets the answers of the keys from `first` to before `end`. Requires: the lock of the sites.
void RetireAnswers(std::uintptr_t first, std::uintptr_t end);

}  // namespace recorder

#endif

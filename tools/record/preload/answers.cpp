// The table of answers: open hashing with linear probing. A slot's answer is written before its key, and a
// slot keeps its key, so readers need no lock. A full table is replaced; the old one stays, since a reader
// may still be in it.
#include "answers.h"

#include <array>
#include <atomic>
#include <cstddef>

#include "pool.h"

namespace recorder {
namespace {

struct Slot {
    std::atomic<std::uintptr_t> key;
    std::atomic<Answer> answer;
};

struct AnswerTable {
    unsigned int bits;  // of the number of slots
    std::size_t count;  // of slots with a key; guarded by the lock of the sites
    Slot* slots;
};

std::array<Slot, 1024> gFirstSlots;
AnswerTable gFirstTable{10, 0, gFirstSlots.data()};
std::atomic<AnswerTable*> gAnswers{&gFirstTable};

std::size_t SlotsOf(const AnswerTable& table) { return std::size_t{1} << table.bits; }

Slot& SlotOf(const AnswerTable& table, std::uintptr_t key) {
    constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;
    for (std::size_t slot = key * kGoldenRatio >> (64 - table.bits);;
         slot = (slot + 1) & (SlotsOf(table) - 1)) {
        const std::uintptr_t found = table.slots[slot].key.load(std::memory_order_acquire);
        if (found == key || found == 0) return table.slots[slot];
    }
}

void Put(AnswerTable& table, std::uintptr_t key, Answer answer) {
    Slot& slot = SlotOf(table, key);
    slot.answer.store(answer, std::memory_order_relaxed);
    if (slot.key == key) return;
    slot.key.store(key, std::memory_order_release);
    ++table.count;
}

bool Grow() {
    const AnswerTable& old = *gAnswers;
    auto* const table = static_cast<AnswerTable*>(TakeFromPool(sizeof(AnswerTable)));
    auto* const fresh = static_cast<Slot*>(MapPages(2 * SlotsOf(old) * sizeof(Slot)));
    if (table == nullptr || fresh == nullptr) return false;
    *table = {old.bits + 1, 0, fresh};
    for (std::size_t i = 0; i < SlotsOf(old); ++i)
        if (old.slots[i].answer != 0) Put(*table, old.slots[i].key, old.slots[i].answer);
    gAnswers.store(table, std::memory_order_release);
    return true;
}

}  // namespace

Answer PackRule(const FrameRule& rule) {
    constexpr std::int32_t kLimit = 1 << 28;
    if (!rule.known || rule.cfa_offset < 0 || rule.cfa_offset >= kLimit || rule.frame_pointer_offset > 0 ||
        rule.frame_pointer_offset <= -kLimit)
        return kEndTag;
    return kRuleTag | (rule.from_frame_pointer ? 4U : 0U) | (rule.saves_frame_pointer ? 8U : 0U) |
           static_cast<Answer>(rule.cfa_offset) << 4 | static_cast<Answer>(-rule.frame_pointer_offset) << 36;
}

FrameRule UnpackRule(Answer answer) {
    constexpr Answer kOffsetMask = 0xfffffff;
    return {true, (answer & 4) != 0, (answer & 8) != 0, static_cast<std::int32_t>(answer >> 4 & kOffsetMask),
            -static_cast<std::int32_t>(answer >> 36)};
}

Answer AnswerFor(std::uintptr_t key) {
    const Slot& slot = SlotOf(*gAnswers.load(std::memory_order_acquire), key);
    return slot.key.load(std::memory_order_acquire) == key ? slot.answer.load(std::memory_order_relaxed) : 0;
}

void Remember(std::uintptr_t key, Answer answer) {
    const AnswerTable& table = *gAnswers;
    if (table.count < SlotsOf(table) / 2 || Grow()) Put(*gAnswers, key, answer);
}

void RetireAnswers(std::uintptr_t first, std::uintptr_t end) {
    const AnswerTable& table = *gAnswers;
    for (std::size_t i = 0; i < SlotsOf(table); ++i) {
        const std::uintptr_t key = table.slots[i].key;
        if (key >= first && key < end) table.slots[i].answer = 0;
    }
}

}  // namespace recorder

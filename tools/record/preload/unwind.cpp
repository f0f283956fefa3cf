// A reader of the tables that the Linux Standard Base calls .eh_frame and .eh_frame_hdr.
#include "unwind.h"

#include <array>
#include <cstring>

namespace recorder {
namespace {

#if defined(__x86_64__)
constexpr std::uint64_t kFramePointer = 6;
constexpr std::uint64_t kStackPointer = 7;
constexpr std::uint64_t kReturnAddress = 16;
#else
#error "the recorder knows the frames of x86-64 only"
#endif

using Byte = std::uint8_t;

// Reads numbers from front to back.
class Cursor {
public:
    explicit Cursor(const Byte* at) : mpcAt(at) {}

    template <class Number>
    Number Read() {
        Number number;
        std::memcpy(&number, mpcAt, sizeof number);
        mpcAt += sizeof number;
        return number;
    }

    // Numbers of any length, seven bits a byte.
    std::uint64_t ReadUnsigned() {
        std::uint64_t number = 0;
        for (unsigned int shift = 0;; shift += 7) {
            const Byte byte = Read<Byte>();
            if (shift < 64) number |= std::uint64_t{byte & 0x7fU} << shift;
            if (byte < 0x80) return number;
        }
    }
    std::int64_t ReadSigned() {
        std::uint64_t number = 0;
        unsigned int shift = 0;
        Byte byte = 0x80;
        for (; byte >= 0x80; shift += 7) {
            byte = Read<Byte>();
            if (shift < 64) number |= std::uint64_t{byte & 0x7fU} << shift;
        }
        if (shift < 64 && (byte & 0x40) != 0) number |= ~std::uint64_t{0} << shift;
        return static_cast<std::int64_t>(number);
    }

    // A pointer in one of the encodings that compilers use: absolute or relative to its own place, of 4 or 8
    // bytes.
    std::uintptr_t ReadPointer(Byte encoding) {
        const auto place = (encoding & 0x70) == 0x10 ? reinterpret_cast<std::uintptr_t>(mpcAt) : 0;
        switch (encoding & 0x0f) {
            case 0x03:
                return place + Read<std::uint32_t>();
            case 0x0b:
                return place + static_cast<std::uintptr_t>(std::int64_t{Read<std::int32_t>()});
            default:
                return place + Read<std::uint64_t>();
        }
    }

    void Skip(std::uint64_t bytes) { mpcAt += bytes; }
    const Byte* at() const { return mpcAt; }

private:
    const Byte* mpcAt;
};

// What a common information entry says of the functions that refer to it.
struct Common {
    std::uint64_t code_unit = 0;
    std::int64_t data_unit = 0;
    Byte encoding = 0;
    bool has_data = false;
    bool known =
        true;  // false if it is of a form that is not read here, or describes frames of signal handlers
    const Byte* program = nullptr;
    const Byte* end = nullptr;
};

Common ReadCommon(const Byte* entry) {
    Common common;
    Cursor cursor(entry);
    const auto length = cursor.Read<std::uint32_t>();
    common.end = cursor.at() + length;
    cursor.Skip(sizeof(std::uint32_t));  // marks it as a common entry
    cursor.Skip(1);                      // version
    const auto* augmentation = reinterpret_cast<const char*>(cursor.at());
    cursor.Skip(std::strlen(augmentation) + 1);
    common.code_unit = cursor.ReadUnsigned();
    common.data_unit = cursor.ReadSigned();
    common.known = cursor.ReadUnsigned() == kReturnAddress;
    std::uint64_t data_bytes = 0;
    for (; *augmentation != 0; ++augmentation) {
        switch (*augmentation) {
            case 'z':
                common.has_data = true;
                data_bytes = cursor.ReadUnsigned();
                common.program = cursor.at() + data_bytes;
                break;
            case 'R':
                common.encoding = cursor.Read<Byte>();
                break;
            case 'P': {
                const Byte encoding = cursor.Read<Byte>();
                cursor.ReadPointer(encoding);
                break;
            }
            case 'L':
                cursor.Skip(1);
                break;
            default:
                common.known = false;
                break;
        }
    }
    if (!common.has_data) common.program = cursor.at();
    return common;
}

// The registers' rules while the program of a function runs.
struct Row {
    std::uint64_t cfa_register = kStackPointer;
    std::int64_t cfa_offset = 0;
    std::int64_t frame_pointer_offset = 0;
    bool saves_frame_pointer = false;
    bool known = true;

    void Save(std::uint64_t number, std::int64_t offset) {
        if (number == kFramePointer) {
            saves_frame_pointer = true;
            frame_pointer_offset = offset;
        }
        if (number == kReturnAddress && offset != -8) known = false;
    }
    // A register that still has the caller's value, or none that anybody needs. Threads start in frames
    // without a return address.
    void Keep(std::uint64_t number) {
        if (number == kFramePointer) saves_frame_pointer = false;
        if (number == kReturnAddress) known = false;
    }
    // A register that is found otherwise than at an offset from the CFA.
    void Lose(std::uint64_t number) {
        if (number == kFramePointer || number == kReturnAddress) known = false;
    }
};

class Program {
public:
    Program(const Common& common, std::uintptr_t location, std::uintptr_t pc)
        : moCommon(common), mnLocation(location), mnPc(pc) {}

    // Runs the instructions from `at` to `end`, or until they are about code behind the address that is
    // looked for.
    void Run(const Byte* at, const Byte* end) {
        Cursor cursor(at);
        while (cursor.at() < end && mnLocation <= mnPc && moRow.known) Step(cursor);
    }
    void EndInitial() { moInitial = moRow; }
    const Row& row() const { return moRow; }

private:
    void Advance(std::uint64_t units) { mnLocation += units * moCommon.code_unit; }

    void Restore(std::uint64_t number) {
        if (number != kFramePointer) return;
        moRow.saves_frame_pointer = moInitial.saves_frame_pointer;
        moRow.frame_pointer_offset = moInitial.frame_pointer_offset;
    }

    void Step(Cursor& cursor) {
        const Byte code = cursor.Read<Byte>();
        const std::uint64_t low = code & 0x3fU;
        switch (code >> 6) {
            case 1:
                Advance(low);
                break;
            case 2:
                moRow.Save(low, static_cast<std::int64_t>(cursor.ReadUnsigned()) * moCommon.data_unit);
                break;
            case 3:
                Restore(low);
                break;
            default:
                StepOther(code, cursor);
                break;
        }
    }

    void StepOther(Byte code, Cursor& cursor) {
        const auto offset = [&] { return static_cast<std::int64_t>(cursor.ReadUnsigned()); };
        switch (code) {
            case 0x00:
                break;  // nop
            case 0x02:
                Advance(cursor.Read<std::uint8_t>());
                break;
            case 0x03:
                Advance(cursor.Read<std::uint16_t>());
                break;
            case 0x04:
                Advance(cursor.Read<std::uint32_t>());
                break;
            case 0x05: {  // offset_extended
                const std::uint64_t number = cursor.ReadUnsigned();
                moRow.Save(number, offset() * moCommon.data_unit);
                break;
            }
            case 0x06:
                Restore(cursor.ReadUnsigned());
                break;
            case 0x07:  // undefined
            case 0x08:  // same_value
                moRow.Keep(cursor.ReadUnsigned());
                break;
            case 0x09:  // register
                moRow.Lose(cursor.ReadUnsigned());
                cursor.ReadUnsigned();
                break;
            case 0x0a:  // remember_state
                if (mnRemembered < maRemembered.size()) maRemembered[mnRemembered] = moRow;
                ++mnRemembered;
                break;
            case 0x0b:  // restore_state
                if (mnRemembered == 0 || mnRemembered > maRemembered.size()) moRow.known = false;
                if (moRow.known) moRow = maRemembered[--mnRemembered];
                break;
            case 0x0c:  // def_cfa
                moRow.cfa_register = cursor.ReadUnsigned();
                moRow.cfa_offset = offset();
                break;
            case 0x0d:
                moRow.cfa_register = cursor.ReadUnsigned();
                break;
            case 0x0e:
                moRow.cfa_offset = offset();
                break;
            case 0x0f:  // def_cfa_expression, which a later def_cfa may replace
                cursor.Skip(cursor.ReadUnsigned());
                moRow.cfa_register = ~std::uint64_t{0};
                break;
            case 0x10:  // expression
            case 0x16:  // val_expression
                moRow.Lose(cursor.ReadUnsigned());
                cursor.Skip(cursor.ReadUnsigned());
                break;
            case 0x11: {  // offset_extended_sf
                const std::uint64_t number = cursor.ReadUnsigned();
                moRow.Save(number, cursor.ReadSigned() * moCommon.data_unit);
                break;
            }
            case 0x12:  // def_cfa_sf
                moRow.cfa_register = cursor.ReadUnsigned();
                moRow.cfa_offset = cursor.ReadSigned() * moCommon.data_unit;
                break;
            case 0x13:
                moRow.cfa_offset = cursor.ReadSigned() * moCommon.data_unit;
                break;
            case 0x2e:
                cursor.ReadUnsigned();
                break;  // GNU_args_size
            default:
                moRow.known = false;
                break;
        }
    }

    const Common& moCommon;
    std::uintptr_t mnLocation;
    const std::uintptr_t mnPc;
    Row moRow;
    Row moInitial;
    std::array<Row, 8> maRemembered;
    std::size_t mnRemembered = 0;
};

// The entry of the function at `pc`, by the sorted table of the index; null if there is none.
const Byte* FindEntry(std::uintptr_t pc, const Byte* index) {
    struct Pair {
        std::int32_t function;  // both relative to the index
        std::int32_t entry;
    };
    Cursor cursor(index);
    if (cursor.Read<Byte>() != 1) return nullptr;
    const Byte frames_encoding = cursor.Read<Byte>();
    const Byte count_encoding = cursor.Read<Byte>();
    if (cursor.Read<Byte>() != 0x3b) return nullptr;  // relative to the index, 4 bytes, sorted
    cursor.ReadPointer(frames_encoding);
    std::size_t count = cursor.ReadPointer(count_encoding);
    const std::int64_t wanted = static_cast<std::int64_t>(pc - reinterpret_cast<std::uintptr_t>(index));
    const auto* const table = reinterpret_cast<const Pair*>(cursor.at());
    std::size_t first = 0;
    while (count > 1) {
        const std::size_t half = count / 2;
        if (table[first + half].function <= wanted) first += half;
        count -= half;
    }
    if (count == 0 || table[first].function > wanted) return nullptr;
    return index + table[first].entry;
}

}  // namespace

FrameRule RuleAt(std::uintptr_t pc, const void* index) {
    const Byte* const entry = FindEntry(pc, static_cast<const Byte*>(index));
    if (entry == nullptr) return {};
    Cursor cursor(entry);
    const auto length = cursor.Read<std::uint32_t>();
    if (length == 0 || length == 0xffffffff) return {};
    const Byte* const end = cursor.at() + length;
    const Byte* const pointer_place = cursor.at();
    const Common common = ReadCommon(pointer_place - cursor.Read<std::uint32_t>());
    if (!common.known) return {};
    const std::uintptr_t start = cursor.ReadPointer(common.encoding);
    const std::uintptr_t range = cursor.ReadPointer(common.encoding & 0x0f);
    if (pc < start || pc - start >= range) return {};
    if (common.has_data) cursor.Skip(cursor.ReadUnsigned());
    Program program(common, start, pc);
    program.Run(common.program, common.end);
    program.EndInitial();
    program.Run(cursor.at(), end);
    const Row& row = program.row();
    const bool from_frame_pointer = row.cfa_register == kFramePointer;
    if (!row.known || (!from_frame_pointer && row.cfa_register != kStackPointer)) return {};
    return {true, from_frame_pointer, row.saves_frame_pointer, row.cfa_offset, row.frame_pointer_offset};
}

}  // namespace recorder

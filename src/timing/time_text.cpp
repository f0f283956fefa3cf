// Splits whole seconds into units; the text begins with the largest unit that is not 0.
#include "timing/time_text.h"

#include "zanbase/string_makers.h"

namespace {

struct Unit {
    int seconds;
    char letter;
};

constexpr Unit kUnits[] = {{604800, 'w'}, {86400, 'd'}, {3600, 'h'}, {60, 'm'}};

constexpr double kLimit = 2147483648.0;  // from here on an int can't hold the seconds

}  // namespace

std::string TimeText(double seconds) {
    // A negative value would have no part that is 1 or more; the comparison is false for NaN as well.
    int rest = seconds > 0.0 && seconds < kLimit ? static_cast<int>(seconds) : 0;
    std::string text;
    for (const Unit& unit : kUnits) {
        const int part = rest / unit.seconds;
        rest %= unit.seconds;
        if (!text.empty()) {
            text += MkString("%02d%c", part, unit.letter);
        } else if (part != 0) {
            text += MkString("%d%c", part, unit.letter);
        }
    }
    if (!text.empty()) return text + MkString("%02ds", rest);
    if (seconds >= 1.0) return MkString("%.3f seconds", seconds);
    return MkString("%.3f milliseconds", seconds * 1000.0);
}

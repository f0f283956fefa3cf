// Terminal codes, the revision text and the screen measures: tables and words in memory.
#include "zanbase/terminal.h"

#include <cstring>
#include <string_view>

namespace {

struct Terminal {
    std::string_view name;
    int code;
};

constexpr int kAutomaticTerm = 9;

// In search order. The longer name of a family is never reached; it documents that both have one code.
constexpr Terminal kTerminals[] = {
    {"HARD", 0},
    {"HARDCOPY", 0},
    {"VT52", 1},
    {"VT100", 2},
    {"V100", 2},
    {"TEKT", 3},
    {"TEKT4010", 3},
    {"ANSI", 4},
    {"VT200", 5},
    {"CDC721", 6},
    {"MASSCOMP", 7},
    {"HP2621B", 8},
    {"IBM", 9},
    {"IBM/PC", 9},
    {"DEFAULT", kAutomaticTerm},
    {"AUTO", kAutomaticTerm},
};

constexpr char kRevision[] = "2016.0.1";

int mnMajorRevSet = 0;  // 1 once mzMajorRev is complete
char mzMajorRev[12];

double gaScreenSize[4];
double* mpdScreenSize = nullptr;  // null until gaScreenSize is stored

constexpr char UpperCase(char letter) {
    return letter >= 'a' && letter <= 'z' ? static_cast<char>(letter - 'a' + 'A') : letter;
}

// Returns whether `text` begins with `upper`, ignoring the case of ASCII letters in every locale. Requires:
// `upper` has no lower-case letters.
bool BeginsWith(const char* text, std::string_view upper) {
    for (const char letter : upper) {
        if (UpperCase(*text++) != letter) return false;  // the terminator of `text` matches no letter
    }
    return true;
}

// Drops the first dot and ends the text at the second.
void SqueezeRevision(char* text) {
    bool dot_seen = false;
    char* end = text;
    for (const char* place = text; *place != '\0' && !(*place == '.' && dot_seen); ++place) {
        if (*place == '.') {
            dot_seen = true;
        } else {
            *end++ = *place;
        }
    }
    *end = '\0';
}

}  // namespace

int IMPTerminal(const char* name) {
    for (const Terminal& terminal : kTerminals) {
        if (BeginsWith(name, terminal.name)) return terminal.code;
    }
    return 0;
}

int IMPAutomaticTerm() { return kAutomaticTerm; }

const char* IMPGetMajorRev() {
    if (mnMajorRevSet == 0) {
        static_assert(sizeof(kRevision) <= sizeof(mzMajorRev));
        std::memcpy(mzMajorRev, kRevision, sizeof(kRevision));
        SqueezeRevision(mzMajorRev);
        mnMajorRevSet = 1;
    }
    return mzMajorRev;
}

int IsWin32s() { return 0; }

int SetScreenSize(double first, double second, double third, double fourth) {
    if (mpdScreenSize != nullptr) return 0;
    const double measures[] = {first, second, third, fourth};
    std::memcpy(gaScreenSize, measures, sizeof(measures));
    mpdScreenSize = gaScreenSize;
    return 1;
}

int GetScreenSize(double* first, double* second, double* third, double* fourth) {
    double* const places[] = {first, second, third, fourth};
    int handed_out = 0;
    for (int i = 0; i < 4 && mpdScreenSize != nullptr; ++i) {
        if (places[i] == nullptr) continue;
        *places[i] = mpdScreenSize[i];
        handed_out = 1;
    }
    return handed_out;
}

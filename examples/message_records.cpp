// Keeps a stock list in records of fixed width, and reports on it in the user's language.
//
//     message_records [--test] [FOLDER]
//
// FOLDER has the message catalogues, FOLDER/de/LC_MESSAGES/ZAN.mo for German. With --test no catalogue is
// used: each message shows itself and its format codes, so that a text that isn't marked for translation
// stands out.
#include <zanbase/field_text.h>
#include <zanbase/message_catalogue.h>

#include <cstdio>
#include <cstring>
#include <string>

namespace {

// A record: three fields side by side, filled with blanks, nothing between or behind them.
constexpr int kNameWidth = 12;
constexpr int kPiecesWidth = 6;
constexpr int kPriceWidth = 12;
constexpr int kRecordWidth = kNameWidth + kPiecesWidth + kPriceWidth;

struct Item {
    const char* name;
    int pieces;
    double price;
};

std::string RecordOf(const Item& item) {
    std::string record(kRecordWidth, ' ');
    TextFieldFill(&record[0], item.name, kNameWidth);
    PrintInt(&record[kNameWidth], "%6ld", item.pieces);
    PrintDouble(&record[kNameWidth + kPiecesWidth], "%12.4E", item.price);
    return record;
}

int PiecesOf(const std::string& record) { return ScanInt(&record[kNameWidth], kPiecesWidth); }

double PriceOf(const std::string& record) {
    return ScanDouble(&record[kNameWidth + kPiecesWidth], kPriceWidth);
}

}  // namespace

int main(int argc, char** argv) {
    int next = 1;
    if (next < argc && std::strcmp(argv[next], "--test") == 0) {
        SetIntlTest(true);
        ++next;
    }
    InitLocale(nullptr);
    if (next < argc) InitLocaleDir(argv[next]);

    const Item items[] = {{"bolt", 250, 0.15}, {"hinge, brass", 12, 3.5}, {"hinge, steel, black", 0, 2.75}};
    int pieces = 0;
    double worth = 0;
    for (const Item& item : items) {
        const std::string record = RecordOf(item);
        std::printf("|%s|\n", record.c_str());
        pieces += PiecesOf(record);
        worth += PiecesOf(record) * PriceOf(record);
        if (PiecesOf(record) == 0) std::printf(_("%s is out of stock\n"), item.name);
    }
    std::printf(_("%d pieces in stock, worth %.2f\n"), pieces, worth);
    return 0;
}

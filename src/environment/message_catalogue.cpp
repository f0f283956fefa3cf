// Looks each message up once, under one lock, and keeps its text.
#include "zanbase/message_catalogue.h"

#include <cctype>
#include <utility>

#include "environment/message_catalogue.h"
#include "platform/messages.h"

std::string IntlTestText(std::string_view message) {
    std::string codes;
    codes.reserve(2 * message.size() + 5);
    for (std::size_t place = 0; place < message.size(); ++place) {
        codes += message[place];
        if (message[place] != '%' || place + 1 == message.size()) continue;
        const char next = message[place + 1];
        if (next != '%' && std::isspace(static_cast<unsigned char>(next)) == 0) codes += '%';
    }
    return std::string(message) + "#" + codes;
}

void InitLocale(const char* locale) { SetMessageLocale(locale != nullptr ? locale : ""); }

void InitLocaleDir(const char* directory) { BindMessages("ZAN", directory); }

void SetIntlTest(bool on) { goMessageCatalogue.mbIntlTest.store(on, std::memory_order_relaxed); }

char*(_)(const char* message) {
    MessageCatalogue& catalogue = goMessageCatalogue;
    const std::string_view key(message);
    const HMutexLock lock(&catalogue.moCatalogueMutex);
    auto entry = catalogue.moMessageMap.find(key, MessageMap::hasher(), std::equal_to<>());
    if (entry == catalogue.moMessageMap.end()) {
        // The text is made before the entry: if memory runs out, no entry without a text remains.
        std::string text =
            catalogue.mbIntlTest.load(std::memory_order_relaxed) ? IntlTestText(key) : Translate(message);
        entry = catalogue.moMessageMap.emplace(key, std::move(text)).first;
    }
    return entry->second.data();
}

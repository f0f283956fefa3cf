// GNU gettext where it is part of the C library: the runtime's locale is the catalogues' locale too.
#include "platform/messages.h"

#include <clocale>

#include <libintl.h>

void SetMessageLocale(const char* locale) noexcept {
    std::setlocale(LC_ALL, locale);
    std::setlocale(LC_NUMERIC, "C");
}

void BindMessages(const char* domain, const char* directory) noexcept {
    textdomain(domain);
    bindtextdomain(domain, directory);
}

const char* Translate(const char* message) noexcept { return gettext(message); }

// Message catalogues by the gettext functions of the C library, which use the runtime's locale.
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

// GNU gettext as a library of its own, with a locale beside that of the C runtime.
#include "platform/messages.h"

#include <clocale>

#include <libintl.h>
#undef setlocale  // which the header above redirects to libintl_setlocale

void SetMessageLocale(const char* locale) noexcept {
    std::setlocale(LC_ALL, locale);
    std::setlocale(LC_NUMERIC, "C");
    libintl_setlocale(LC_ALL, locale);
    libintl_setlocale(LC_NUMERIC, "C");
}

void BindMessages(const char* domain, const char* directory) noexcept {
    libintl_textdomain(domain);
    libintl_bindtextdomain(domain, directory);
}

const char* Translate(const char* message) noexcept { return libintl_gettext(message); }

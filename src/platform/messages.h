// Contract: the system's message catalogues.
#ifndef ZANBASE_PLATFORM_MESSAGES_H
#define ZANBASE_PLATFORM_MESSAGES_H

// Makes `locale` the locale of the C runtime and of the catalogues, for all categories, and then "C" that of
// numbers. An empty name stands for the environment's choice; an unknown one changes numbers alone.
void SetMessageLocale(const char* locale) noexcept;

// Makes `domain` the text domain that Translate asks, with its catalogues below `directory`; a null
// `directory` leaves the one before. Both texts are copied.
void BindMessages(const char* domain, const char* directory) noexcept;

// The translation of `message`, or `message` itself where there is none. To be copied at once: nothing is
// promised about how long it lasts. Any thread may call it.
const char* Translate(const char* message) noexcept;

#endif

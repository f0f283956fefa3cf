// Contract: the system's message catalogues.
#ifndef ZANBASE_PLATFORM_MESSAGES_H
#define ZANBASE_PLATFORM_MESSAGES_H

// Sets all categories of the C runtime and of the catalogues to `locale`, and then numbers to "C". An empty
// name means the locale that the environment names; an unknown name changes numbers only. Not thread-safe.
void SetMessageLocale(const char* locale) noexcept;

// Sets the text domain of Translate to `domain`, with its catalogues below `directory`; a null `directory`
// keeps the current one. Both texts are copied. Not thread-safe.
void BindMessages(const char* domain, const char* directory) noexcept;

// Returns the translation of `message`, or `message` if there is none. The caller copies it at once: its
// lifetime is not defined. Thread-safe.
const char* Translate(const char* message) noexcept;

#endif

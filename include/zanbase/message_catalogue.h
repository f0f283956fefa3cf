/// @file
/// The front end to the message catalogue: the display text of each message is looked up once and kept.
///
/// A program sets up while it has one thread, and then asks from any thread:
///
///     InitLocale(nullptr);                        // the language of the user's environment
///     InitLocaleDir("/usr/share/locale");         // …/de/LC_MESSAGES/ZAN.mo and the like
///     std::printf(_("Cannot open %s"), name);
///
/// Catalogues are those of GNU gettext, made by `msgfmt`; the text domain is "ZAN". A message keeps the text
/// of its first look-up: a later call of a function that sets up affects only messages that were not looked
/// up before. The texts are kept until the process ends. The library's own messages are not translated.
///
/// Thread-safety: `_` and `SetIntlTest` are thread-safe; `InitLocale` and `InitLocaleDir` are not.
///
/// Not for texts that a program composes while it runs: each one would stay in memory.
#ifndef ZANBASE_MESSAGE_CATALOGUE_H
#define ZANBASE_MESSAGE_CATALOGUE_H

#include "zanbase/export.h"

/// @addtogroup environment
/// @{

/// Sets the locale of the process and of the message catalogue to `locale`, a name as `std::setlocale` takes
/// it. Null or an empty text means the locale that the environment names. The category `LC_NUMERIC` becomes
/// "C" in any case, so numbers that a program writes and reads have a decimal point everywhere. An unknown
/// name is not reported; it changes `LC_NUMERIC` only.
///
/// Changes the whole process. Not thread-safe: call it before other threads start.
ZANBASE_API void InitLocale(const char* locale);

/// Looks for catalogues below `directory` from now on. The text is copied; null keeps the directory as it is.
/// A missing directory or catalogue is not reported. Not thread-safe: call it before other threads start.
ZANBASE_API void InitLocaleDir(const char* directory);

/// Turns the test mode on or off, for messages that are first looked up from now on. Thread-safe.
///
/// In test mode no catalogue is read. A text becomes itself, "#", and itself again with each format code made
/// printable. A screen then shows which texts pass through the catalogue, and with which codes:
///
///     Cannot open %s    becomes    Cannot open %s#Cannot open %%s
///
/// Printed with its arguments, that shows the filled-in message, the mark, and the codes.
ZANBASE_API void SetIntlTest(bool on);

/// Returns the display text of `message`: its translation, or the same text if there is none. Equal texts
/// give the same pointer, from whatever buffers they come. The text is valid until the process ends; the
/// caller must not free or change it. The empty text gives the catalogue's entry for it, usually a description of
/// the catalogue. Works without any setting up. Thread-safe.
///
/// Requires: `message` is not null. Throws `std::bad_alloc` if there is no memory for a new text; the message
/// is then looked up again by the next call.
///
/// Other libraries use the name `_` too. A macro of that name with a parameter doesn't affect this
/// declaration. A using-declaration, such as `using testing::_;`, has to be inside a namespace or a function,
/// since the global scope holds only one `_`. Then call this function so:
///
///     (_)("text")       // if there is such a macro
///     ::_("text")       // after such a using-declaration
///     (::_)("text")     // anywhere
ZANBASE_API ZANBASE_FORMAT_ARGUMENT(1) char*(_)(const char* message);

/// @}

#endif

/// @file
/// The front end to the message catalogue: the display text of each message is found once and kept.
///
/// A program sets up first, while it has one thread, and then asks from any thread:
///
///     InitLocale(nullptr);                        // the language of the user's environment
///     InitLocaleDir("/usr/share/locale");         // …/de/LC_MESSAGES/ZAN.mo and the like
///     std::printf(_("Cannot open %s"), name);
///
/// Catalogues are GNU gettext's, made by `msgfmt`; their text domain is "ZAN". A message keeps the text that
/// it got when it was first asked for: a later call of the three functions that set up changes only messages
/// that nobody has asked for yet. Texts are kept until the library is unloaded, so this is no place for texts
/// that a program makes up as it runs. Messages of the library itself are not translated.
#ifndef ZANBASE_MESSAGE_CATALOGUE_H
#define ZANBASE_MESSAGE_CATALOGUE_H

#include "zanbase/export.h"

/// Makes `locale` (a name as `std::setlocale` takes it) the locale of the process and of the message
/// catalogue, except for numbers: they keep the format of "C", so text that a program writes and reads has a
/// decimal point everywhere. Null or an empty text stands for what the environment asks for. A name that the
/// system doesn't know is not reported; numbers get the format of "C" all the same, and nothing else changes.
/// It changes the whole process: call it before other threads run.
ZANBASE_API void InitLocale(const char* locale);

/// Takes catalogues from now on from below `directory`, which is copied; null leaves the place as it is.
/// Whether anything is found there is not reported. Call it before other threads run.
ZANBASE_API void InitLocaleDir(const char* directory);

/// Turns the test mode on or off, for messages that are first asked for from now on; any thread may call it
/// at any time. In test mode no catalogue is looked at. A text becomes itself, "#", and itself again with
/// each format code made printable, so a screen shows which texts pass through the catalogue, and with which
/// codes:
///
///     Cannot open %s    becomes    Cannot open %s#Cannot open %%s
///
/// Printed with its arguments, that shows the message filled in, the mark, and the codes.
ZANBASE_API void SetIntlTest(bool on);

/// The display text of `message`: its translation, or the same text where there is none. `message` is a
/// zero-terminated text; null is not allowed. Equal texts give the same pointer, whatever buffers they come
/// from, and it stays good until the library is unloaded; the caller neither frees nor changes what it points
/// to. The empty text gives whatever the catalogue has for it, as a rule a description of the catalogue. Any
/// thread may call it at any time; it works without any setting up. Throws `std::bad_alloc` if there is no
/// memory for a new text, and then keeps nothing of it.
///
/// Other things are called `_` too. A macro of that name that takes an argument doesn't touch this
/// declaration. Something that a file brings in, as with `using testing::_;`, has to be brought into a
/// namespace or a function, since the global scope holds only one `_`. This function is then called so:
///
///     (_)("text")       // where there is such a macro
///     ::_("text")       // behind such a `using`
///     (::_)("text")     // anywhere
ZANBASE_API ZANBASE_FORMAT_ARGUMENT(1) char*(_)(const char* message);

#endif

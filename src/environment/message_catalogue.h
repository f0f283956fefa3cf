// The state of the message catalogue, which is constructed at load, and the texts of its test mode.
#ifndef ZANBASE_ENVIRONMENT_MESSAGE_CATALOGUE_H
#define ZANBASE_ENVIRONMENT_MESSAGE_CATALOGUE_H

#include <atomic>
#include <functional>
#include <string>
#include <string_view>

#include <boost/unordered_map.hpp>

#include "zanbase/mutex.h"

// std::hash reads a text in words. With boost::hash, which reads bytes, a look-up of 40 characters took twice
// as long.
using MessageMap = boost::unordered::unordered_map<std::string, std::string, std::hash<std::string_view>>;

// Entries are added and never changed or removed. The map keeps each entry in its own node, so the characters
// of a value keep their address while the map grows.
struct MessageCatalogue {
    MessageMap moMessageMap;  // message to display text; guarded by moCatalogueMutex
    HMutex moCatalogueMutex;
    std::atomic<bool> mbIntlTest{false};
};

extern MessageCatalogue& goMessageCatalogue;  // built in load_time.cpp, never destroyed

// Returns `message`, "#", and `message` with a second % after each % whose next character is neither % nor
// white space. In "%%d" only the second % is followed by such a character.
std::string IntlTestText(std::string_view message);

#endif

// The state of the message catalogue, which is built at load, and its test texts.
#ifndef ZANBASE_ENVIRONMENT_MESSAGE_CATALOGUE_H
#define ZANBASE_ENVIRONMENT_MESSAGE_CATALOGUE_H

#include <atomic>
#include <functional>
#include <string>
#include <string_view>

#include <boost/unordered_map.hpp>

#include "zanbase/mutex.h"

// std::hash reads a text in words; with boost::hash, which goes from byte to byte, a look-up of 40 characters
// took twice as long.
using MessageMap = boost::unordered::unordered_map<std::string, std::string, std::hash<std::string_view>>;

// Entries are only added, and a value never changes. The map keeps each entry in a node of its own, so the
// characters of a value stay where they are while the map grows.
struct MessageCatalogue {
    MessageMap moMessageMap;  // message to display text; guarded by moCatalogueMutex
    HMutex moCatalogueMutex;
    std::atomic<bool> mbIntlTest{false};
};

extern MessageCatalogue& goMessageCatalogue;  // built in load_time.cpp, never destroyed

// `message`, "#", and `message` with one more % behind each % whose next character is neither a % nor white
// space. Each % is judged by itself: of two in a row the second one counts like any other.
std::string IntlTestText(std::string_view message);

#endif

// Repeated look-ups of messages, beside a standard map under the standard library's re-entrant mutex.
#include <benchmark/benchmark.h>

#include <mutex>
#include <string>
#include <unordered_map>
#include <vector>

#include "ratios.h"
#include "zanbase/message_catalogue.h"

namespace {

char* PeerText(const char* message) {
    static std::recursive_mutex mutex;
    static std::unordered_map<std::string, std::string> texts;
    const std::lock_guard<std::recursive_mutex> lock(mutex);
    const std::string key(message);
    auto entry = texts.find(key);
    if (entry == texts.end()) entry = texts.emplace(key, message).first;
    return entry->second.data();
}

// Messages of `length` characters, in the number that a medium-sized program has.
std::vector<std::string> Messages(std::size_t length) {
    std::vector<std::string> messages;
    for (int i = 0; i < 1000; ++i) {
        std::string message = std::to_string(i) + " files could not be opened for writing in the directory ";
        message.resize(length, '.');
        messages.push_back(message);
    }
    return messages;
}

template <class Text>
void LookUp(benchmark::State& state, Text text) {
    const std::vector<std::string> messages = Messages(static_cast<std::size_t>(state.range(0)));
    std::size_t next = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(text(messages[next].c_str()));
        if (++next == messages.size()) next = 0;
    }
}

void MessageLookUp(benchmark::State& state) { LookUp(state, ::_); }
BENCHMARK(MessageLookUp)->Arg(12)->Arg(40)->Arg(120);

void StdMapLookUp(benchmark::State& state) { LookUp(state, PeerText); }
BENCHMARK(StdMapLookUp)->Arg(12)->Arg(40)->Arg(120);

const bool rows = AddRatio("MessageLookUp/12", "StdMapLookUp/12", 1.0) &&
                  AddRatio("MessageLookUp/40", "StdMapLookUp/40", 1.0) &&
                  AddRatio("MessageLookUp/120", "StdMapLookUp/120", 1.0);

}  // namespace

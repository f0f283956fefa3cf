// The text of the settings: a line for each, a key and a value.
#include "settings.h"

#include <cstdlib>
#include <cstring>
#include <functional>

namespace recorder {
namespace {

// Calls `visit` with the key and the field of every setting that is a number.
template <class AnySettings, class Visitor>
void ForEachNumber(AnySettings& settings, const Visitor& visit) {
    visit("leaked", settings.budgets.leaked_bytes);
    visit("peak", settings.budgets.peak_bytes);
    visit("calls", settings.budgets.allocations);
    visit("read", settings.budgets.read_bytes);
    visit("opens", settings.budgets.opens);
    visit("format", settings.format);
    visit("memory", settings.memory);
    visit("disk", settings.disk);
    visit("follow", settings.follow);
    visit("signal", settings.signal);
    visit("process", settings.process);
    visit("result", settings.result_descriptor);
}

void ReadSetting(const std::string& key, const std::string& value, Settings& settings) {
    if (key == "output") settings.output = value;
    if (key == "preload") settings.other_preloads = value;
    if (key == "skip") settings.skipped_functions.push_back(value);
    ForEachNumber(settings, [&](const char* name, auto& field) {
        using Field = std::remove_reference_t<decltype(field)>;
        if (key == name) field = static_cast<Field>(std::strtoll(value.c_str(), nullptr, 10));
    });
}

}  // namespace

std::string SettingsText(const Settings& settings) {
    std::string text = "output " + settings.output + "\npreload " + settings.other_preloads + "\n";
    for (const std::string& name : settings.skipped_functions) text += "skip " + name + "\n";
    ForEachNumber(settings, [&](const char* name, const auto& field) {
        text += std::string(name) + " " + std::to_string(static_cast<long long>(field)) + "\n";
    });
    return text;
}

Settings ReadSettings(const char* text) {
    Settings settings;
    while (*text != 0) {
        const char* const end = std::strchr(text, '\n');
        const std::string line = end != nullptr ? std::string(text, end) : std::string(text);
        const std::size_t blank = line.find(' ');
        if (blank != std::string::npos) ReadSetting(line.substr(0, blank), line.substr(blank + 1), settings);
        text = end != nullptr ? end + 1 : text + line.size();
    }
    return settings;
}

}  // namespace recorder

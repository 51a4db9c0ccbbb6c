#pragma once
// The recognizer's settings in one table: key, type, default, accepted range and meaning. The
// properties, every tool that takes a setting, the control socket and the README's table all come
// from it; the checks here are the host's and the tools', the plug-in itself stores what it is given.

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

enum class SettingType {
    Boolean,       // true/false (also 1/0)
    Milliseconds,  // a whole number of milliseconds
    Float,         // a single-precision number
    Action,        // a write-only key whose value is ignored
};

struct Setting {
    std::string key;  // the recognizer's own key: "HoldTimeoutMilliseconds", "VirtualNormalizationFactors.7"
    SettingType type = SettingType::Float;
    double defaultValue = 0.0;  // booleans 1 or 0; actions 0
    double minimum = 0.0;       // accepted range, inclusive
    double maximum = 0.0;
    std::string meaning;  // one line for people

    std::string algsKey() const;      // "Algs." + key: what the pipeline and `replay --set` take
    std::string propertyKey() const;  // "Pipeline.Algs." + key: what the service's properties take
    bool tunable() const { return type != SettingType::Action; }
};

// Every setting in a fixed order: ActivationThreshold, HoldTimeoutMilliseconds,
// EnableHoldSuppression, EnableTapSuppression, VirtualNormalizationFactors.0 to .22, then the
// action ResetEventStats.
const std::vector<Setting>& settingsTable();

// A setting by any accepted form of its key: "X", "Algs.X" or "Pipeline.Algs.X"; nullptr if none.
const Setting* findSetting(std::string_view key);

// A key written where only the table's settings can be written: in the "Pipeline" or "Algs"
// domain, or one of the table's bare keys. Writes of such keys are checked; other keys (the
// service's own, the device's) pass as they are.
bool isSettingKeyForm(std::string_view key);

// The table's key nearest to a mistyped one, in the form the mistyped one was given.
std::string nearestSettingKey(std::string_view key);

// A setting that cannot be used, said in one line.
struct SettingError : std::invalid_argument {
    using std::invalid_argument::invalid_argument;
};

struct CheckedSetting {
    const Setting* setting = nullptr;
    PropertyValue value;  // bool, unsigned (milliseconds), double (float settings), null (actions)
};

// Checks a key and a value against the table; throws SettingError naming the key and, for a bad
// value, the accepted range.
CheckedSetting checkSetting(std::string_view key, std::string_view text);
CheckedSetting checkSetting(std::string_view key, const PropertyValue& value);
// Text in any of its usual forms is text, never a string value.
inline CheckedSetting checkSetting(std::string_view key, const char* text) {
    return checkSetting(key, std::string_view(text));
}
inline CheckedSetting checkSetting(std::string_view key, const std::string& text) {
    return checkSetting(key, std::string_view(text));
}
// "KEY=VALUE" as written on a command line.
CheckedSetting checkSettingAssignment(std::string_view assignment);

// The accepted values of a setting in words: "a whole number of milliseconds from 1 to 60000".
std::string acceptedValues(const Setting& setting);
// The default as a command line writes it: "true", "500", "200", "0.6667".
std::string defaultText(const Setting& setting);

}  // namespace TolkaTouch

#include "tolkatouch/Settings.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <string>

#include <fmt/format.h>

#include "algs/Algs.h"
#include "common/NearestWord.h"

namespace TolkaTouch {

namespace {

constexpr std::string_view kAlgsPrefix = "Algs.";
constexpr std::string_view kPipelinePrefix = "Pipeline.Algs.";

// Accepted ranges wide enough for any tuning worth trying, narrow enough that a slip of the
// keyboard (a zero timeout turns every tap into a hold; a zero threshold divides by zero) is caught.
constexpr double kMinThreshold = 1.0;
constexpr double kMaxThreshold = 10000.0;
constexpr double kMinHoldTimeout = 1.0;
constexpr double kMaxHoldTimeout = 60000.0;
constexpr double kMinFactor = 0.0;
constexpr double kMaxFactor = 4.0;

// The defaults are read from a recognizer fresh from its constructors, so that the numbers live
// in one place: the recognizer's own initialisers.
std::vector<Setting> buildTable() {
    const Algs defaults;
    const auto number = [&](const std::string& key) { return defaults.getState(key).toDouble(); };

    std::vector<Setting> table;
    table.push_back({"ActivationThreshold", SettingType::Float, number("ActivationThreshold"), kMinThreshold,
                     kMaxThreshold, "divides every pixel reading; the classifier's gate"});
    table.push_back({"HoldTimeoutMilliseconds", SettingType::Milliseconds, number("HoldTimeoutMilliseconds"),
                     kMinHoldTimeout, kMaxHoldTimeout, "a touch longer than this becomes a hold"});
    table.push_back({"EnableHoldSuppression", SettingType::Boolean, number("EnableHoldSuppression"), 0, 1,
                     "a touch whose score is negative at the hold timeout gives no hold"});
    table.push_back({"EnableTapSuppression", SettingType::Boolean, number("EnableTapSuppression"), 0, 1,
                     "the tap rejection may turn a short touch down"});
    for (size_t i = 0; i < defaults.virtualImage.groups.size(); ++i) {
        const std::string key = "VirtualNormalizationFactors." + std::to_string(i);
        table.push_back({key, SettingType::Float, number(key), kMinFactor, kMaxFactor,
                         "scales the sum of virtual pixel group " + defaults.virtualImage.groups[i]});
    }
    table.push_back({"ResetEventStats", SettingType::Action, 0, 0, 0, "clears every event counter (value ignored)"});
    return table;
}

// The key without its domains, and the domains it was given with.
std::pair<std::string_view, std::string_view> splitKey(std::string_view key) {
    for (std::string_view prefix : {kPipelinePrefix, kAlgsPrefix}) {
        if (key.substr(0, prefix.size()) == prefix) return {prefix, key.substr(prefix.size())};
    }
    return {std::string_view(), key};
}

// Text from outside, shown in a message: control characters are escaped so that they cannot
// reach a terminal.
std::string quoted(std::string_view text) {
    std::string out = "\"";
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7f) {
            out += fmt::format("\\x{:02x}", byte);
        } else if (c == '"' || c == '\\') {
            out += '\\';
            out += c;
        } else {
            out += c;
        }
    }
    return out + "\"";
}

std::string formatNumber(double value) { return fmt::format("{}", value); }

[[noreturn]] void failValue(std::string_view key, const Setting& setting, std::string_view shown) {
    throw SettingError(fmt::format("setting {} takes {}, not {}", quoted(key), acceptedValues(setting), shown));
}

const Setting& requireSetting(std::string_view key) {
    const Setting* setting = findSetting(key);
    if (setting == nullptr) {
        throw SettingError(
            fmt::format("unknown setting {} (did you mean {}?)", quoted(key), quoted(nearestSettingKey(key))));
    }
    return *setting;
}

std::optional<bool> booleanFromText(std::string_view text) {
    if (text == "true" || text == "1") return true;
    if (text == "false" || text == "0") return false;
    return std::nullopt;
}

std::optional<uint64_t> wholeFromText(std::string_view text) {
    uint64_t value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || text.empty()) return std::nullopt;
    return value;
}

std::optional<double> numberFromText(std::string_view text) {
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || text.empty()) return std::nullopt;
    return value;
}

bool inRange(const Setting& setting, double value) {
    return std::isfinite(value) && value >= setting.minimum && value <= setting.maximum;
}

}  // namespace

std::string Setting::algsKey() const { return std::string(kAlgsPrefix) + key; }

std::string Setting::propertyKey() const { return std::string(kPipelinePrefix) + key; }

const std::vector<Setting>& settingsTable() {
    static const std::vector<Setting> table = buildTable();
    return table;
}

const Setting* findSetting(std::string_view key) {
    const std::string_view bare = splitKey(key).second;
    for (const Setting& setting : settingsTable()) {
        if (setting.key == bare) return &setting;
    }
    return nullptr;
}

bool isSettingKeyForm(std::string_view key) {
    return key.starts_with("Pipeline.") || key.starts_with(kAlgsPrefix) || findSetting(key) != nullptr;
}

std::string nearestSettingKey(std::string_view key) {
    const auto [prefix, bare] = splitKey(key);
    std::vector<std::string> keys;
    for (const Setting& setting : settingsTable()) keys.push_back(setting.key);
    return std::string(prefix) + nearestWord(bare, keys);
}

std::string acceptedValues(const Setting& setting) {
    switch (setting.type) {
    case SettingType::Boolean:
        return "true or false";
    case SettingType::Milliseconds:
        return fmt::format("a whole number of milliseconds from {} to {}", formatNumber(setting.minimum),
                           formatNumber(setting.maximum));
    case SettingType::Float:
        return fmt::format("a number from {} to {}", formatNumber(setting.minimum), formatNumber(setting.maximum));
    case SettingType::Action:
        return "any value";
    }
    return std::string();
}

std::string defaultText(const Setting& setting) {
    switch (setting.type) {
    case SettingType::Boolean:
        return setting.defaultValue != 0 ? "true" : "false";
    case SettingType::Action:
        return "-";
    case SettingType::Milliseconds:
    case SettingType::Float:
        return fmt::format("{}", static_cast<float>(setting.defaultValue));
    }
    return std::string();
}

CheckedSetting checkSetting(std::string_view key, std::string_view text) {
    const Setting& setting = requireSetting(key);
    switch (setting.type) {
    case SettingType::Boolean:
        if (const auto value = booleanFromText(text)) return {&setting, PropertyValue(*value)};
        break;
    case SettingType::Milliseconds:
        if (const auto value = wholeFromText(text); value && inRange(setting, static_cast<double>(*value))) {
            return {&setting, PropertyValue(static_cast<unsigned long long>(*value))};
        }
        break;
    case SettingType::Float:
        if (const auto value = numberFromText(text); value && inRange(setting, *value)) {
            return {&setting, PropertyValue(*value)};
        }
        break;
    case SettingType::Action:
        return {&setting, PropertyValue()};
    }
    failValue(key, setting, quoted(text));
}

CheckedSetting checkSetting(std::string_view key, const PropertyValue& value) {
    const Setting& setting = requireSetting(key);
    switch (setting.type) {
    case SettingType::Boolean:
        if (value.isBoolean()) return {&setting, value};
        if (value.isInteger() && (value.toUInt64() == 0 || value.toUInt64() == 1) && value.toInt64() >= 0) {
            return {&setting, PropertyValue(value.toUInt64() == 1)};
        }
        break;
    case SettingType::Milliseconds:
        if (value.isInteger() && value.toInt64() >= 0 && inRange(setting, static_cast<double>(value.toUInt64()))) {
            return {&setting, PropertyValue(static_cast<unsigned long long>(value.toUInt64()))};
        }
        if (value.isFloating() && inRange(setting, value.toDouble()) && std::trunc(value.toDouble()) == value.toDouble()) {
            return {&setting, PropertyValue(static_cast<unsigned long long>(value.toDouble()))};
        }
        break;
    case SettingType::Float:
        if ((value.isInteger() || value.isFloating()) && inRange(setting, value.toDouble())) {
            return {&setting, PropertyValue(value.toDouble())};
        }
        break;
    case SettingType::Action:
        return {&setting, PropertyValue()};
    }
    failValue(key, setting, value.isString() ? quoted(*value.string()) : quoted(value.description()));
}

CheckedSetting checkSettingAssignment(std::string_view assignment) {
    const size_t equals = assignment.find('=');
    if (equals == std::string_view::npos) {
        throw SettingError(fmt::format("{} is not KEY=VALUE", quoted(assignment)));
    }
    return checkSetting(assignment.substr(0, equals), assignment.substr(equals + 1));
}

}  // namespace TolkaTouch

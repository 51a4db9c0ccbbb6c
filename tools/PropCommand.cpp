// tolkatouch prop get KEY / prop set KEY VALUE: reads and writes a property of the service that
// tolkatouchd runs for a surface, through the daemon's control socket.

#include <algorithm>
#include <array>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "platform/PropertyValueJson.h"
#include "tools/Commands.h"
#include "tools/ControlClient.h"
#include "tools/DocumentFile.h"
#include "tools/SettingValue.h"
#include "tools/SettingsFile.h"
#include "tolkatouch/Settings.h"

namespace TolkaTouch::Tools {

namespace {

struct PropArguments {
    std::string socket = defaultControlSocketPath();
    std::string key;
    std::string value;
    std::string file;
    std::optional<uint32_t> device;
};

nlohmann::json withDevice(nlohmann::json request, const std::optional<uint32_t>& device) {
    if (device) request["device"] = *device;
    return request;
}

// A text value is printed as it is, so that "Recording" saved to a file is the document itself;
// anything else as one line of JSON.
void printValue(const nlohmann::json& value) {
    std::string text = value.is_string() ? value.get<std::string>()
                                         : value.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
    if (text.empty() || text.back() != '\n') text += '\n';
    std::fwrite(text.data(), 1, text.size(), stdout);
    std::fflush(stdout);
}

void runGet(const PropArguments& arguments) {
    auto reply = controlRequest(arguments.socket, withDevice({{"get", arguments.key}}, arguments.device), arguments.key);
    printValue(reply.value("value", nlohmann::json()));
}

void setProperty(const PropArguments& arguments, const std::string& givenKey, const std::string& text) {
    // A setting is checked against the settings table and sent in the property's own form; the
    // service's own keys and the device's pass as they are.
    std::string key = givenKey;
    PropertyValue value;
    if (isSettingKeyForm(key)) {
        const CheckedSetting checked = checkSetting(key, text);
        key = checked.setting->propertyKey();
        value = checked.value;
    } else {
        value = settingValueFromText(text);
    }
    nlohmann::json request = {{"set", key}, {"value", nlohmann::json(PropertyValueJson::toJson(value))}};
    auto reply = controlRequest(arguments.socket, withDevice(request, arguments.device), givenKey);
    if (reply.value("ok", false) != true) throw ToolError(givenKey, "the service did not take the value");
}

void runSet(const PropArguments& arguments) { setProperty(arguments, arguments.key, arguments.value); }

// Every setting of the file is checked before the first is sent, so a bad line changes nothing.
void runApply(const PropArguments& arguments) {
    std::vector<std::pair<std::string, std::string>> settings;
    for (const std::string& assignment : readSettingsFile(arguments.file)) {
        const size_t equals = assignment.find('=');
        std::string key = assignment.substr(0, equals);
        std::string text = assignment.substr(equals + 1);
        if (!isSettingKeyForm(key)) throw ToolError(arguments.file, "\"" + key + "\" is not a setting of the recognizer");
        checkSetting(key, text);
        settings.emplace_back(std::move(key), std::move(text));
    }
    for (const auto& [key, text] : settings) setProperty(arguments, key, text);
}

const char* typeName(SettingType type) {
    switch (type) {
    case SettingType::Boolean: return "boolean";
    case SettingType::Milliseconds: return "milliseconds";
    case SettingType::Float: return "number";
    case SettingType::Action: return "action";
    }
    return "";
}

// Every setting of the table with its type, the running service's value and the default.
void runList(const PropArguments& arguments) {
    std::vector<std::array<std::string, 4>> rows{{"setting", "type", "value", "default"}};
    for (const Setting& setting : settingsTable()) {
        std::string value = "-";
        if (setting.tunable()) {
            const auto reply = controlRequest(arguments.socket, withDevice({{"get", setting.propertyKey()}}, arguments.device),
                                              setting.propertyKey());
            const nlohmann::json current = reply.value("value", nlohmann::json());
            // A single-precision setting is shown as the service holds it, not widened.
            value = setting.type == SettingType::Float && current.is_number()
                        ? fmt::format("{}", current.get<float>())
                        : current.dump();
        }
        rows.push_back({setting.propertyKey(), typeName(setting.type), value, defaultText(setting)});
    }
    std::array<size_t, 4> widths{};
    for (const auto& row : rows) {
        for (size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], row[i].size());
    }
    for (const auto& row : rows) {
        std::string line = fmt::format("{:<{}}  {:<{}}  {:>{}}  {:>{}}", row[0], widths[0], row[1], widths[1], row[2],
                                       widths[2], row[3], widths[3]);
        std::puts(line.c_str());
    }
    std::fflush(stdout);
}

void addSocketAndDevice(CLI::App* command, PropArguments& arguments) {
    command->add_option("--socket", arguments.socket, "tolkatouchd's control socket")->capture_default_str();
    command->add_option("--device", arguments.device,
                        "the service number of the surface (see tolkatouch devices); default: the first");
}

}  // namespace

void addPropCommand(CLI::App& app) {
    auto arguments = std::make_shared<PropArguments>();
    CLI::App* prop = app.add_subcommand(
        "prop", "Read or write a property of the running service through tolkatouchd's control socket.");
    prop->require_subcommand(1);

    CLI::App* get = prop->add_subcommand(
        "get", "Print a property: text as it is (\"Recording\" saved to a file replays with tolkatouch replay), "
               "anything else as JSON.");
    get->add_option("KEY", arguments->key, "e.g. Version, Recording, Pipeline.Algs.HoldTimeoutMilliseconds")->required();
    addSocketAndDevice(get, *arguments);
    get->callback([arguments] { runGet(*arguments); });

    CLI::App* set = prop->add_subcommand(
        "set", "Write a property; the service uses a setting from the next frame on.");
    set->add_option("KEY", arguments->key, "e.g. Pipeline.Algs.HoldTimeoutMilliseconds")->required();
    set->add_option("VALUE", arguments->value, "read as JSON (700, true, 0.5, [1, 2]), otherwise as a string")
        ->required();
    addSocketAndDevice(set, *arguments);
    set->callback([arguments] { runSet(*arguments); });

    CLI::App* apply = prop->add_subcommand(
        "apply", "Write every setting of a settings file (one KEY=VALUE a line, as tune --write-settings writes it); "
                 "all are checked before the first is written.");
    apply->add_option("FILE", arguments->file, "the settings file")->required();
    addSocketAndDevice(apply, *arguments);
    apply->callback([arguments] { runApply(*arguments); });

    CLI::App* list = prop->add_subcommand(
        "list", "List every setting the running service takes, with its type, current value and default.");
    addSocketAndDevice(list, *arguments);
    list->callback([arguments] { runList(*arguments); });
}

}  // namespace TolkaTouch::Tools

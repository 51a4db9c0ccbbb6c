#include "daemon/ControlRequests.h"

#include "daemon/ControlServer.h"
#include "platform/Log.h"
#include "platform/PropertyValueJson.h"
#include "tolkatouch/Settings.h"

namespace TolkaTouch {

namespace {
using nlohmann::json;

std::string dump(const json& reply) {
    return reply.dump(-1, ' ', false, json::error_handler_t::replace);
}

std::string error(const std::string& message) {
    return dump(json{{"error", message}});
}

std::string noSuchDevice(std::optional<uint32_t> service) {
    return error(service ? "no device with service " + std::to_string(*service) : "no device");
}
}  // namespace

std::string answerControlRequest(const std::string& line, ControlTarget& target) {
    // Requests are flat: a value nested deeper than this is refused before anything walks it.
    constexpr int kMaxDepth = 64;
    bool tooDeep = false;
    json request = json::parse(
        line,
        [&tooDeep](int depth, json::parse_event_t, json&) {
            if (depth > kMaxDepth) tooDeep = true;
            return !tooDeep;
        },
        false);
    if (tooDeep || request.is_discarded() || !request.is_object()) return error("malformed request");

    std::optional<uint32_t> service;
    if (auto it = request.find("device"); it != request.end()) {
        if (!it->is_number_unsigned() || it->get<uint64_t>() > UINT32_MAX) {
            return error("malformed request: \"device\" takes a service number");
        }
        service = it->get<uint32_t>();
    }

    if (auto it = request.find("get"); it != request.end()) {
        if (!it->is_string()) return error("malformed request: \"get\" takes a key string");
        auto value = target.getProperty(service, it->get<std::string>());
        if (!value) return noSuchDevice(service);
        return dump(json{{"value", json(PropertyValueJson::toJson(*value))}});
    }
    if (auto it = request.find("set"); it != request.end()) {
        auto value = request.find("value");
        if (!it->is_string() || value == request.end()) {
            return error("malformed request: \"set\" takes a key string and a \"value\"");
        }
        std::string key = it->get<std::string>();
        PropertyValue written = PropertyValueJson::fromJson(*value);
        // Settings are checked against the settings table, so that no made-up key is recorded and
        // no value outside a setting's range reaches the recognizer; other keys pass as they are.
        if (isSettingKeyForm(key)) {
            try {
                const CheckedSetting checked = checkSetting(key, written);
                key = checked.setting->propertyKey();
                written = checked.value;
            } catch (const SettingError& refusal) {
                return error(refusal.what());
            }
        }
        auto ok = target.setProperty(service, key, written);
        if (!ok) return noSuchDevice(service);
        return dump(json{{"ok", *ok}});
    }
    if (auto it = request.find("log"); it != request.end()) {
        // The process's log levels: the plug-in logs through the same table, so a change reaches
        // its description lines from the next frame on.
        if (it->is_string()) {
            auto level = request.find("level");
            const std::optional<int> minimum =
                level != request.end() && level->is_string() ? SystemLog::levelFromName(level->get<std::string>())
                                                              : std::nullopt;
            if (!minimum) {
                return error("malformed request: \"log\" takes a category (or *) and a \"level\": debug, info, "
                             "default, error, fault or off");
            }
            const std::string category = it->get<std::string>();
            SystemLog::setMinimumLevel(*minimum, category == "*" ? std::string() : category);
            return dump(json{{"ok", true}});
        }
        json levels = json::object();
        for (const auto& [category, name] : SystemLog::minimumLevels()) levels[category] = name;
        return dump(json{{"levels", levels}});
    }
    if (auto it = request.find("watch"); it != request.end() && *it == true) {
        if (!target.startWatching()) return error("this daemon has nothing to watch");
        return dump(json{{"ok", true}});
    }
    if (auto it = request.find("live"); it != request.end()) {
        if (*it != true) return error("malformed request: \"live\" takes true");
        if (!target.startLive()) return error("this daemon has no live frames to give");
        return dump(json{{"ok", true}});
    }
    if (auto it = request.find("devices"); it != request.end() && *it == true) {
        auto list = json::array();
        for (const auto& device : target.devices()) {
            list.push_back(json{{"service", device.service},
                                {"node", device.node},
                                {"vendor", device.vendor},
                                {"product", device.product}});
        }
        return dump(json{{"devices", list}});
    }
    return error("unknown request");
}

std::string oversizedControlRequestReply() {
    return error("request too long (over " + std::to_string(ControlServer::kMaxLineLength) + " bytes)");
}

}  // namespace TolkaTouch

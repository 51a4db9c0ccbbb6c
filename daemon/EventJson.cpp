#include "daemon/EventJson.h"

#include <cstdint>

#include <nlohmann/json.hpp>

namespace TolkaTouch {

namespace {
constexpr uint32_t kResetUsagePage = 0xFF60;
constexpr uint32_t kResetUsage = 2;
constexpr uint32_t kHoldMask = 2;
constexpr uint32_t kTapMask = 0x20000;

const char* kindName(const HIDEvent& event) {
    if (event.type == HIDEventType::VendorDefined) {
        return event.usagePage == kResetUsagePage && event.usage == kResetUsage ? "reset" : "unknown";
    }
    if (event.eventMask == kTapMask) return "tap";
    bool hold = event.eventMask == kHoldMask;
    switch (event.phase) {
    case HIDEventPhase::MayBegin: return "may-begin";
    case HIDEventPhase::Cancelled: return "cancel";
    case HIDEventPhase::Began: return hold ? "hold-start" : "unknown";
    case HIDEventPhase::Changed: return hold ? "hold-change" : "unknown";
    case HIDEventPhase::Ended: return hold ? "hold-end" : "unknown";
    default: return "unknown";
    }
}
}  // namespace

// {"frame":<frame number, null for the reset>,"event":<kind>,"region":<zone>,"phase":<phase>,"timestamp":<ticks>}
std::string eventJsonLine(const HIDEvent& event) {
    bool digitizer = event.type == HIDEventType::Digitizer;
    nlohmann::ordered_json line = nlohmann::ordered_json::object();
    if (digitizer) {
        line["frame"] = event.integerValue(kDigitizerFrameNumberField);
    } else {
        line["frame"] = nullptr;
    }
    line["event"] = kindName(event);
    line["region"] = digitizer ? static_cast<int64_t>(event.y) : 0;
    line["phase"] = event.phase;
    line["timestamp"] = event.timestamp;
    return line.dump();
}

}  // namespace TolkaTouch

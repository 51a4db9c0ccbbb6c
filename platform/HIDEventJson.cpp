#include "platform/HIDEventJson.h"

#include <cstdint>

#include <nlohmann/json.hpp>

namespace TolkaTouch {

namespace {

constexpr uint32_t kResetUsagePage = 0xFF60;
constexpr uint32_t kResetUsage = 2;
constexpr uint32_t kHoldMask = 2;
constexpr uint32_t kTapMask = 0x20000;

bool isResetEvent(const HIDEvent& event) {
    return event.type == HIDEventType::VendorDefined && event.usagePage == kResetUsagePage &&
           event.usage == kResetUsage;
}

}  // namespace

std::string_view eventKindName(const HIDEvent& event) {
    if (event.type == HIDEventType::VendorDefined) return isResetEvent(event) ? "reset" : "unknown";
    if (event.eventMask == kTapMask) return "tap";
    switch (event.phase) {
    case HIDEventPhase::MayBegin: return "may-begin";
    case HIDEventPhase::Cancelled: return "cancel";
    case HIDEventPhase::Began: return event.eventMask == kHoldMask ? "hold-start" : "unknown";
    case HIDEventPhase::Changed: return event.eventMask == kHoldMask ? "hold-change" : "unknown";
    case HIDEventPhase::Ended: return event.eventMask == kHoldMask ? "hold-end" : "unknown";
    default: return "unknown";
    }
}

std::string eventJsonLine(const HIDEvent& event) {
    nlohmann::ordered_json line = nlohmann::ordered_json::object();
    if (event.type == HIDEventType::Digitizer) {
        line["frame"] = event.integerValue(kDigitizerFrameNumberField);
    } else {
        line["frame"] = nullptr;
    }
    line["event"] = eventKindName(event);
    line["region"] = event.type == HIDEventType::Digitizer ? static_cast<int64_t>(event.y) : 0;
    line["phase"] = event.phase;
    line["timestamp"] = event.timestamp;
    return line.dump();
}

}  // namespace TolkaTouch

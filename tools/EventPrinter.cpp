#include "tools/EventPrinter.h"

#include <cstdint>

#include <nlohmann/json.hpp>

#include "platform/Format.h"

namespace TolkaTouch::Tools {

namespace {

constexpr uint32_t kResetUsagePage = 0xFF60;
constexpr uint32_t kResetUsage = 2;
constexpr uint32_t kHoldMask = 2;
constexpr uint32_t kTapMask = 0x20000;

bool isResetEvent(const HIDEvent& event) {
    return event.type == HIDEventType::VendorDefined && event.usagePage == kResetUsagePage &&
           event.usage == kResetUsage;
}

bool isHoldKind(std::string_view kind) { return kind.starts_with("hold-"); }

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

std::string_view eventButtonName(const HIDEvent& event) {
    if (event.type != HIDEventType::Digitizer) return {};
    switch (static_cast<int64_t>(event.y)) {
    case 1: return isHoldKind(eventKindName(event)) ? "voice assistant" : "play/pause";
    case 2: return "volume down";
    case 3: return "volume up";
    default: return {};
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

std::string eventHumanLine(const HIDEvent& event, double secondsSinceStart) {
    const std::string kind(eventKindName(event));
    if (event.type != HIDEventType::Digitizer) {
        return formatString("%7.3fs  frame %-4s  %s", secondsSinceStart, "-", kind.c_str());
    }
    const std::string button(eventButtonName(event));
    std::string line = formatString("%7.3fs  frame %-4lld  %-11s region %lld", secondsSinceStart,
                                    static_cast<long long>(event.integerValue(kDigitizerFrameNumberField)),
                                    kind.c_str(), static_cast<long long>(event.y));
    if (!button.empty()) line += "  " + button;
    return line;
}

}  // namespace TolkaTouch::Tools

#include "tools/EventPrinter.h"

#include <cstdint>

#include <fmt/format.h>

#include "tolkatouch/Gesture.h"

namespace TolkaTouch::Tools {

std::string_view eventButtonName(const HIDEvent& event) {
    if (event.type != HIDEventType::Digitizer) return {};
    switch (static_cast<int64_t>(event.y)) {
    case 1: {
        const auto gesture = GestureCodec::decode(event);
        return gesture && GestureCodec::isHold(gesture->kind) ? "voice assistant" : "play/pause";
    }
    case 2: return "volume down";
    case 3: return "volume up";
    default: return {};
    }
}

std::string eventHumanLine(const HIDEvent& event, double secondsSinceStart) {
    const std::string kind(GestureCodec::kindName(event));
    if (event.type != HIDEventType::Digitizer) {
        return fmt::format("{:7.3f}s  frame {:<4}  {}", secondsSinceStart, "-", kind);
    }
    const std::string button(eventButtonName(event));
    std::string line = fmt::format("{:7.3f}s  frame {:<4}  {:<11} region {}", secondsSinceStart,
                                   event.integerValue(kDigitizerFrameNumberField), kind,
                                   static_cast<long long>(event.y));
    if (!button.empty()) line += "  " + button;
    return line;
}

}  // namespace TolkaTouch::Tools

#include "tools/EventPrinter.h"

#include <cstdint>

#include "platform/Format.h"
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

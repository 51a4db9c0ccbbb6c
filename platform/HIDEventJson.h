#pragma once
// The one-line JSON form of an event, as `tolkatouch replay --json` and `tolkatouchd --print`
// write it, so that the two outputs compare line by line.

#include <string>
#include <string_view>

#include "platform/HIDEvent.h"

namespace TolkaTouch {

// "may-begin", "hold-start", "hold-change", "hold-end", "tap", "cancel" for digitizer events,
// "reset" for the vendor-defined firmware reset event, "unknown" for anything else.
std::string_view eventKindName(const HIDEvent& event);

// One JSON object without a line end:
// {"frame":<field 0xB001B, null for reset>,"event":<kind>,"region":<y>,"phase":<phase>,"timestamp":<ticks>}
std::string eventJsonLine(const HIDEvent& event);

}  // namespace TolkaTouch

#pragma once
// The text forms of the events the pipeline hands out: one JSON object per event for programs
// (also what the daemon prints), and one aligned line per event for people.

#include <string>
#include <string_view>

#include "platform/HIDEvent.h"

namespace TolkaTouch::Tools {

// "may-begin", "hold-start", "hold-change", "hold-end", "tap", "cancel" for digitizer events,
// "reset" for the vendor-defined firmware reset event, "unknown" for anything else.
std::string_view eventKindName(const HIDEvent& event);

// The button an event's zone stands for: region 1 is "play/pause" (taps) or "voice assistant"
// (holds), 2 "volume down", 3 "volume up"; empty for region 0 and for the reset event.
std::string_view eventButtonName(const HIDEvent& event);

// One JSON object without a line end:
// {"frame":<field 0xB001B, null for reset>,"event":<kind>,"region":<y>,"phase":<phase>,"timestamp":<ticks>}
std::string eventJsonLine(const HIDEvent& event);

// One line without a line end, e.g. "  2.416s  frame 1234  tap         region 3  volume up".
std::string eventHumanLine(const HIDEvent& event, double secondsSinceStart);

}  // namespace TolkaTouch::Tools

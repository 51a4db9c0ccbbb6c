#pragma once
// The text form of the events the pipeline hands out for people: one aligned line per event.
// The JSON form for programs is GestureCodec::jsonLine (tolkatouch/Gesture.h).

#include <string>
#include <string_view>

#include "platform/HIDEvent.h"

namespace TolkaTouch::Tools {

// The button an event's zone stands for: region 1 is "play/pause" (taps) or "voice assistant"
// (holds), 2 "volume down", 3 "volume up"; empty for region 0 and for the reset event.
std::string_view eventButtonName(const HIDEvent& event);

// One line without a line end, e.g. "  2.416s  frame 1234  tap         region 3  volume up".
std::string eventHumanLine(const HIDEvent& event, double secondsSinceStart);

}  // namespace TolkaTouch::Tools

#pragma once
// The one-line JSON form of an event that --print writes: the same members, in the same order,
// as the replay tool's --json lines, so the two outputs compare line by line.

#include <string>

#include "platform/HIDEvent.h"

namespace TolkaTouch {

std::string eventJsonLine(const HIDEvent& event);

}  // namespace TolkaTouch

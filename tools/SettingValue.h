#pragma once
// Setting values written on the command line or in a gesture script: the text is read as JSON
// (true, 700, 0.5, "text", [1, 2]) and, when it is not JSON, taken as a plain string.

#include <string>
#include <string_view>
#include <utility>

#include "platform/PropertyValue.h"

namespace TolkaTouch::Tools {

PropertyValue settingValueFromText(std::string_view text);

// "Algs.HoldTimeoutMilliseconds=700" as its key and value; the key ends at the first "=".
// The caller has checked that there is one.
std::pair<std::string, PropertyValue> settingFromAssignment(std::string_view assignment);

}  // namespace TolkaTouch::Tools

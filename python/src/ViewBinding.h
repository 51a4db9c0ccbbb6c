#pragma once
// What the viewer draws besides a replay (the settings table comes from SettingsBinding): where the pixels' pads sit on the
// surface, the virtual pixels' letter groups, and labels read from a file of the engineer's choice.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

void addView(pybind11::module_& module);

}  // namespace TolkaTouch::Python

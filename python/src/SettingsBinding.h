#pragma once
// The settings table and the workbench's metrics as tolkatouch.tune searches them: every
// setting's key, type, default and accepted range, and a named metric of an evaluation, read by
// the code `sweep --metric` ranks with, and an evaluation as eval's table.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

void addSettings(pybind11::module_& module);

}  // namespace TolkaTouch::Python

#pragma once
// tolkatouch._tolkatouch.synth: a gesture script turned into a Recording, as `tolkatouch synth`
// does it.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

void addSynth(pybind11::module_& module);

}  // namespace TolkaTouch::Python

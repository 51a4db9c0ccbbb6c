#pragma once
// tolkatouch._tolkatouch.replay_arrays: plays a recording through a fresh pipeline, as
// `tolkatouch replay --fast` does, and returns its events as one numpy structured array and the
// recognizer's snapshot of every image frame as numpy columns. The Python wrapper
// (tolkatouch.replay) gives them names and docstrings.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

void addReplay(pybind11::module_& module);

}  // namespace TolkaTouch::Python

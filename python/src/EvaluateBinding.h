#pragma once
// The pieces tolkatouch.evaluate spreads over Dask, each the workbench's own (the code behind
// `tolkatouch eval`): a corpus listed, one document read with its labels, one recording scored
// under one settings point, and scores added up. Scores travel as the JSON `eval --json` writes,
// which adds up exactly, so the sum of the parts is the single-process result.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

void addEvaluate(pybind11::module_& module);

}  // namespace TolkaTouch::Python

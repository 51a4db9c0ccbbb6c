// The tolkatouch package's extension module: recordings, replay and synthesis in C++, handed to
// Python as numpy arrays.

#include <pybind11/pybind11.h>

#include "Errors.h"
#include "EvaluateBinding.h"
#include "RecordingBinding.h"
#include "ReplayBinding.h"
#include "SettingsBinding.h"
#include "SynthBinding.h"
#include "ViewBinding.h"

PYBIND11_MODULE(_tolkatouch, module) {
    module.doc() = "The C++ side of the tolkatouch package; use the names tolkatouch exports.";
    TolkaTouch::Python::addErrors(module);
    TolkaTouch::Python::addRecording(module);
    TolkaTouch::Python::addReplay(module);
    TolkaTouch::Python::addSynth(module);
    TolkaTouch::Python::addEvaluate(module);
    TolkaTouch::Python::addSettings(module);
    TolkaTouch::Python::addView(module);
}

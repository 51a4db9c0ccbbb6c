// The tolkatouch package's extension module: recordings, replay and synthesis in C++, handed to
// Python as numpy arrays.

#include <pybind11/pybind11.h>

#include "python/src/Errors.h"
#include "python/src/RecordingBinding.h"
#include "python/src/ReplayBinding.h"
#include "python/src/SynthBinding.h"

PYBIND11_MODULE(_tolkatouch, module) {
    module.doc() = "The C++ side of the tolkatouch package; use the names tolkatouch exports.";
    TolkaTouch::Python::addErrors(module);
    TolkaTouch::Python::addRecording(module);
    TolkaTouch::Python::addReplay(module);
    TolkaTouch::Python::addSynth(module);
}

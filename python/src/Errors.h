#pragma once
// The package's exceptions, each carrying the command line's own message (what `tolkatouch`
// prints after "tolkatouch: "):
//   tolkatouch.Error          base of the three below
//   tolkatouch.DocumentError  a recording document that does not read (also a ValueError)
//   tolkatouch.SettingError   a setting key or value the settings table refuses (also a ValueError)
//   tolkatouch.ScriptError    a gesture script that does not read (also a ValueError)
// A file that cannot be read or written raises OSError with the command line's message.

#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

namespace py = pybind11;

void addErrors(py::module_& module);

// Raised from C++ with the message the command line prints; the translator turns each into its
// Python exception.
struct DocumentFailure : std::runtime_error {
    using std::runtime_error::runtime_error;
};
struct ScriptFailure : std::runtime_error {
    using std::runtime_error::runtime_error;
};
struct FileFailure : std::runtime_error {
    using std::runtime_error::runtime_error;
};

}  // namespace TolkaTouch::Python

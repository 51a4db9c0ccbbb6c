#include "Errors.h"

#include "tolkatouch/Settings.h"

namespace TolkaTouch::Python {

void addErrors(py::module_& module) {
    py::object base = py::reinterpret_steal<py::object>(PyErr_NewExceptionWithDoc(
        "tolkatouch.Error", "Base of the errors of the tolkatouch package; the message is the command line's.",
        nullptr, nullptr));
    if (!base) throw py::error_already_set();
    module.add_object("Error", base);
    py::object valueError = py::reinterpret_borrow<py::object>(PyExc_ValueError);
    // The types live as long as the interpreter: the translator below is never unregistered.
    auto subclass = [&](const char* name, const char* doc) -> PyObject* {
        py::object type = py::reinterpret_steal<py::object>(
            PyErr_NewExceptionWithDoc((std::string("tolkatouch.") + name).c_str(), doc,
                                      py::make_tuple(base, valueError).ptr(), nullptr));
        if (!type) throw py::error_already_set();
        module.add_object(name, type);
        return type.inc_ref().ptr();
    };
    static PyObject* documentError =
        subclass("DocumentError", "A recording document that does not read, with the reader's message.");
    static PyObject* settingError =
        subclass("SettingError", "A setting key or value that the settings table refuses.");
    static PyObject* scriptError = subclass("ScriptError", "A gesture script that does not read.");

    py::register_exception_translator([](std::exception_ptr pointer) {
        try {
            if (pointer) std::rethrow_exception(pointer);
        } catch (const DocumentFailure& failure) {
            PyErr_SetString(documentError, failure.what());
        } catch (const ScriptFailure& failure) {
            PyErr_SetString(scriptError, failure.what());
        } catch (const SettingError& failure) {
            PyErr_SetString(settingError, failure.what());
        } catch (const FileFailure& failure) {
            PyErr_SetString(PyExc_OSError, failure.what());
        }
    });
}

}  // namespace TolkaTouch::Python

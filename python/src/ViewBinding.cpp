#include "ViewBinding.h"

#include <string>

#include <pybind11/stl.h>

#include "algs/VirtualImage.h"
#include "tolkatouch/Settings.h"
#include "tools/FingerModel.h"

#include "Errors.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

namespace {

const char* typeName(SettingType type) {
    switch (type) {
    case SettingType::Boolean: return "boolean";
    case SettingType::Milliseconds: return "milliseconds";
    case SettingType::Float: return "float";
    case SettingType::Action: return "action";
    }
    return "float";
}

}  // namespace

void addView(py::module_& module) {
    module.def(
        "settings_table",
        [] {
            py::list rows;
            for (const Setting& setting : settingsTable()) {
                py::dict row;
                row["key"] = setting.algsKey();
                row["type"] = typeName(setting.type);
                row["default"] = defaultText(setting);
                row["minimum"] = setting.minimum;
                row["maximum"] = setting.maximum;
                row["accepted"] = acceptedValues(setting);
                row["meaning"] = setting.meaning;
                row["tunable"] = setting.tunable();
                rows.append(row);
            }
            return rows;
        },
        "Every setting of the settings table, in its order: dicts of key ('Algs.X'), type, default (as "
        "--set writes it), minimum, maximum, accepted (in words), meaning and tunable.");

    module.def(
        "surface_pads",
        [] {
            py::list pads;
            for (const Tools::Pad& pad : Tools::FingerModel::pads()) pads.append(py::make_tuple(pad.pixel, pad.centre.x, pad.centre.y));
            return pads;
        },
        "[(pixel, x, y)]: where each pad lies on the surface, as the image drawing places it (pixels A-F, J "
        "and L have two pads); x right, y down, origin at pixel K.");

    module.def(
        "virtual_groups", [] { return VirtualImage().groups; },
        "The letters of each of the 23 virtual pixels, in the order of Frames.virtual_values' columns.");

    module.def(
        "attach_labels",
        [](Recording& recording, const std::string& text, const std::string& subject) {
            recording.setLabelsDocument(text, subject);
        },
        py::arg("recording"), py::arg("text"), py::arg("subject"),
        "Gives the recording the labels of a labels document's text; DocumentError naming the subject otherwise.");
}

}  // namespace TolkaTouch::Python

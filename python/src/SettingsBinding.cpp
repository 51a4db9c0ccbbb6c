#include "SettingsBinding.h"

#include <optional>
#include <string>

#include <pybind11/stl.h>

#include "tolkatouch/Settings.h"
#include "tools/EvaluationTable.h"
#include "tools/workbench/EvaluationJson.h"
#include "tools/workbench/Sweep.h"

#include "Errors.h"

namespace TolkaTouch::Python {

namespace py = pybind11;

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

void addSettings(py::module_& module) {
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

    module.def("metric_names", [] { return Workbench::sweepMetricNames(); },
               "The metrics `sweep --metric` ranks by, in its order.");

    module.def("higher_is_better", [](const std::string& name) { return Workbench::higherIsBetter(name); },
               py::arg("name"), "Whether a larger value of the metric is the better one.");

    module.def(
        "metric_value",
        [](const std::string& evaluation, const std::string& name) -> std::optional<double> {
            if (!Workbench::isSweepMetric(name)) throw py::value_error("unknown metric '" + name + "'");
            try {
                return Workbench::metricValue(Workbench::evaluationFromJson(evaluation).counts, name);
            } catch (const Workbench::EvaluationJsonError& error) {
                throw DocumentFailure(std::string("evaluation: ") + error.what());
            }
        },
        py::arg("evaluation"), py::arg("name"),
        "A metric of an evaluation (`eval --json` text), as `sweep --metric` reads it; None where it has no value.");

    module.def(
        "evaluation_table",
        [](const std::string& evaluation) {
            try {
                return Tools::evaluationTable(Workbench::evaluationFromJson(evaluation));
            } catch (const Workbench::EvaluationJsonError& error) {
                throw DocumentFailure(std::string("evaluation: ") + error.what());
            }
        },
        py::arg("evaluation"), "An evaluation (`eval --json` text) as the table `tolkatouch eval` prints.");
}

}  // namespace TolkaTouch::Python

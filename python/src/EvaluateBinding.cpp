#include "EvaluateBinding.h"

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <pybind11/stl.h>

#include "tools/workbench/Evaluation.h"
#include "tools/workbench/EvaluationJson.h"
#include "tools/workbench/Matching.h"
#include "tools/workbench/Sweep.h"

#include "Errors.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

namespace {

std::string jsonText(const Workbench::Evaluation& evaluation) { return Workbench::evaluationJson(evaluation).dump(); }

Workbench::Evaluation emptyEvaluation(const std::vector<std::string>& assignments, int64_t toleranceUs) {
    Workbench::Evaluation evaluation;
    evaluation.toleranceUs = toleranceUs;
    evaluation.settings = Workbench::settingsFromAssignments(assignments);
    return evaluation;
}

}  // namespace

void addEvaluate(py::module_& module) {
    module.def(
        "list_corpus",
        [](const std::vector<std::string>& paths) {
            Workbench::CorpusListing listing;
            {
                py::gil_scoped_release unlocked;
                listing = Workbench::listCorpus(paths);
            }
            std::vector<std::pair<std::string, std::string>> failures;
            for (const auto& failure : listing.failures) failures.emplace_back(failure.path, failure.reason);
            return py::make_tuple(listing.documents, failures);
        },
        py::arg("paths"), "(documents, [(path, reason)]): the documents of files and folders, as `eval` lists them.");

    module.def(
        "load_labelled",
        [](const std::string& path) -> py::tuple {
            Workbench::LoadedCorpus loaded;
            {
                py::gil_scoped_release unlocked;
                loaded = Workbench::loadCorpus({path}, 1);
            }
            if (!loaded.failures.empty()) return py::make_tuple(py::none(), loaded.failures.front().reason);
            Workbench::LoadedRecording& item = loaded.recordings.front();
            Recording recording(std::move(item.recording));
            recording.labels = std::move(item.labels);
            return py::make_tuple(std::move(recording), py::none());
        },
        py::arg("path"),
        "(Recording, None) for a document with fitting labels beside it, (None, reason) otherwise, the reason as "
        "`eval` reports it.");

    module.def("check_settings", [](const std::vector<std::string>& assignments) { Workbench::settingsFromAssignments(assignments); },
               py::arg("settings"), "Raises SettingError for a 'KEY=VALUE' the settings table refuses.");

    module.def(
        "evaluate_recording",
        [](const Recording& recording, const std::vector<std::string>& assignments, int64_t toleranceUs) {
            if (!recording.labels) throw DocumentFailure("the recording has no labels");
            Workbench::Evaluation evaluation = emptyEvaluation(assignments, toleranceUs);
            {
                py::gil_scoped_release unlocked;
                evaluation.counts =
                    Workbench::evaluateRecording(recording.recording(), *recording.labels, evaluation.settings, toleranceUs);
            }
            return jsonText(evaluation);
        },
        py::arg("recording"), py::arg("settings"), py::arg("tolerance_us"),
        "One labelled recording scored under the settings, as `eval --json` text.");

    module.def(
        "evaluate_recording_mismatches",
        [](const Recording& recording, const std::vector<std::string>& assignments, int64_t toleranceUs) {
            if (!recording.labels) throw DocumentFailure("the recording has no labels");
            Workbench::Evaluation evaluation = emptyEvaluation(assignments, toleranceUs);
            std::vector<Workbench::Mismatch> mismatches;
            {
                py::gil_scoped_release unlocked;
                evaluation.counts = Workbench::evaluateRecording(recording.recording(), *recording.labels, evaluation.settings,
                                                                 toleranceUs, &mismatches);
            }
            py::list stretches;
            for (const Workbench::Mismatch& mismatch : mismatches)
                stretches.append(py::make_tuple(std::string(Workbench::mismatchName(mismatch.kind)), mismatch.startUs, mismatch.endUs));
            return py::make_tuple(jsonText(evaluation), stretches);
        },
        py::arg("recording"), py::arg("settings"), py::arg("tolerance_us"),
        "(`eval --json` text, [(kind, start_us, end_us)]): the recording scored under the settings and where its "
        "gestures and labels disagree: missed, false, split, merged, wrong zone.");

    module.def(
        "failed_evaluation",
        [](const std::string& path, const std::string& reason, const std::vector<std::string>& assignments, int64_t toleranceUs) {
            Workbench::Evaluation evaluation = emptyEvaluation(assignments, toleranceUs);
            evaluation.failures.push_back({path, reason});
            return jsonText(evaluation);
        },
        py::arg("path"), py::arg("reason"), py::arg("settings"), py::arg("tolerance_us"),
        "A document that could not be evaluated, as `eval --json` text with no counts.");

    module.def(
        "merge_evaluations",
        [](const std::vector<std::string>& parts) {
            if (parts.empty()) throw py::value_error("no evaluations to add up");
            try {
                Workbench::Evaluation sum = Workbench::evaluationFromJson(parts.front());
                for (size_t i = 1; i < parts.size(); ++i) sum.add(Workbench::evaluationFromJson(parts[i]));
                return jsonText(sum);
            } catch (const Workbench::EvaluationJsonError& error) {
                throw DocumentFailure(std::string("evaluation: ") + error.what());
            }
        },
        py::arg("parts"), "The sum of evaluations (`eval --json` texts), as `eval --merge` adds them.");

    module.def(
        "grid_axis",
        [](const std::string& text) {
            const Workbench::SweepAxis axis = Workbench::parseSweepAxis(text);
            return py::make_tuple(axis.key, axis.texts);
        },
        py::arg("text"), "(key, [value texts]) of KEY=LO:HI:STEP or KEY=A,B,C, as `sweep --grid` reads it.");
}

}  // namespace TolkaTouch::Python

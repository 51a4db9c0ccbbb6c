#include "SynthBinding.h"

#include <optional>
#include <string>
#include <vector>

#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"
#include "tools/workbench/SynthesisLabels.h"

#include "Errors.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

void addSynth(py::module_& module) {
    module.def(
        "synth",
        [](const std::string& script, uint64_t seed, const std::string& finger, double noise) {
            Tools::SynthesisOptions options;
            const auto model = Tools::fingerFromName(finger);
            if (!model) throw py::value_error("finger must be light, normal or heavy, not \"" + finger + "\"");
            options.finger = *model;
            options.noiseDeviation = noise;
            std::optional<PipelineRecording> recording;
            std::vector<Workbench::Label> labels;
            {
                py::gil_scoped_release unlocked;
                Tools::GestureScript parsed;
                try {
                    parsed = Tools::GestureScript::parse(script);
                } catch (const Tools::GestureScriptError& error) {
                    throw ScriptFailure(error.what());
                }
                const Tools::Synthesis synthesis = Tools::synthesize(parsed, seed, options);
                labels = Workbench::labelsOfSynthesis(synthesis);
                recording.emplace(Tools::recordingFromSynthesis(synthesis));
            }
            Recording result(std::move(*recording));
            result.labels = std::move(labels);
            return result;
        },
        py::arg("script"), py::arg("seed") = 1, py::arg("finger") = "normal", py::arg("noise") = 2.0,
        "Synthesises the recording of a gesture script (the text of a script file: tap, hold, slide, brush, wait, "
        "reset, set; one per line), as `tolkatouch synth --seed SEED --finger FINGER --noise NOISE` does, with its "
        "labels (Recording.labels: what each line means to happen). Raises ScriptError with the line that does not "
        "read.");
}

}  // namespace TolkaTouch::Python

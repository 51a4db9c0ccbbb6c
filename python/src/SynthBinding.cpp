#include "SynthBinding.h"

#include <optional>
#include <string>

#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"

#include "Errors.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

void addSynth(py::module_& module) {
    module.def(
        "synth",
        [](const std::string& script, uint64_t seed) {
            std::optional<PipelineRecording> recording;
            {
                py::gil_scoped_release unlocked;
                Tools::GestureScript parsed;
                try {
                    parsed = Tools::GestureScript::parse(script);
                } catch (const Tools::GestureScriptError& error) {
                    throw ScriptFailure(error.what());
                }
                recording.emplace(Tools::recordingFromSynthesis(Tools::synthesize(parsed, seed)));
            }
            return Recording(std::move(*recording));
        },
        py::arg("script"), py::arg("seed") = 1,
        "Synthesises the recording of a gesture script (the text of a script file: tap, hold, slide, brush, wait, "
        "reset, set; one per line), as `tolkatouch synth --seed SEED` does. Raises ScriptError with the line "
        "that does not read.");
}

}  // namespace TolkaTouch::Python

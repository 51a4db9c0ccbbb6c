// tolkatouch synth: turns a gesture script into a recording document.

#include <cstdint>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/DocumentFile.h"
#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"
#include "tools/workbench/Labels.h"
#include "tools/workbench/SynthesisLabels.h"

namespace TolkaTouch::Tools {

namespace {

struct SynthArguments {
    std::string script;
    std::string output = "-";
    uint64_t seed = 1;
    std::string labels;
    std::string finger = "normal";
    double noise = 2.0;
};

void runSynth(const SynthArguments& arguments) {
    const std::vector<uint8_t> text = readFileBytes(arguments.script);
    GestureScript script;
    try {
        script = GestureScript::parse(std::string_view(reinterpret_cast<const char*>(text.data()), text.size()));
    } catch (const GestureScriptError& error) {
        throw ToolError(arguments.script, error.what());
    }
    SynthesisOptions options;
    options.finger = *fingerFromName(arguments.finger);
    options.noiseDeviation = arguments.noise;
    const Synthesis synthesis = synthesize(script, arguments.seed, options);
    PipelineRecording recording = recordingFromSynthesis(synthesis);
    std::vector<uint8_t> document = recording.json();
    document.push_back('\n');
    writeFileBytes(arguments.output, document);
    if (!arguments.labels.empty()) {
        const std::string labels = Workbench::labelsDocument(Workbench::labelsOfSynthesis(synthesis));
        writeFileBytes(arguments.labels, std::vector<uint8_t>(labels.begin(), labels.end()));
    }
}

}  // namespace

void addSynthCommand(CLI::App& app) {
    auto arguments = std::make_shared<SynthArguments>();
    CLI::App* command = app.add_subcommand(
        "synth",
        "Turn a gesture script (tap, hold, slide, brush, wait, reset, set; one per line) into a realistic recording "
        "document.");
    command->add_option("SCRIPT", arguments->script, "Gesture script; - reads standard input")->required();
    command->add_option("-o,--output", arguments->output, "Where to write the document (default: standard output)")
        ->type_name("DOCUMENT");
    command->add_option("--seed", arguments->seed, "Seed of the sensor noise and finger variation (default 1)");
    command->add_option("--labels", arguments->labels,
                        "Also write what each line of the script means to happen, as a labels document for eval "
                        "(DOC.labels.json beside DOC.json)")
        ->type_name("FILE");
    command->add_option("--finger", arguments->finger, "How firmly the finger presses: light, normal (default) or heavy")
        ->check(CLI::IsMember({"light", "normal", "heavy"}));
    command->add_option("--noise", arguments->noise, "Standard deviation of the sensor noise in counts (default 2)")
        ->type_name("COUNTS")
        ->check(CLI::Range(0.0, 100.0));
    command->callback([arguments] { runSynth(*arguments); });
}

}  // namespace TolkaTouch::Tools

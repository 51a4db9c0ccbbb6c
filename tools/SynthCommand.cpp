// tolkatouch synth: turns a gesture script into a recording document.

#include <cstdint>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/DocumentFile.h"
#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"

namespace TolkaTouch::Tools {

namespace {

struct SynthArguments {
    std::string script;
    std::string output = "-";
    uint64_t seed = 1;
};

void runSynth(const SynthArguments& arguments) {
    const std::vector<uint8_t> text = readFileBytes(arguments.script);
    GestureScript script;
    try {
        script = GestureScript::parse(std::string_view(reinterpret_cast<const char*>(text.data()), text.size()));
    } catch (const GestureScriptError& error) {
        throw ToolError(arguments.script, error.what());
    }
    PipelineRecording recording = recordingFromSynthesis(synthesize(script, arguments.seed));
    std::vector<uint8_t> document = recording.json();
    document.push_back('\n');
    writeFileBytes(arguments.output, document);
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
    command->callback([arguments] { runSynth(*arguments); });
}

}  // namespace TolkaTouch::Tools

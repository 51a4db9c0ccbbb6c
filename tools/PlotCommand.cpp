// tolkatouch plot: draws a recording with the tolkatouch Python package (python3 -m
// tolkatouch.plot; PythonModule.h says where the package is looked for).

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/PythonModule.h"

namespace TolkaTouch::Tools {

namespace {

struct PlotArguments {
    std::string document;
    std::string output;
    std::optional<double> from;
    std::optional<double> to;
    std::vector<std::string> settings;
};

[[noreturn]] void runPlot(const PlotArguments& arguments) {
    std::vector<std::string> words{arguments.document, "-o", arguments.output};
    if (arguments.from) words.insert(words.end(), {"--from", std::to_string(*arguments.from)});
    if (arguments.to) words.insert(words.end(), {"--to", std::to_string(*arguments.to)});
    for (const std::string& setting : arguments.settings) words.insert(words.end(), {"--set", setting});
    execPythonModule("tolkatouch.plot", words, "TOLKATOUCH_PLOT_PROG", "tolkatouch plot");
}

}  // namespace

void addPlotCommand(CLI::App& app) {
    auto arguments = std::make_shared<PlotArguments>();
    CLI::App* command = app.add_subcommand(
        "plot",
        "Draw a recording as the recognizer saw it: pixel readings by zone with their on flags, the touch score, the "
        "hand state and active region, and every event, on one time axis (needs the tolkatouch Python package).");
    command->add_option("DOCUMENT", arguments->document, "Recording document to draw")->required();
    command->add_option("-o,--output", arguments->output, "Image to write: .png, .svg or .pdf")
        ->required()
        ->type_name("IMAGE");
    command->add_option("--from", arguments->from, "First second to draw, from the first frame")->type_name("S");
    command->add_option("--to", arguments->to, "Last second to draw, from the first frame")->type_name("S");
    command->add_option("--set", arguments->settings,
                        "Apply a setting before the first frame, as replay --set does (repeatable)")
        ->type_name("KEY=VALUE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command->callback([arguments] { runPlot(*arguments); });
}

}  // namespace TolkaTouch::Tools

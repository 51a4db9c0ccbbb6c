// tolkatouch plot and plot-eval: draw a recording, or evaluations, with the tolkatouch Python
// package (python3 -m tolkatouch.plot, tolkatouch.plot_eval), found as execPythonModule finds it.

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

struct PlotEvalArguments {
    std::string results;
    std::string output;
    std::string kind;
    std::string setting;
    std::string metric;
    std::optional<int> point;
};

[[noreturn]] void runPlot(const PlotArguments& arguments) {
    std::vector<std::string> words{arguments.document, "-o", arguments.output};
    if (arguments.from) words.insert(words.end(), {"--from", std::to_string(*arguments.from)});
    if (arguments.to) words.insert(words.end(), {"--to", std::to_string(*arguments.to)});
    for (const std::string& setting : arguments.settings) words.insert(words.end(), {"--set", setting});
    execPythonModule("plot", words, "TOLKATOUCH_PLOT_PROG", "tolkatouch plot");
}

[[noreturn]] void runPlotEval(const PlotEvalArguments& arguments) {
    std::vector<std::string> words{arguments.results, "-o", arguments.output};
    if (!arguments.kind.empty()) words.insert(words.end(), {"--kind", arguments.kind});
    if (!arguments.setting.empty()) words.insert(words.end(), {"--setting", arguments.setting});
    if (!arguments.metric.empty()) words.insert(words.end(), {"--metric", arguments.metric});
    if (arguments.point) words.insert(words.end(), {"--point", std::to_string(*arguments.point)});
    execPythonModule("plot_eval", words, "TOLKATOUCH_PLOT_PROG", "tolkatouch plot-eval");
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

void addPlotEvalCommand(CLI::App& app) {
    auto arguments = std::make_shared<PlotEvalArguments>();
    CLI::App* command = app.add_subcommand(
        "plot-eval",
        "Draw evaluations (what eval --json, sweep --json or tolkatouch.evaluate writes): the confusion matrix, a metric "
        "against a setting with one line per gesture kind, or a DET-style curve of false rejects against false "
        "activations per hour (needs the tolkatouch Python package).");
    command->add_option("RESULTS", arguments->results, "JSON results to draw")->required();
    command->add_option("-o,--output", arguments->output, "Image to write: .png, .svg or .pdf")
        ->required()
        ->type_name("IMAGE");
    command->add_option("--kind", arguments->kind, "What to draw: confusion (default), metric or det")
        ->check(CLI::IsMember({"confusion", "metric", "det"}));
    command->add_option("--setting", arguments->setting, "The setting on the x axis (default: the first that varies)")
        ->type_name("KEY");
    command->add_option("--metric", arguments->metric, "For --kind metric: F1 (default), Precision or Recall")
        ->check(CLI::IsMember({"F1", "Precision", "Recall"}));
    command->add_option("--point", arguments->point, "The point whose confusion matrix to draw (default 0, a sweep's best)")
        ->type_name("N");
    command->callback([arguments] { runPlotEval(*arguments); });
}

}  // namespace TolkaTouch::Tools

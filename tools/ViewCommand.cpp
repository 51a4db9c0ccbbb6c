// tolkatouch view: a browser viewer of a recording, served on 127.0.0.1 by the tolkatouch Python
// package (python3 -m tolkatouch.view), or one self-contained page of it with --export.

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/PythonModule.h"

namespace TolkaTouch::Tools {

namespace {

struct ViewArguments {
    std::string document;
    std::optional<std::string> labels;
    std::vector<std::string> settings;
    std::optional<int> port;
    bool noBrowser = false;
    std::optional<std::string> exportPath;
    std::optional<double> from;
    std::optional<double> to;
    bool live = false;
    std::optional<std::string> socket;
};

[[noreturn]] void runView(const ViewArguments& arguments) {
    std::vector<std::string> words;
    if (!arguments.document.empty()) words.push_back(arguments.document);
    if (arguments.live) words.emplace_back("--live");
    if (arguments.socket) words.insert(words.end(), {"--socket", *arguments.socket});
    if (arguments.labels) words.insert(words.end(), {"--labels", *arguments.labels});
    for (const std::string& setting : arguments.settings) words.insert(words.end(), {"--set", setting});
    if (arguments.port) words.insert(words.end(), {"--port", std::to_string(*arguments.port)});
    if (arguments.noBrowser) words.emplace_back("--no-browser");
    if (arguments.exportPath) words.insert(words.end(), {"--export", *arguments.exportPath});
    if (arguments.from) words.insert(words.end(), {"--from", std::to_string(*arguments.from)});
    if (arguments.to) words.insert(words.end(), {"--to", std::to_string(*arguments.to)});
    execPythonModule("view", words, "TOLKATOUCH_VIEW_PROG", "tolkatouch view");
}

}  // namespace

void addViewCommand(CLI::App& app) {
    auto arguments = std::make_shared<ViewArguments>();
    CLI::App* command = app.add_subcommand(
        "view",
        "See a recording in the browser: a zoomable timeline of every per-frame number, the surface at one frame with "
        "its snapshot, and what other settings would have done; served on 127.0.0.1 with a token in the URL, which is "
        "the first line printed (needs the tolkatouch Python package). With --live, the running service instead: the "
        "surface at its newest frame and the last 30 s of timeline.");
    command->footer("Example: tolkatouch view --live   (follows the running tolkatouchd)");
    command->add_option("DOCUMENT", arguments->document, "Recording document to view (not with --live)");
    command->add_option("--labels", arguments->labels, "Labels document (default: DOC.labels.json beside it)")
        ->type_name("FILE");
    command->add_option("--set", arguments->settings,
                        "Apply a setting before the first frame, as replay --set does (repeatable)")
        ->type_name("KEY=VALUE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command->add_option("--port", arguments->port, "Port on 127.0.0.1 (default: a free one)")
        ->type_name("N")
        ->check(CLI::Range(0, 65535));
    command->add_flag("--no-browser", arguments->noBrowser, "Print the URL only; open no browser");
    command->add_option("--export", arguments->exportPath,
                        "Write one self-contained page (data and scripts inlined) of a range and exit")
        ->type_name("FILE.html");
    command->add_option("--from", arguments->from, "With --export: first second, from the first frame")->type_name("S");
    command->add_option("--to", arguments->to, "With --export: last second, from the first frame")->type_name("S");
    auto* live = command->add_flag("--live", arguments->live,
                                   "Follow the running tolkatouchd: its newest frame's surface and snapshot and the last "
                                   "30 s of timeline, at most 60 frames a second");
    command->add_option("--socket", arguments->socket,
                        "With --live: tolkatouchd's control socket (default: as tolkatouch watch)")
        ->type_name("PATH")
        ->needs(live);
    command->callback([arguments] {
        if (arguments->document.empty() && !arguments->live) throw CLI::RequiredError("DOCUMENT (or --live)");
        runView(*arguments);
    });
}

}  // namespace TolkaTouch::Tools

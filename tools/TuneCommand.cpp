// tolkatouch tune: searches the recognizer's settings on a labelled corpus with Optuna and scores
// the best point against the defaults on a held-out part, with the tolkatouch Python package
// (python3 -m tolkatouch.tune), which reads every option itself, --help among them.

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/PythonModule.h"

namespace TolkaTouch::Tools {

void addTuneCommand(CLI::App& app) {
    CLI::App* command = app.add_subcommand(
        "tune",
        "Search the settings on a labelled corpus with Optuna (TPE, pruning of hopeless trials, shared studies) and "
        "score the best point against the defaults on recordings the search never saw (needs the tolkatouch Python "
        "package); tune --help lists its options.");
    command->prefix_command();
    command->set_help_flag();
    command->callback([command] {
        std::vector<std::string> arguments = command->remaining();
        execPythonModule("tune", arguments, "TOLKATOUCH_TUNE_PROG", "tolkatouch tune");
    });
}

}  // namespace TolkaTouch::Tools

// tolkatouch: the touch surface's command-line tool. One program with a subcommand per job;
// every subcommand has --help.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "common/NearestWord.h"
#include "tolkatouch/Settings.h"
#include "tolkatouch/VersionText.h"
#include "tools/DocumentFile.h"
#include "common/PrintableText.h"

namespace {

constexpr int kExitFailure = 1;
constexpr int kExitUsage = 2;

// An error line may quote what came from outside: shown with its control characters escaped.
std::string printable(const std::string& text) { return TolkaTouch::printableText(text); }

}  // namespace

int main(int argc, char** argv) {
    using namespace TolkaTouch::Tools;

    CLI::App app{"Replays, synthesises, shows and converts the touch surface's recordings.", "tolkatouch"};
    app.require_subcommand(1);
    app.set_version_flag("--version", TolkaTouch::versionText("tolkatouch"), "Print the version and exit");
    app.failure_message(CLI::FailureMessage::help);

    addReplayCommand(app);
    addSynthCommand(app);
    addShowCommand(app);
    addConvertCommand(app);
    addUhidCommand(app);
    addKeysCommand(app);
    addPropCommand(app);
    addDevicesCommand(app);
    addLogCommand(app);
    addWatchCommand(app);
    addEvalCommand(app);
    addSweepCommand(app);
    addPlotCommand(app);
    addTuneCommand(app);
    addPlotEvalCommand(app);
    addRecordCommand(app);
    addViewCommand(app);

    // A first word that names no subcommand is a typo far more often than anything else.
    if (argc > 1 && argv[1][0] != '-') {
        std::vector<std::string> names;
        for (const CLI::App* command : app.get_subcommands({})) names.push_back(command->get_name());
        if (std::find(names.begin(), names.end(), argv[1]) == names.end()) {
            std::fprintf(stderr, "tolkatouch: unknown subcommand \"%s\" (did you mean \"%s\"?)\n",
                         printable(argv[1]).c_str(), TolkaTouch::nearestWord(argv[1], names).c_str());
            return kExitUsage;
        }
    }

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        // Help is an answer, not an error; anything else the parser refuses is a usage error.
        if (error.get_exit_code() == static_cast<int>(CLI::ExitCodes::Success)) return app.exit(error);
        app.exit(error);
        return kExitUsage;
    } catch (const TolkaTouch::SettingError& error) {
        std::fflush(stdout);
        std::fprintf(stderr, "tolkatouch: %s\n", printable(error.what()).c_str());
        return kExitUsage;
    } catch (const ToolError& error) {
        std::fflush(stdout);
        std::fprintf(stderr, "tolkatouch: %s\n", printable(error.what()).c_str());
        if (!error.detail().empty()) std::fprintf(stderr, "  %s\n", printable(error.detail()).c_str());
        return kExitFailure;
    } catch (const std::exception& error) {
        std::fflush(stdout);
        std::fprintf(stderr, "tolkatouch: %s\n", printable(error.what()).c_str());
        return kExitFailure;
    }
    return 0;
}

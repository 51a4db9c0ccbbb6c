#pragma once
// The subcommands of the tolkatouch program. Each adds itself, with its options and its action,
// to the program's command-line app; main.cpp calls one add function per subcommand.
//
// An action reports a failure by throwing ToolError (DocumentFile.h): main prints it as one line
// "tolkatouch: <what>: <message>" and exits 1. Bad options never reach an action: the parser
// prints the usage and the program exits 2.

namespace CLI {
class App;
}

namespace TolkaTouch::Tools {

void addReplayCommand(CLI::App& app);
void addSynthCommand(CLI::App& app);
void addShowCommand(CLI::App& app);
void addConvertCommand(CLI::App& app);
void addUhidCommand(CLI::App& app);
void addKeysCommand(CLI::App& app);
void addPropCommand(CLI::App& app);
void addDevicesCommand(CLI::App& app);
void addLogCommand(CLI::App& app);
void addWatchCommand(CLI::App& app);
void addEvalCommand(CLI::App& app);
void addSweepCommand(CLI::App& app);
void addPlotCommand(CLI::App& app);
void addTuneCommand(CLI::App& app);
void addPlotEvalCommand(CLI::App& app);
void addRecordCommand(CLI::App& app);
void addViewCommand(CLI::App& app);

}  // namespace TolkaTouch::Tools

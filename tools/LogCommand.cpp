// tolkatouch log [CATEGORY LEVEL]: shows or changes the running service's log levels through
// tolkatouchd's control socket, e.g. `tolkatouch log Algs debug` for the description lines.

#include <cstdio>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "tools/Commands.h"
#include "tools/ControlClient.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

struct LogArguments {
    std::string socket = defaultControlSocketPath();
    std::string category;
    std::string level;
};

void runLog(const LogArguments& arguments) {
    if (arguments.category.empty()) {
        const auto reply = controlRequest(arguments.socket, {{"log", true}}, "log");
        const nlohmann::json levels = reply.value("levels", nlohmann::json::object());
        for (const auto& [category, level] : levels.items()) {
            std::puts(fmt::format("{:<12} {}", category, level.get<std::string>()).c_str());
        }
        std::fflush(stdout);
        return;
    }
    if (arguments.level.empty()) throw ToolError(arguments.category, "a LEVEL is needed after the category");
    controlRequest(arguments.socket, {{"log", arguments.category}, {"level", arguments.level}}, arguments.category);
}

}  // namespace

void addLogCommand(CLI::App& app) {
    auto arguments = std::make_shared<LogArguments>();
    CLI::App* command = app.add_subcommand(
        "log", "Show the running service's log levels, or set the minimum level of one category (\"*\" for all) "
               "until the daemon reads its configuration again.");
    command->add_option("CATEGORY", arguments->category, "HIDService, Algs, Daemon, or * for every category");
    command->add_option("LEVEL", arguments->level, "debug, info, default, error, fault or off");
    command->add_option("--socket", arguments->socket, "tolkatouchd's control socket")->capture_default_str();
    command->callback([arguments] { runLog(*arguments); });
}

}  // namespace TolkaTouch::Tools

// tolkatouch devices: lists the surfaces tolkatouchd serves, through its control socket.

#include <cstdio>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/ControlClient.h"

namespace TolkaTouch::Tools {

namespace {

struct DevicesArguments {
    std::string socket = defaultControlSocketPath();
    bool json = false;
};

void runDevices(const DevicesArguments& arguments) {
    auto reply = controlRequest(arguments.socket, {{"devices", true}}, "devices");
    auto devices = reply.value("devices", nlohmann::json::array());
    if (arguments.json) {
        std::printf("%s\n", devices.dump().c_str());
        return;
    }
    for (const auto& device : devices) {
        std::printf("service %u  %04x:%04x  %s\n", device.value("service", 0u), device.value("vendor", 0u),
                    device.value("product", 0u), device.value("node", std::string()).c_str());
    }
}

}  // namespace

void addDevicesCommand(CLI::App& app) {
    auto arguments = std::make_shared<DevicesArguments>();
    CLI::App* command = app.add_subcommand(
        "devices", "List the surfaces tolkatouchd serves: service number, vendor:product and node, one per line.");
    command->add_option("--socket", arguments->socket, "tolkatouchd's control socket")->capture_default_str();
    command->add_flag("--json", arguments->json, "Print the list as one JSON array");
    command->callback([arguments] { runDevices(*arguments); });
}

}  // namespace TolkaTouch::Tools

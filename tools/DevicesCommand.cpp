// tolkatouch devices: lists the surfaces tolkatouchd serves, through its control socket.

#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/ControlClient.h"
#include "tools/DocumentFile.h"
#include "tools/HexId.h"
#include "tools/UdevSurfaces.h"

namespace TolkaTouch::Tools {

namespace {

struct DevicesArguments {
    std::string socket = defaultControlSocketPath();
    bool json = false;
    std::string vendor = "1209";
    std::string product = "0001";
};

// No daemon answers: the surfaces udev knows of, and a line on standard error that says so.
void listFromUdev(const DevicesArguments& arguments, const std::string& why) {
    const uint16_t vendor = hexId(arguments.vendor, "--vendor");
    const uint16_t product = hexId(arguments.product, "--product");
    const std::vector<UdevSurface> surfaces = udevSurfaces(vendor, product);
    if (surfaces.empty()) {
        std::fprintf(stderr, "tolkatouch: no daemon answers (%s), and udev knows of no surface %04x:%04x\n", why.c_str(),
                     vendor, product);
    } else {
        std::fprintf(stderr, "tolkatouch: no daemon answers (%s); surfaces %04x:%04x that udev knows of:\n",
                     why.c_str(), vendor, product);
    }
    if (arguments.json) {
        auto list = nlohmann::json::array();
        for (const auto& surface : surfaces) {
            list.push_back({{"node", surface.node}, {"vendor", surface.vendor}, {"product", surface.product}, {"served", false}});
        }
        std::printf("%s\n", list.dump().c_str());
        return;
    }
    for (const auto& surface : surfaces) {
        std::printf("not served  %04x:%04x  %s\n", surface.vendor, surface.product, surface.node.c_str());
    }
}

void runDevices(const DevicesArguments& arguments) {
    try {
        ::close(connectControlSocket(arguments.socket));
    } catch (const ToolError& unreachable) {
        listFromUdev(arguments, unreachable.what());
        return;
    }
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
        "devices",
        "List the surfaces tolkatouchd serves: service number, vendor:product and node, one per line. When no daemon "
        "answers, list the surfaces udev knows of and say so.");
    command->add_option("--socket", arguments->socket, "tolkatouchd's control socket")->capture_default_str();
    command->add_flag("--json", arguments->json, "Print the list as one JSON array");
    command->add_option("--vendor", arguments->vendor, "With no daemon: the USB vendor ID to look for in udev, hexadecimal")
        ->type_name("HEX")
        ->capture_default_str();
    command->add_option("--product", arguments->product, "With no daemon: the USB product ID to look for in udev, hexadecimal")
        ->type_name("HEX")
        ->capture_default_str();
    command->callback([arguments] { runDevices(*arguments); });
}

}  // namespace TolkaTouch::Tools

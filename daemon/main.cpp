// tolkatouchd: runs the TolkaTouch HID service plug-in for each connected surface and turns its
// gestures into media keys.

#include <CLI/CLI.hpp>

#include <pthread.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

#include "daemon/Daemon.h"
#include "daemon/Signals.h"
#include "platform/Log.h"
#include "tolkatouch/VersionText.h"

#ifndef TOLKA_DEFAULT_PLUGIN_PATH
#define TOLKA_DEFAULT_PLUGIN_PATH "/usr/local/lib/tolkatouch/tolkatouch-hidservice.so"
#endif
#ifndef TOLKA_PLUGIN_INSTALL_SUBDIR
#define TOLKA_PLUGIN_INSTALL_SUBDIR "lib/tolkatouch"
#endif

namespace {

// The service's runtime directory when systemd gives one, else the conventional place.
std::string defaultSocketPath() {
    std::string directory = "/run/tolkatouch";
    if (const char* runtime = std::getenv("RUNTIME_DIRECTORY"); runtime && *runtime) {
        directory = runtime;
        directory = directory.substr(0, directory.find(':'));  // the first of several
    }
    return directory + "/tolkatouchd.sock";
}

std::string hexId(uint16_t id) {
    char text[8];
    std::snprintf(text, sizeof(text), "%04x", id);
    return text;
}

// A USB ID written as lsusb writes it ("1209"), with or without "0x".
std::string parseUsbId(const std::string& text, uint16_t& id) {
    std::string digits = text.rfind("0x", 0) == 0 || text.rfind("0X", 0) == 0 ? text.substr(2) : text;
    if (digits.empty() || digits.size() > 4 || digits.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos) {
        return "expected a hexadecimal ID of at most four digits, got \"" + text + "\"";
    }
    id = static_cast<uint16_t>(std::stoul(digits, nullptr, 16));
    return {};
}

// The plug-in beside this program first: in the build tree (daemon/ and plugin/ side by side),
// or in a prefix unpacked anywhere (sbin/ beside lib/tolkatouch/); then where it was installed.
std::string defaultPluginPath() {
    namespace fs = std::filesystem;
    std::error_code error;
    const fs::path program = fs::read_symlink("/proc/self/exe", error);
    if (!error) {
        const fs::path here = program.parent_path();
        for (const fs::path& candidate :
             {here / "tolkatouch-hidservice.so", here / ".." / "plugin" / "tolkatouch-hidservice.so",
              here / ".." / "lib" / "tolkatouch" / "tolkatouch-hidservice.so",
              here / ".." / TOLKA_PLUGIN_INSTALL_SUBDIR / "tolkatouch-hidservice.so"}) {
            if (fs::exists(candidate, error)) return candidate.lexically_normal().string();
        }
    }
    return TOLKA_DEFAULT_PLUGIN_PATH;
}

}  // namespace

int main(int argc, char** argv) {
    // Before any thread exists, so that every thread inherits the mask and the signals reach
    // only the daemon's signalfd.
    const sigset_t signals = TolkaTouch::daemonSignals();
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    std::signal(SIGPIPE, SIG_IGN);

    // A service's log is read by people: a message format that repeats quickly is folded.
    TolkaTouch::SystemLog::setRateGuarded(true);
    TolkaTouch::DaemonOptions options;
    options.socketPath = defaultSocketPath();
    std::string vendor = hexId(TolkaTouch::SurfaceIds::kDefaultVendorId);
    std::string product = hexId(TolkaTouch::SurfaceIds::kDefaultProductId);
    bool debug = false;

    CLI::App app{"tolkatouchd: turns the TolkaTouch surface's gestures into media keys.\n"
                 "Taps: region 1 play/pause, region 2 volume down, region 3 volume up. Holds: region 1\n"
                 "voice command, regions 2 and 3 repeat their volume key every 150 ms."};
    app.add_option("--vendor", vendor, "USB vendor ID of the surface, hexadecimal")
        ->type_name("HEX")
        ->capture_default_str();
    app.add_option("--product", product, "USB product ID of the surface, hexadecimal")
        ->type_name("HEX")
        ->capture_default_str();
    bool pluginGiven = false;
    app.add_option_function<std::string>(
           "--plugin",
           [&](const std::string& path) {
               options.pluginPath = path;
               pluginGiven = true;
           },
           "the HID service plug-in library (default: the one beside this program, in a build tree or "
           "an unpacked package, else " TOLKA_DEFAULT_PLUGIN_PATH ")")
        ->type_name("PATH");
    app.add_option("--socket", options.socketPath, "the control socket")->type_name("PATH")->capture_default_str();
    app.add_flag("--print", options.print,
                 "print each event as a JSON line on standard output; keys are still written when the "
                 "virtual keyboard can be made");
    app.add_flag("--no-keys", options.noKeys, "write no keys (with --print: print only)");
    app.add_option("--key-log", options.keyLogPath,
                   "write key events as text lines to FILE instead of the virtual keyboard")
        ->type_name("FILE");
    app.add_option("--uinput", options.uinputPath, "the uinput node")->type_name("PATH")->capture_default_str();
    app.add_option("--simulate", options.simulatePath,
                   "play a recording DOCUMENT as the device, at its recorded pace, instead of looking "
                   "for surfaces; the daemon stops when the document ends")
        ->type_name("DOCUMENT");
    app.add_option("--speed", options.speed, "pace of --simulate: 2 plays twice as fast")
        ->type_name("X")
        ->capture_default_str()
        ->check(CLI::PositiveNumber);
    app.add_flag("--debug", debug, "log at debug level (as --log-level debug)");
    app.add_option("--log-config", options.log.configurationPath,
                   "the log configuration: one \"CATEGORY LEVEL\" per line (default " +
                       std::string(TolkaTouch::kDefaultLogConfigurationPath) + ", if it exists); read again on SIGHUP")
        ->type_name("FILE")
        ->each([&options](const std::string&) { options.log.configurationRequired = true; });
    app.add_option("--log-level", options.log.overrides,
                   "the minimum level of one category, CATEGORY=LEVEL, or of all, LEVEL (debug, info, default, "
                   "error, fault, off); over the configuration and TOLKATOUCH_LOG; repeatable")
        ->type_name("[CATEGORY=]LEVEL");
    app.set_version_flag("--version", TolkaTouch::versionText("tolkatouchd"), "Print the version and exit");
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        // Help and version are answers; anything else the parser refuses is a usage error (2).
        const int answered = app.exit(error);
        return answered == static_cast<int>(CLI::ExitCodes::Success) ? 0 : 2;
    }
    if (!pluginGiven) options.pluginPath = defaultPluginPath();

    if (auto error = parseUsbId(vendor, options.vendor); !error.empty()) {
        std::fprintf(stderr, "tolkatouchd: --vendor: %s\n", error.c_str());
        return 1;
    }
    if (auto error = parseUsbId(product, options.product); !error.empty()) {
        std::fprintf(stderr, "tolkatouchd: --product: %s\n", error.c_str());
        return 1;
    }
    if (const char* environment = std::getenv("TOLKATOUCH_LOG")) options.log.environment = environment;
    if (debug) options.log.overrides.push_back("debug");
    try {
        TolkaTouch::applyLogSettings(options.log);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "tolkatouchd: %s\n", error.what());
        return 2;
    }

    int status = 0;
    try {
        TolkaTouch::Daemon daemon(options, stdout);
        status = daemon.run();
    } catch (const std::exception& error) {
        std::fprintf(stderr, "tolkatouchd: %s\n", error.what());
        status = 1;
    }
    // Everything of the daemon is torn down by now, but a plug-in's report thread may still be
    // writing its last log line after it let its service go: leave without destroying the
    // process's static objects under it.
    std::fflush(nullptr);
    std::_Exit(status);
}

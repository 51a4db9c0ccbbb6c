// tolkatouch uhid DOCUMENT: plugs a virtual surface into the kernel through /dev/uhid and plays
// the document's input reports through it at their recorded spacing, so that everything above
// the kernel (hidraw, udev, the daemon) sees a real HID device.

#include <CLI/CLI.hpp>

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "common/ReportDescriptor.h"
#include "tools/Commands.h"
#include "tools/DocumentFile.h"
#include "tools/VirtualSurface.h"

namespace TolkaTouch::Tools {

namespace {

using Clock = std::chrono::steady_clock;

std::atomic<bool> gStopRequested{false};
std::atomic<bool> gStartRequested{false};

void requestStop(int) { gStopRequested = true; }
void requestStart(int) { gStartRequested = true; }

struct UhidOptions {
    std::string document;
    std::string uhidPath = "/dev/uhid";
    std::string name = "TolkaTouch virtual surface";
    uint16_t vendor = VirtualSurface::kDefaultVendorId;
    uint16_t product = VirtualSurface::kDefaultProductId;
    std::vector<std::string> features;
    std::vector<int> failingReports;
    double destroyAfter = -1;
    double waitOpen = 10;
    double settle = 0.3;
    double linger = 1;
    bool waitSignal = false;
};

template <typename... Args>
void say(const char* format, Args... args) {
    std::printf(format, args...);
    std::fflush(stdout);
}

// Serves the kernel until `until`, or until a stop is requested; false when stopped.
bool serve(VirtualSurface& surface, Clock::time_point until) {
    while (Clock::now() < until) {
        if (gStopRequested) return false;
        surface.serviceUntil(std::min(until, Clock::now() + std::chrono::milliseconds(100)));
    }
    return !gStopRequested;
}

void runUhid(const UhidOptions& options) {
    PipelineRecording recording = loadRecording(options.document);
    std::vector<const PipelineRecording::Frame*> reports;
    for (const auto& frame : recording.frames()) {
        if (frame.type == PipelineRecording::FrameType::InputReport) reports.push_back(&frame);
    }

    VirtualSurface::Options surfaceOptions;
    surfaceOptions.name = options.name;
    surfaceOptions.vendor = options.vendor;
    surfaceOptions.product = options.product;
    try {
        surfaceOptions.featureReports = VirtualSurface::featureReportsWith(options.features);
    } catch (const std::invalid_argument& error) {
        throw ToolError("--feature", error.what());
    }
    for (int id : options.failingReports) surfaceOptions.failingReports.insert(static_cast<uint8_t>(id));

    struct sigaction action {};
    action.sa_handler = requestStop;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
    struct sigaction startAction {};
    startAction.sa_handler = requestStart;
    sigaction(SIGUSR1, &startAction, nullptr);

    std::unique_ptr<VirtualSurface> surface;
    try {
        surface = std::make_unique<VirtualSurface>(surfaceOptions, options.uhidPath);
    } catch (const std::runtime_error& error) {
        throw ToolError("uhid", error.what());
    }
    std::printf("uhid: created \"%s\" %04x:%04x\n", options.name.c_str(), options.vendor, options.product);
    std::fflush(stdout);

    // Reports sent before anyone reads the device are lost, as with a real device plugged in
    // before its driver is ready; wait for a reader, then give it a moment to settle.
    if (options.waitOpen > 0) {
        auto giveUp = Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(options.waitOpen));
        while (!surface->status().everOpened && Clock::now() < giveUp && !gStopRequested) {
            surface->serviceUntil(std::min(giveUp, Clock::now() + std::chrono::milliseconds(100)));
        }
        if (surface->status().everOpened) {
            std::puts("uhid: opened by a reader");
            std::fflush(stdout);
        } else {
            say("uhid: nobody opened the device within %.1f s; playing anyway\n", options.waitOpen);
        }
        serve(*surface, Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(options.settle)));
    }

    if (options.waitSignal) {
        std::puts("uhid: waiting for SIGUSR1");
        std::fflush(stdout);
        while (!gStartRequested && serve(*surface, Clock::now() + std::chrono::milliseconds(50))) {
        }
    }

    const auto start = Clock::now();
    const auto destroyAt = options.destroyAfter >= 0
                               ? start + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(options.destroyAfter))
                               : Clock::time_point::max();
    say("uhid: playing %zu reports\n", reports.size());
    unsigned sent = 0;
    bool destroyed = false;
    for (const auto* frame : reports) {
        auto due = start + std::chrono::nanoseconds(frame->timestamp - reports.front()->timestamp);
        if (due >= destroyAt) {
            if (!serve(*surface, destroyAt)) break;
            destroyed = true;
            break;
        }
        if (!serve(*surface, due)) break;
        surface->sendInputReport(frame->report);
        ++sent;
    }
    if (!destroyed && destroyAt != Clock::time_point::max() && !gStopRequested) {
        destroyed = serve(*surface, destroyAt);
    }
    if (destroyed) {
        surface->destroy();
        say("uhid: destroyed after %.3f s, %u reports sent\n",
            std::chrono::duration<double>(Clock::now() - start).count(), sent);
        return;
    }
    say("uhid: sent %u reports\n", sent);
    if (options.linger < 0) {
        while (serve(*surface, Clock::now() + std::chrono::seconds(1))) {
        }
    } else {
        serve(*surface, Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(options.linger)));
    }
    surface->destroy();
    std::puts("uhid: destroyed");
    std::fflush(stdout);
}

}  // namespace

void addUhidCommand(CLI::App& app) {
    auto options = std::make_shared<UhidOptions>();
    CLI::App* command = app.add_subcommand(
        "uhid",
        "Plugs a virtual surface into the kernel (/dev/uhid) and plays the document's input reports through it "
        "at their recorded spacing. Feature reports are answered from a table: the hold duration 5000 and, for "
        "each diagnostic report, its length of bytes counting up from its ID, unless --feature says otherwise.");
    command->add_option("document", options->document, "Recording document to play (- for standard input)")->required();
    command->add_option("--destroy-after", options->destroyAfter,
                        "Unplug the device this many seconds after the first report, even mid-stream");
    command->add_option("--feature", options->features,
                        "Answer feature report ID with these bytes after the ID: ID=HEX (e.g. 0x1f=88130000)");
    command->add_option("--fail-report", options->failingReports, "Fail every request for this feature report ID")
        ->check(CLI::Range(1, 255));
    command->add_option("--wait-open", options->waitOpen,
                        "Seconds to wait for a reader to open the device before playing (0: play at once)")
        ->capture_default_str();
    command->add_option("--settle", options->settle, "Seconds between the first open and the first report")
        ->capture_default_str();
    command->add_option("--linger", options->linger,
                        "Seconds the device stays after the last report (negative: until interrupted)")
        ->capture_default_str();
    command->add_flag("--wait-signal", options->waitSignal,
                      "Play only once SIGUSR1 arrives (after --wait-open and --settle), so that a script can "
                      "change settings first");
    command->add_option("--vendor", options->vendor, "USB vendor ID")->capture_default_str();
    command->add_option("--product", options->product, "USB product ID")->capture_default_str();
    command->add_option("--name", options->name, "Device name")->capture_default_str();
    command->add_option("--uhid", options->uhidPath, "The kernel's uhid node")->capture_default_str();
    command->callback([options] { runUhid(*options); });
}

}  // namespace TolkaTouch::Tools

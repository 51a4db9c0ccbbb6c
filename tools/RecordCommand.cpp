// tolkatouch record: records a live surface to a line-form recording, as reports arrive.

#include <csignal>
#include <cstdio>
#include <ctime>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <unistd.h>

#include "common/FeatureReports.h"
#include "common/Util.h"
#include "pipeline/Pipeline.h"
#include "platform/HidrawDevice.h"
#include "platform/HostClock.h"
#include "platform/PropertyValueJson.h"
#include "tolkatouch/Gesture.h"
#include "tolkatouch/Settings.h"
#include "tolkatouch/VersionText.h"
#include "tools/Commands.h"
#include "tools/ControlClient.h"
#include "tools/DocumentFile.h"
#include "tools/HexId.h"
#include "tools/RecordOutput.h"
#include "tools/ReportSource.h"
#include "tools/UdevSurfaces.h"

namespace TolkaTouch::Tools {

namespace {

constexpr uint64_t kFlushEveryNs = 1'000'000'000;
constexpr uint64_t kStatusEveryNs = 500'000'000;
constexpr int kWaitMs = 200;

volatile std::sig_atomic_t stopSignal = 0;

void onStopSignal(int signal) { stopSignal = signal; }

struct RecordArguments {
    std::string device;
    std::string vendor = "1209";
    std::string product = "0001";
    std::string output;
    double duration = 0.0;
    uint64_t maxReports = 0;
    std::string rotate;
    bool withEvents = false;
    std::string socket = defaultControlSocketPath();
};

uint64_t nowNs() { return Util::nanosecondsFromMachTime(Host::absoluteTime()); }

uint64_t wallNs() {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1'000'000'000ull + static_cast<uint64_t>(now.tv_nsec);
}

std::string surfacePath(const RecordArguments& arguments) {
    if (!arguments.device.empty()) return arguments.device;
    const uint16_t vendor = hexId(arguments.vendor, "--vendor");
    const uint16_t product = hexId(arguments.product, "--product");
    const std::vector<UdevSurface> surfaces = udevSurfaces(vendor, product);
    if (surfaces.empty()) throw ToolError("record", fmt::format("no surface {:04x}:{:04x} is plugged in (or give --device /dev/hidrawN)", vendor, product));
    return surfaces.front().node;
}

// The device's identity: IDs, report descriptor and the feature reports it answers.
std::optional<RecordingLinesHeader::Device> deviceIdentity(const std::string& path) {
    const std::shared_ptr<HidrawDevice> device = HidrawDevice::create(path);
    if (!device) return std::nullopt;
    RecordingLinesHeader::Device identity;
    identity.vendorId = static_cast<uint32_t>(device->getProperty("VendorID").toUInt64());
    identity.productId = static_cast<uint32_t>(device->getProperty("ProductID").toUInt64());
    const PropertyValue descriptor = device->getProperty("ReportDescriptor");
    if (const PropertyValue::Data* bytes = descriptor.data()) identity.reportDescriptor = *bytes;
    for (const auto& [id, expected] : defaultFeatureReports()) {
        std::vector<uint8_t> buffer(std::max<size_t>(expected.size(), 64));
        buffer[0] = id;
        size_t length = buffer.size();
        if (device->getReport(HIDReportType::Feature, id, buffer.data(), length) == 0) {
            buffer.resize(length);
            identity.featureReports.emplace(id, std::move(buffer));
        }
    }
    return identity;
}

// The running service's settings through its control socket, or the defaults when no service
// answers; says which in `from`.
std::map<std::string, PropertyValue> serviceSettings(const std::string& socket, std::string& from) {
    std::map<std::string, PropertyValue> settings;
    try {
        for (const Setting& setting : settingsTable()) {
            if (!setting.tunable()) continue;
            const nlohmann::json reply = controlRequest(socket, {{"get", setting.propertyKey()}}, setting.propertyKey(), 1.0);
            settings[setting.algsKey()] = PropertyValueJson::fromJson(reply.value("value", nlohmann::json()));
        }
        from = "service at " + socket;
        return settings;
    } catch (const std::exception&) {
        settings.clear();
    }
    for (const Setting& setting : settingsTable()) {
        if (setting.tunable()) settings[setting.algsKey()] = checkSetting(setting.key, defaultText(setting)).value;
    }
    from = "defaults (no service answered at " + socket + ")";
    return settings;
}

std::string isoTime(uint64_t wall) {
    const time_t seconds = static_cast<time_t>(wall / 1'000'000'000ull);
    tm utc{};
    gmtime_r(&seconds, &utc);
    char text[32];
    std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &utc);
    return text;
}

void installStopSignals() {
    struct sigaction action {};
    action.sa_handler = onStopSignal;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0;  // no restart: the wait for the next report ends at once
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
}

void runRecord(const RecordArguments& arguments) {
    std::optional<Rotation> rotation;
    if (!arguments.rotate.empty()) {
        rotation = rotationFromText(arguments.rotate);
        if (!rotation) throw CLI::ValidationError("--rotate", "expected a size (100M, 512K) or a duration (30s, 10min, 1h)");
        if (arguments.output == "-") throw CLI::ValidationError("--rotate", "cannot rotate standard output");
    }
    const std::string path = surfacePath(arguments);
    ReportSource source(path);

    RecordingLinesHeader header;
    header.device = deviceIdentity(path);
    std::string settingsFrom;
    header.settings = serviceSettings(arguments.socket, settingsFrom);
    const uint64_t startNs = nowNs();
    header.recorder = {{"Program", versionText("tolkatouch")}, {"Device", path}, {"Started", isoTime(wallNs())}, {"Settings", settingsFrom}};

    installStopSignals();
    RecordOutput output(arguments.output, rotation.has_value(), header, startNs);

    // The recognizer on the same reports, with the same settings: the gestures it gives are the
    // status line's count and, with --with-events, event lines.
    Pipeline pipeline;
    uint64_t gestures = 0;
    pipeline.hidEventsProbe = [&](const EventList& events) {
        for (const HIDEventRef& event : events) {
            const std::optional<Gesture> gesture = GestureCodec::decode(*event);
            if (gesture && (gesture->kind == GestureKind::Tap || gesture->kind == GestureKind::HoldStart)) ++gestures;
            if (arguments.withEvents) output.writer().writeEvent(Util::nanosecondsFromMachTime(event->timestamp), GestureCodec::jsonLine(*event));
        }
    };
    for (const auto& [key, value] : header.settings) pipeline.setState(key, value);

    const bool terminal = isatty(STDERR_FILENO) == 1;
    uint64_t reports = 0;
    uint64_t lastFlush = startNs;
    uint64_t lastStatus = startNs;
    const uint64_t durationNs = static_cast<uint64_t>(arguments.duration * 1e9);
    std::string gone;
    for (;;) {
        if (stopSignal != 0) break;
        if (arguments.maxReports != 0 && reports >= arguments.maxReports) break;
        const ReportSource::Outcome outcome = source.next(kWaitMs);
        const uint64_t now = nowNs();
        if (outcome.status == ReportSource::Status::Gone) {
            gone = outcome.reason;
            break;
        }
        if (outcome.status == ReportSource::Status::Report) {
            if (rotation && ((rotation->bytes && output.fileBytes() >= *rotation->bytes) ||
                             (rotation->nanoseconds && now - output.fileStartNs() >= *rotation->nanoseconds))) {
                output.rotate(now);
            }
            output.writer().writeInputReport(now, outcome.report.data(), outcome.report.size(), wallNs());
            pipeline.setTime(Util::machTimeFromNanoseconds(now));
            pipeline.handleInputReport(outcome.report.data(), outcome.report.size());
            ++reports;
        }
        if (now - lastFlush >= kFlushEveryNs) {
            output.flush();
            lastFlush = now;
        }
        if (terminal && now - lastStatus >= kStatusEveryNs) {
            const double seconds = static_cast<double>(now - startNs) / 1e9;
            std::fprintf(stderr, "\rrecording %.1f s, %llu reports, %.1f frames/s, %llu gestures, %.1f MB  ", seconds,
                         static_cast<unsigned long long>(reports), seconds > 0 ? static_cast<double>(reports) / seconds : 0.0,
                         static_cast<unsigned long long>(gestures), static_cast<double>(output.totalBytes()) / 1e6);
            std::fflush(stderr);
            lastStatus = now;
        }
        if (durationNs != 0 && now - startNs >= durationNs) break;
    }
    const std::string last = output.currentPath();
    output.close();
    if (terminal) std::fputs("\r\033[K", stderr);
    if (!gone.empty()) throw ToolError(path, gone + "; the recording ends there and is complete in " + (last == "-" ? "standard output" : last));
}

}  // namespace

void addRecordCommand(CLI::App& app) {
    auto arguments = std::make_shared<RecordArguments>();
    CLI::App* command = app.add_subcommand(
        "record",
        "Record a live surface to a line-form recording document (a header line, then one line per report with its "
        "host clock and wall-clock time), written as reports arrive and flushed every second, until SIGINT, SIGTERM, "
        "--duration or --max-reports. Works beside tolkatouchd.");
    command->add_option("--device", arguments->device, "The surface's hidraw node (default: found through udev by its IDs)")
        ->type_name("/dev/hidrawN");
    command->add_option("--vendor", arguments->vendor, "Vendor ID to look for, in hex (default 1209)")->type_name("HEX");
    command->add_option("--product", arguments->product, "Product ID to look for, in hex (default 0001)")->type_name("HEX");
    command->add_option("-o,--output", arguments->output, "Where to write the recording; - for standard output")
        ->type_name("FILE")
        ->required();
    command->add_option("--duration", arguments->duration, "Stop after this many seconds")->type_name("SECONDS")->check(CLI::PositiveNumber);
    command->add_option("--max-reports", arguments->maxReports, "Stop after this many reports")->type_name("N")->check(CLI::PositiveNumber);
    command->add_option("--rotate", arguments->rotate,
                        "Start a new numbered file (FILE.0001.jsonl, ...) at this size (100M, 512K) or after this time (30s, 10min, 1h)")
        ->type_name("SIZE|DURATION");
    command->add_flag("--with-events", arguments->withEvents,
                      "Also store, as event lines, the gestures the recognizer gives on these reports with the recorded settings");
    command->add_option("--socket", arguments->socket, "The daemon's control socket, asked for the settings in force")->type_name("PATH");
    command->callback([arguments] { runRecord(*arguments); });
}

}  // namespace TolkaTouch::Tools

// tolkatouch show: prints a recording's frames: images drawn on the pixel layout, firmware
// events and settings, with times relative to the first frame.

#include <cstdio>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <fmt/ranges.h>
#include <nlohmann/json.hpp>

#include "common/Reports.h"
#include "common/Util.h"
#include "platform/PropertyValueJson.h"
#include "tools/Commands.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

struct ShowArguments {
    std::string document;
    std::optional<uint32_t> frame;
    std::optional<double> fromMs;  // relative to the first frame
    std::optional<double> toMs;
    bool summary = false;
    bool json = false;
    bool raw = false;
};

// One frame as a JSON object, for --json.
nlohmann::json frameJson(const PipelineRecording::Frame& frame, double seconds) {
    using Type = PipelineRecording::FrameType;
    nlohmann::json out{{"time", seconds}};
    if (frame.type == Type::State) {
        out["type"] = "state";
        out["key"] = frame.key;
        out["value"] = frame.value ? nlohmann::json(PropertyValueJson::toJson(*frame.value)) : nlohmann::json();
        return out;
    }
    const uint8_t* bytes = frame.report.data();
    const size_t length = frame.report.size();
    if (auto event = InputReport::FirmwareEvent::parse(bytes, length)) {
        out["type"] = "firmware-event";
        out["event"] = event->event;
        out["context"] = fmt::format("0x{:016x}", event->contextValue());
    } else if (auto image = InputReport::Image::parse(bytes, length)) {
        out["type"] = "image";
        out["frame"] = image->frameNumber;
        out["timeMs"] = image->timeMs;
        out["pixels"] = image->pixels;
        out["rawPixels"] = image->rawPixels;
    } else {
        out["type"] = "report";
        out["bytes"] = Util::hexStringFromBytes(frame.report);
    }
    return out;
}

// What --summary counts.
struct ShowSummary {
    uint64_t images = 0, firmwareEvents = 0, states = 0, otherReports = 0, missedFrames = 0;
    std::optional<uint32_t> firstFrame, lastFrame;
    double firstSeconds = 0, lastSeconds = 0;
    bool any = false;
    std::vector<std::string> settings;

    void add(const PipelineRecording::Frame& frame, double seconds) {
        if (!any) firstSeconds = seconds;
        any = true;
        lastSeconds = seconds;
        using Type = PipelineRecording::FrameType;
        if (frame.type == Type::State) {
            ++states;
            const std::string value = frame.value ? PropertyValueJson::toJson(*frame.value).dump() : std::string("null");
            settings.push_back(fmt::format("{:.3f}s {} = {}", seconds, frame.key, value));
            return;
        }
        if (InputReport::FirmwareEvent::parse(frame.report.data(), frame.report.size())) {
            ++firmwareEvents;
        } else if (auto image = InputReport::Image::parse(frame.report.data(), frame.report.size())) {
            ++images;
            if (lastFrame && image->frameNumber > *lastFrame + 1) missedFrames += image->frameNumber - *lastFrame - 1;
            if (!firstFrame) firstFrame = image->frameNumber;
            lastFrame = image->frameNumber;
        } else {
            ++otherReports;
        }
    }

    std::string text() const {
        std::string out = fmt::format("time {:.3f}s to {:.3f}s ({:.3f}s)\n", firstSeconds, lastSeconds,
                                      lastSeconds - firstSeconds);
        out += fmt::format("images {}", images);
        if (firstFrame) {
            out += fmt::format(" (first frame {}, last frame {}, {} frame numbers skipped)", *firstFrame, *lastFrame,
                               missedFrames);
        }
        out += fmt::format("\nfirmware events {}\nsettings {}\n", firmwareEvents, states);
        if (otherReports) out += fmt::format("other reports {}\n", otherReports);
        for (const std::string& setting : settings) out += "  " + setting + "\n";
        return out;
    }

    nlohmann::json json() const {
        nlohmann::json out{{"from", firstSeconds},   {"to", lastSeconds},           {"images", images},
                           {"firmwareEvents", firmwareEvents}, {"settings", states}, {"otherReports", otherReports},
                           {"missedFrames", missedFrames}};
        if (firstFrame) {
            out["firstFrame"] = *firstFrame;
            out["lastFrame"] = *lastFrame;
        }
        return out;
    }
};

std::string describeFrame(const PipelineRecording::Frame& frame, bool raw) {
    using Type = PipelineRecording::FrameType;
    if (frame.type == Type::State) {
        const std::string value = frame.value ? PropertyValueJson::toJson(*frame.value).dump() : std::string("(no value)");
        return "state " + frame.key + " = " + value + "\n";
    }
    if (frame.type != Type::InputReport) return "frame of unknown type\n";
    const uint8_t* bytes = frame.report.data();
    const size_t length = frame.report.size();
    if (auto event = InputReport::FirmwareEvent::parse(bytes, length)) {
        return fmt::format("firmware event {}{}, context 0x{:016x}\n", event->event,
                           event->event == InputReport::FirmwareEvent::kReset ? " (reset)" : "", event->contextValue());
    }
    // The drawing starts with its own "# Image frame" line; a blank line sets it off from the next.
    if (auto image = InputReport::Image::parse(bytes, length)) return Util::stringFromImage(*image, raw) + "\n";
    return fmt::format("report of {} bytes that is neither an image nor a firmware event: ", length) +
           Util::hexStringFromBytes(frame.report) + "\n";
}

void runShow(const ShowArguments& arguments) {
    // Frames are shown as they are read: a recording of any length shows in the memory of one.
    RecordingFile file(arguments.document);
    PipelineRecording::Frame frame;
    std::optional<uint64_t> first;
    bool shown = false;
    ShowSummary summary;
    while (file.next(frame)) {
        if (!first) first = frame.timestamp;
        if (arguments.frame) {
            if (frame.type != PipelineRecording::FrameType::InputReport) continue;
            const auto image = InputReport::Image::parse(frame.report.data(), frame.report.size());
            if (!image || image->frameNumber != *arguments.frame) continue;
        }
        // Signed: a frame stamped before the first one shows as negative.
        const double seconds = static_cast<double>(static_cast<int64_t>(frame.timestamp - *first)) / 1e9;
        if (arguments.fromMs && seconds * 1000.0 < *arguments.fromMs) continue;
        if (arguments.toMs && seconds * 1000.0 > *arguments.toMs) continue;
        shown = true;
        if (arguments.summary) {
            summary.add(frame, seconds);
            continue;
        }
        const std::string text = arguments.json ? frameJson(frame, seconds).dump() + "\n"
                                                : fmt::format("@ {:.3f}s  ", seconds) + describeFrame(frame, arguments.raw);
        std::fputs(text.c_str(), stdout);
    }
    if (!first) return;  // an empty recording shows nothing
    if (arguments.summary) {
        const std::string text = arguments.json ? summary.json().dump() + "\n" : summary.text();
        std::fputs(text.c_str(), stdout);
    }
    std::fflush(stdout);
    if (arguments.frame && !shown) throw ToolError(arguments.document, "no image frame " + std::to_string(*arguments.frame));
}

}  // namespace

void addShowCommand(CLI::App& app) {
    auto arguments = std::make_shared<ShowArguments>();
    CLI::App* command = app.add_subcommand(
        "show",
        "Print a recording's frames in order: each image drawn on the surface's pixel layout, firmware events and "
        "settings, with times relative to the first frame.");
    command->add_option("DOCUMENT", arguments->document, "Recording document; - reads standard input")->required();
    command->add_option("--frame", arguments->frame, "Show only the image with this frame number")->type_name("N");
    command->add_option("--from", arguments->fromMs, "Show only what comes this many milliseconds after the first frame or later")
        ->type_name("MS");
    command->add_option("--to", arguments->toMs, "Show only what comes up to this many milliseconds after the first frame")
        ->type_name("MS");
    command->add_flag("--summary", arguments->summary,
                      "Print counts, the time span, frame numbers missing and the settings instead of the frames");
    command->add_flag("--json", arguments->json, "Print one JSON object per frame (with --summary: one for the summary)");
    command->add_flag("--raw", arguments->raw, "Draw the unsigned raw readings instead of the signed ones");
    command->callback([arguments] { runShow(*arguments); });
}

}  // namespace TolkaTouch::Tools

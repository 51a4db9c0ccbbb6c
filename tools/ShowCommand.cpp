// tolkatouch show: prints a recording's frames: images drawn on the pixel layout, firmware
// events and settings, with times relative to the first frame.

#include <cstdio>
#include <memory>
#include <optional>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

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
    bool raw = false;
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
    const PipelineRecording recording = loadRecording(arguments.document);
    const auto& frames = recording.frames();
    if (frames.empty()) return;
    const uint64_t first = frames.front().timestamp;
    bool shown = false;
    for (const PipelineRecording::Frame& frame : frames) {
        if (arguments.frame) {
            if (frame.type != PipelineRecording::FrameType::InputReport) continue;
            const auto image = InputReport::Image::parse(frame.report.data(), frame.report.size());
            if (!image || image->frameNumber != *arguments.frame) continue;
        }
        // Signed: a frame stamped before the first one shows as negative.
        const double seconds = static_cast<double>(static_cast<int64_t>(frame.timestamp - first)) / 1e9;
        const std::string text = fmt::format("@ {:.3f}s  ", seconds) + describeFrame(frame, arguments.raw);
        std::fputs(text.c_str(), stdout);
        shown = true;
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
    command->add_flag("--raw", arguments->raw, "Draw the unsigned raw readings instead of the signed ones");
    command->callback([arguments] { runShow(*arguments); });
}

}  // namespace TolkaTouch::Tools

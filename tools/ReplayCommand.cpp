// tolkatouch replay: plays a recording document through a fresh pipeline and prints its events.

#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <CLI/CLI.hpp>

#include "platform/Log.h"
#include "tolkatouch/Gesture.h"
#include "tolkatouch/Settings.h"
#include "tools/Commands.h"
#include "tools/DocumentFile.h"
#include "tools/EventPrinter.h"
#include "tools/ReplayProgress.h"
#include "tools/Replayer.h"
#include "tools/SampleRecording.h"
#include "tools/SettingsFile.h"
#include "tools/StatsPrinter.h"

namespace TolkaTouch::Tools {

namespace {

struct ReplayArguments {
    std::string document;
    float speed = 1.0f;
    bool fast = false;
    bool json = false;
    std::vector<std::string> settings;
    std::vector<std::string> settingsFiles;
    bool describe = false;
    bool stats = false;
};

// Seconds from the first frame of the document at `path` to its last, read in a pass of its own.
double documentSeconds(const std::string& path) {
    RecordingFile file(path);
    PipelineRecording::Frame frame;
    if (!file.next(frame)) return 0.0;
    const uint64_t first = frame.timestamp;
    uint64_t last = first;
    while (file.next(frame)) last = frame.timestamp;
    return static_cast<double>(static_cast<int64_t>(last - first)) / 1e9;
}

// The replayer, and the recording's length in seconds when the progress line wants it. A file is
// played as it is read, a frame at a time, so a recording of any length replays in the memory of
// one frame; the progress line reads the file once more for its length beforehand. Standard input
// cannot be read twice, so a paced replay of it on a terminal holds it whole, as does the small
// built-in sample.
struct ReplaySource {
    Replayer replayer;
    double seconds = 0.0;
};

ReplaySource replaySource(const std::string& document, bool wantSeconds) {
    if (document.empty()) {
        const std::string_view sample = sampleRecordingDocument();
        PipelineRecording recording =
            recordingFromDocument(std::vector<uint8_t>(sample.begin(), sample.end()), kSampleRecordingName);
        const double seconds = recordingSeconds(recording);
        return {Replayer(std::move(recording)), seconds};
    }
    if (wantSeconds && document == "-") {
        PipelineRecording recording = loadRecording(document);
        const double seconds = recordingSeconds(recording);
        return {Replayer(std::move(recording)), seconds};
    }
    const double seconds = wantSeconds ? documentSeconds(document) : 0.0;
    auto file = std::make_shared<RecordingFile>(document);
    return {Replayer([file](PipelineRecording::Frame& frame) { return file->next(frame); }), seconds};
}

void runReplay(const ReplayArguments& arguments) {
    // Position and time left on a terminal, for a paced replay only.
    const bool showProgress = !arguments.fast && ::isatty(STDERR_FILENO);
    ReplaySource source = replaySource(arguments.document, showProgress);
    Replayer& replayer = source.replayer;
    ReplayProgress progress(source.seconds, arguments.speed, showProgress);

    ReplayOptions options;
    options.speed = arguments.speed;
    options.fast = arguments.fast;
    options.sleep = progress.sleeper();
    options.onPauseCut = [&progress](uint64_t microseconds) {
        progress.clear();
        std::fflush(stdout);
        std::fprintf(stderr, "tolkatouch: a pause of %.1f s in the recording is cut to %.0f s\n",
                     static_cast<double>(microseconds) / 1e6, static_cast<double>(kMaxReplayPauseMicroseconds) / 1e6);
    };
    for (const std::string& assignment : settingsWithFiles(arguments.settingsFiles, arguments.settings)) {
        const CheckedSetting checked = checkSettingAssignment(assignment);
        options.settings.emplace_back(checked.setting->algsKey(), checked.value);
    }

    if (arguments.describe) {
        SystemLog::setDefaultDestination(SystemLog::Destination::StandardError);
        SystemLog::setDebugEnabled(true);
    }

    // Lines go out as the events happen, also when standard output is a pipe.
    replayer.run(options, [&](const HIDEvent& event) {
        progress.clear();
        const std::string line =
            arguments.json ? GestureCodec::jsonLine(event) : eventHumanLine(event, replayer.secondsSinceStart(event));
        std::fputs(line.c_str(), stdout);
        std::fputc('\n', stdout);
        if (!arguments.fast) std::fflush(stdout);
    });

    progress.clear();
    if (arguments.stats) {
        const std::string stats = arguments.json ? statsJsonLine(replayer.pipeline()) + "\n" : statsTable(replayer.pipeline());
        std::fputs(stats.c_str(), stdout);
    }
    std::fflush(stdout);
}

}  // namespace

void addReplayCommand(CLI::App& app) {
    auto arguments = std::make_shared<ReplayArguments>();
    CLI::App* command = app.add_subcommand(
        "replay",
        "Play a recording document through a fresh pipeline and print every event it produces. Without DOCUMENT, "
        "plays the built-in sample recording.");
    command->add_option("DOCUMENT", arguments->document, "Recording document to play; - reads standard input");
    CLI::Option* speed = command->add_option("--speed", arguments->speed, "Playback speed factor (default 1.0: as recorded)")
                             ->type_name("X")
                             ->check(CLI::Validator(
                                 [](std::string& text) {
                                     float value = 0.0f;
                                     return CLI::detail::lexical_cast(text, value) && value >= kMinReplaySpeed &&
                                                    value <= kMaxReplaySpeed
                                                ? std::string()
                                                : std::string("the speed must be a number from 0.01 to 1000");
                                 },
                                 ""));
    command->add_flag("--fast", arguments->fast, "Deliver every frame at once, without pacing")->excludes(speed);
    command->add_flag("--json", arguments->json, "Print one JSON object per event");
    command->add_option("--set", arguments->settings,
                        "Apply a setting before the first frame, e.g. Algs.HoldTimeoutMilliseconds=700; VALUE is read "
                        "as JSON, otherwise as a string (repeatable)")
        ->type_name("KEY=VALUE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
        ->check(CLI::Validator(
            [](std::string& text) { return text.find('=') == std::string::npos ? std::string("expected KEY=VALUE") : std::string(); },
            ""));
    command->add_option("--settings", arguments->settingsFiles,
                        "Apply the settings of a file, one KEY=VALUE a line (tune --write-settings writes one), before "
                        "the --set ones (repeatable)")
        ->type_name("FILE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command->add_flag("--describe", arguments->describe,
                      "Enable the debug level of the system log: per-frame statistics and descriptions go to standard error");
    command->add_flag("--stats", arguments->stats, "End with the pipeline's counters and the event statistics");
    command->callback([arguments] { runReplay(*arguments); });
}

}  // namespace TolkaTouch::Tools

// tolkatouch replay: plays a recording document through a fresh pipeline and prints its events.

#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>
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

PipelineRecording recordingToReplay(const std::string& document) {
    if (!document.empty()) return loadRecording(document);
    const std::string_view sample = sampleRecordingDocument();
    return recordingFromDocument(std::vector<uint8_t>(sample.begin(), sample.end()), kSampleRecordingName);
}

void runReplay(const ReplayArguments& arguments) {
    PipelineRecording recording = recordingToReplay(arguments.document);
    // Position and time left on a terminal, for a paced replay only.
    ReplayProgress progress(recordingSeconds(recording), arguments.speed, !arguments.fast && ::isatty(STDERR_FILENO));
    Replayer replayer(std::move(recording));

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

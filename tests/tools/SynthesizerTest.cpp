// The synthesiser writes realistic documents, the same for the same script and seed, and what it
// writes is recognised as the script meant it: every line of every example script, and of a
// script that tries every gesture in every zone, yields exactly its gesture's events.

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "common/Reports.h"
#include "tolkatouch/Gesture.h"
#include "tools/GestureScript.h"
#include "tools/Replayer.h"
#include "tools/Synthesizer.h"

namespace TolkaTouch::Tools {
namespace {

constexpr uint32_t kHoldTimeoutMs = 500;
constexpr uint32_t kMarginMs = 60;  // a hold must outlast the timeout by this much to be meant as one

std::string readText(const std::string& path) {
    std::ifstream file(path);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

struct SeenEvent {
    std::string kind;
    int region = 0;
    uint64_t timestamp = 0;
    bool operator==(const SeenEvent& other) const { return kind == other.kind && region == other.region; }
};

std::ostream& operator<<(std::ostream& out, const SeenEvent& event) { return out << event.kind << " " << event.region; }

// Writes the synthesis as a document and replays it the way `tolkatouch replay --fast` does.
std::vector<SeenEvent> replayedEvents(const Synthesis& synthesis) {
    const std::vector<uint8_t> document = recordingFromSynthesis(synthesis).json();
    Replayer replayer{PipelineRecording(&document)};
    std::vector<SeenEvent> events;
    ReplayOptions options;
    options.fast = true;
    replayer.run(options, [&](const HIDEvent& event) {
        events.push_back(SeenEvent{std::string(GestureCodec::kindName(event)), static_cast<int>(event.y), event.timestamp});
    });
    return events;
}

int region(Zone zone) { return static_cast<int>(regionOfZone(zone)); }

// The events one touch gesture stands for.
std::vector<SeenEvent> touchEvents(const Gesture& gesture) {
    switch (gesture.kind) {
    case GestureKind::Tap: return {{"may-begin", region(gesture.zone)}, {"tap", region(gesture.zone)}};
    case GestureKind::Hold:
        return {{"may-begin", region(gesture.zone)}, {"hold-start", region(gesture.zone)}, {"hold-end", region(gesture.zone)}};
    case GestureKind::Slide: {
        std::vector<SeenEvent> events = {{"may-begin", region(gesture.zone)}, {"hold-start", region(gesture.zone)}};
        // Between volume up and volume down the finger crosses the play/pause zone in the middle.
        if (gesture.zone != Zone::PlayPause && gesture.toZone != Zone::PlayPause) {
            events.push_back({"hold-change", region(Zone::PlayPause)});
        }
        events.push_back({"hold-change", region(gesture.toZone)});
        events.push_back({"hold-end", region(gesture.toZone)});
        return events;
    }
    case GestureKind::Brush: return {{"may-begin", region(gesture.zone)}, {"cancel", 0}};
    case GestureKind::Reset: return {{"reset", 0}};
    default: return {};
    }
}

// Checks each time-taking line against the events stamped while it lasted (until the next such
// line starts). Resets placed inside a hold split it into holds, each ended by the reset.
void expectRecognisedAsIntended(const std::string& name, const GestureScript& script, uint64_t seed) {
    const Synthesis synthesis = synthesize(script, seed);
    const std::vector<SeenEvent> events = replayedEvents(synthesis);

    std::vector<size_t> timed;  // lines that take time, in order
    for (size_t i = 0; i < synthesis.spans.size(); ++i) {
        const Gesture& gesture = synthesis.spans[i].gesture;
        if (gesture.kind == GestureKind::Set || (gesture.kind == GestureKind::Reset && gesture.hasOffset)) continue;
        timed.push_back(i);
    }
    size_t checkedEvents = 0;
    for (size_t t = 0; t < timed.size(); ++t) {
        const GestureSpan& span = synthesis.spans[timed[t]];
        const uint64_t end = t + 1 < timed.size() ? synthesis.spans[timed[t + 1]].startNs : UINT64_MAX;

        std::vector<SeenEvent> expected;
        std::vector<uint32_t> cuts;  // offsets of resets inside this gesture
        for (size_t i = timed[t] + 1; i < synthesis.spans.size() && (t + 1 == timed.size() || i < timed[t + 1]); ++i) {
            const Gesture& inner = synthesis.spans[i].gesture;
            if (inner.kind == GestureKind::Reset && inner.hasOffset) cuts.push_back(inner.durationMs);
        }
        if (cuts.empty()) {
            expected = touchEvents(span.gesture);
        } else {
            ASSERT_EQ(span.gesture.kind, GestureKind::Hold) << name << " line " << span.gesture.line;
            uint32_t pieceStart = 0;
            cuts.push_back(span.gesture.durationMs);
            for (size_t c = 0; c < cuts.size(); ++c) {
                ASSERT_GT(cuts[c] - pieceStart, kHoldTimeoutMs + kMarginMs)
                    << name << " line " << span.gesture.line << ": every piece of a hold cut by resets must be a hold";
                const std::vector<SeenEvent> hold = touchEvents(span.gesture);
                expected.insert(expected.end(), hold.begin(), hold.end());
                if (c + 1 < cuts.size()) expected.push_back({"reset", 0});
                pieceStart = cuts[c];
            }
        }

        std::vector<SeenEvent> seen;
        for (const SeenEvent& event : events) {
            if (event.timestamp >= span.startNs && event.timestamp < end) seen.push_back(event);
        }
        checkedEvents += seen.size();
        EXPECT_EQ(seen, expected) << name << " (seed " << seed << ") line " << span.gesture.line << ": "
                                  << gestureKindName(span.gesture.kind);
    }
    EXPECT_EQ(checkedEvents, events.size()) << name << ": events before the first gesture";
}

void expectExampleRecognisedAsIntended(const std::string& name, uint64_t seed = 1) {
    const GestureScript script = GestureScript::parse(readText(std::string(TOLKA_EXAMPLES_DIR) + "/" + name + ".txt"));
    expectRecognisedAsIntended(name, script, seed);
}

// Every gesture in every zone, with durations from the short to the long end of each kind.
const char* const kEveryGesture = R"(
wait 300ms
tap play-pause 60ms
wait 1s
tap volume-up 200ms
wait 1s
tap volume-down 300ms
wait 1s
hold play-pause 650ms
wait 1s
hold volume-up 3s
wait 1s
hold volume-down 1.5s
wait 1s
brush play-pause 200ms
wait 1s
brush volume-up 400ms
wait 1s
brush volume-down 300ms
wait 1s
slide play-pause volume-up 1.4s
wait 1s
slide play-pause volume-down 2s
wait 1s
slide volume-up play-pause 1.2s
wait 1s
slide volume-down play-pause 1.6s
wait 1s
slide volume-up volume-down 1.6s
wait 1s
slide volume-down volume-up 2.5s
wait 1s
reset
wait 1s
hold play-pause 2s
reset 1s
wait 1s
)";

TEST(SynthesizerTest, EverydaySessionExampleIsRecognisedLineByLine) { expectExampleRecognisedAsIntended("everyday-session"); }

TEST(SynthesizerTest, ResetDuringHoldExampleIsRecognisedLineByLine) { expectExampleRecognisedAsIntended("reset-during-hold"); }

TEST(SynthesizerTest, VersionZeroExampleScriptIsRecognisedLineByLine) { expectExampleRecognisedAsIntended("version0-session"); }

TEST(SynthesizerTest, EveryGestureInEveryZoneIsRecognisedWhateverTheSeed) {
    const GestureScript script = GestureScript::parse(kEveryGesture);
    for (uint64_t seed = 1; seed <= 12; ++seed) expectRecognisedAsIntended("every gesture", script, seed);
}

TEST(SynthesizerTest, SameScriptAndSeedGiveTheSameDocument) {
    const GestureScript script = GestureScript::parse("tap volume-up 120ms\nwait 200ms\n");
    EXPECT_EQ(recordingFromSynthesis(synthesize(script, 7)).json(), recordingFromSynthesis(synthesize(script, 7)).json());
    EXPECT_NE(recordingFromSynthesis(synthesize(script, 7)).json(), recordingFromSynthesis(synthesize(script, 8)).json());
}

TEST(SynthesizerTest, ImageReportsAreNumberedAndTimedLikeTheFirmwares) {
    const Synthesis synthesis = synthesize(GestureScript::parse("wait 100ms\n"), 1);
    ASSERT_GT(synthesis.frames.size(), 10u);
    EXPECT_EQ(synthesis.frames.front().timestamp / 1'000'000'000, kSynthesisStartNs / 1'000'000'000);
    std::optional<InputReport::Image> previous;
    uint64_t previousTimestamp = 0;
    for (const PipelineRecording::Frame& frame : synthesis.frames) {
        ASSERT_EQ(frame.type, PipelineRecording::FrameType::InputReport);
        ASSERT_EQ(frame.report.size(), 73u);
        const auto image = InputReport::Image::parse(frame.report.data(), frame.report.size());
        ASSERT_TRUE(image);
        EXPECT_EQ(image->aux0 | image->aux1 | image->aux2 | image->aux3, 0);
        if (previous) {
            EXPECT_EQ(image->frameNumber, previous->frameNumber + 1);
            EXPECT_EQ(image->timeMs, previous->timeMs + kFramePeriodMs);
            // Arrival jitter: never more than a millisecond off the firmware's 8 ms.
            EXPECT_GT(frame.timestamp - previousTimestamp, 7'000'000u);
            EXPECT_LT(frame.timestamp - previousTimestamp, 9'000'000u);
        }
        for (size_t pixel = 0; pixel < kPixelCount; ++pixel) {
            // Nothing on the surface: noise of a few counts around the baseline.
            EXPECT_LT(std::abs(image->pixels[pixel]), 20) << "pixel " << pixel;
            EXPECT_EQ(static_cast<int>(image->rawPixels[pixel]) - image->pixels[pixel],
                      static_cast<int>(previous ? previous->rawPixels[pixel] - previous->pixels[pixel]
                                                : image->rawPixels[pixel] - image->pixels[pixel]));
        }
        previous = image;
        previousTimestamp = frame.timestamp;
    }
}

TEST(SynthesizerTest, ResetIsAFirmwareEventFollowedByFramesNumberedFromZero) {
    const Synthesis synthesis = synthesize(GestureScript::parse("wait 100ms\nreset\nwait 100ms\n"), 1);
    auto reset = std::find_if(synthesis.frames.begin(), synthesis.frames.end(), [](const PipelineRecording::Frame& frame) {
        return frame.report.size() == 10;
    });
    ASSERT_NE(reset, synthesis.frames.end());
    EXPECT_EQ(reset->report, (std::vector<uint8_t>{2, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    ASSERT_NE(reset + 1, synthesis.frames.end());
    const auto after = InputReport::Image::parse((reset + 1)->report.data(), (reset + 1)->report.size());
    ASSERT_TRUE(after);
    EXPECT_EQ(after->frameNumber, 0u);
    EXPECT_EQ(after->timeMs, 0u);
    // The controller is silent while it restarts.
    EXPECT_GE((reset + 1)->timestamp - reset->timestamp, 40'000'000u);
}

TEST(SynthesizerTest, SetBecomesAStateFrameAtItsPlaceInTime) {
    const Synthesis synthesis = synthesize(GestureScript::parse("wait 100ms\nset Algs.HoldTimeoutMilliseconds 700\nwait 100ms\n"), 1);
    auto state = std::find_if(synthesis.frames.begin(), synthesis.frames.end(), [](const PipelineRecording::Frame& frame) {
        return frame.type == PipelineRecording::FrameType::State;
    });
    ASSERT_NE(state, synthesis.frames.end());
    EXPECT_EQ(state->key, "Algs.HoldTimeoutMilliseconds");
    ASSERT_TRUE(state->value);
    EXPECT_EQ(*state->value, PropertyValue(700u));
    EXPECT_GT(state->timestamp, (state - 1)->timestamp);
    EXPECT_LT(state->timestamp, (state + 1)->timestamp);
    ASSERT_EQ(synthesis.spans.size(), 3u);
    EXPECT_EQ(synthesis.spans[1].startNs, synthesis.spans[1].endNs);
}

TEST(SynthesizerTest, SettingWrittenInTheScriptChangesTheOutcome) {
    const Synthesis synthesis =
        synthesize(GestureScript::parse("wait 300ms\nset Algs.HoldTimeoutMilliseconds 1000\nhold volume-up 700ms\nwait 1s\n"), 1);
    const std::vector<SeenEvent> events = replayedEvents(synthesis);
    EXPECT_EQ(events, (std::vector<SeenEvent>{{"may-begin", 3}, {"tap", 3}}));
}

}  // namespace
}  // namespace TolkaTouch::Tools

namespace TolkaTouch::Tools {
namespace {

// The kinds of the events a replay of the synthesis gives, without writing a document.
std::vector<std::string> replayedKinds(const Synthesis& synthesis) {
    Replayer replayer(recordingFromSynthesis(synthesis));
    std::vector<std::string> kinds;
    ReplayOptions options;
    options.fast = true;
    replayer.run(options, [&](const HIDEvent& event) { kinds.emplace_back(GestureCodec::kindName(event)); });
    return kinds;
}

TEST(SynthesizerTest, NoBrushFrom20To120MillisecondsIsATapInAnyZoneForSeeds1To50) {
    for (const char* zone : {"play-pause", "volume-up", "volume-down"}) {
        for (int duration = 20; duration <= 120; ++duration) {
            const GestureScript script = GestureScript::parse("brush " + std::string(zone) + " " + std::to_string(duration) + "ms\n");
            for (uint64_t seed = 1; seed <= 50; ++seed) {
                const std::vector<std::string> kinds = replayedKinds(synthesize(script, seed));
                ASSERT_EQ(std::count(kinds.begin(), kinds.end(), "tap"), 0) << zone << " " << duration << "ms seed " << seed;
            }
        }
    }
}

TEST(SynthesizerTest, BrushLongEnoughToGrazeIsSeenAndTurnedDown) {
    const std::vector<std::string> turnedDown{"may-begin", "cancel"};
    for (const char* zone : {"play-pause", "volume-up", "volume-down"}) {
        for (int duration : {64, 80, 100, 120, 200, 400}) {
            const GestureScript script = GestureScript::parse("brush " + std::string(zone) + " " + std::to_string(duration) + "ms\n");
            for (uint64_t seed = 1; seed <= 10; ++seed) {
                EXPECT_EQ(replayedKinds(synthesize(script, seed)), turnedDown) << zone << " " << duration << "ms seed " << seed;
            }
        }
    }
}

TEST(SynthesizerTest, BrushTooShortToGrazePassesUnseen) {
    for (const char* zone : {"play-pause", "volume-up", "volume-down"}) {
        const GestureScript script = GestureScript::parse("brush " + std::string(zone) + " 40ms\n");
        for (uint64_t seed = 1; seed <= 10; ++seed) EXPECT_EQ(replayedKinds(synthesize(script, seed)), std::vector<std::string>{}) << zone;
    }
}

}  // namespace
}  // namespace TolkaTouch::Tools

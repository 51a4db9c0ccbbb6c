// Matching labels with recognised gestures: the time tolerance, splits, merges, wrong places,
// holds ended by resets and recordings labelled with nothing.

#include <gtest/gtest.h>

#include "tools/workbench/Matching.h"
#include "tools/workbench/Metrics.h"

namespace TolkaTouch::Workbench {
namespace {

constexpr int64_t kTolerance = 100'000;
constexpr size_t kTap = 0;
constexpr size_t kHold = 1;
constexpr size_t kSlide = 2;

Label label(Intended kind, PixelRegion zone, int64_t startMs, int64_t endMs, PixelRegion toZone = PixelRegion::None) {
    return Label{kind, zone, toZone, startMs * 1000, endMs * 1000};
}

RecognisedGesture gesture(Recognised kind, PixelRegion zone, int64_t startMs, int64_t decidedMs, int64_t endMs,
                          PixelRegion toZone = PixelRegion::None) {
    return RecognisedGesture{kind, zone, toZone, startMs * 1000, decidedMs * 1000, endMs * 1000};
}

Counts match(const std::vector<Label>& labels, const std::vector<RecognisedGesture>& recognised, uint64_t durationMs = 10'000) {
    Counts counts;
    matchRecording(labels, recognised, durationMs * 1000, kTolerance, counts);
    return counts;
}

const ClassCounts& cell(const Counts& counts, size_t kind, PixelRegion zone) { return counts.classes[kind][zoneIndex(zone)]; }
uint64_t confusion(const Counts& counts, Intended intended, Recognised recognised) {
    return counts.confusion[static_cast<size_t>(intended)][static_cast<size_t>(recognised)];
}

TEST(MatchingTest, TapStartingJustInsideTheToleranceAfterItsLabelMatches) {
    const Counts counts = match({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1120)},
                                {gesture(Recognised::Tap, PixelRegion::VolumeUp, 1220, 1300, 1300)});
    EXPECT_EQ(cell(counts, kTap, PixelRegion::VolumeUp), (ClassCounts{1, 0, 0}));
    EXPECT_EQ(counts.latencyUs[kTap], std::vector<int64_t>{300'000});
    EXPECT_EQ(confusion(counts, Intended::Tap, Recognised::Tap), 1u);
}

TEST(MatchingTest, TapStartingJustOutsideTheToleranceIsAMissAndAFalsePositive) {
    const Counts counts = match({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1120)},
                                {gesture(Recognised::Tap, PixelRegion::VolumeUp, 1221, 1300, 1300)});
    EXPECT_EQ(cell(counts, kTap, PixelRegion::VolumeUp), (ClassCounts{0, 1, 1}));
    EXPECT_EQ(counts.falseRejects, 1u);
    EXPECT_EQ(confusion(counts, Intended::Tap, Recognised::Nothing), 1u);
    EXPECT_EQ(confusion(counts, Intended::None, Recognised::Tap), 1u);
    EXPECT_TRUE(counts.latencyUs[kTap].empty());
}

TEST(MatchingTest, TapStartingJustInsideTheToleranceBeforeItsLabelMatches) {
    EXPECT_EQ(cell(match({label(Intended::Tap, PixelRegion::PlayPause, 1000, 1120)},
                         {gesture(Recognised::Tap, PixelRegion::PlayPause, 900, 1000, 1000)}),
                   kTap, PixelRegion::PlayPause),
              (ClassCounts{1, 0, 0}));
    EXPECT_EQ(cell(match({label(Intended::Tap, PixelRegion::PlayPause, 1000, 1120)},
                         {gesture(Recognised::Tap, PixelRegion::PlayPause, 899, 1000, 1000)}),
                   kTap, PixelRegion::PlayPause),
              (ClassCounts{0, 1, 1}));
}

TEST(MatchingTest, HoldThatAResetEndsMatchesItsLabelAndThePieceAfterIt) {
    // A hold cut by a reset at 1800 ms: the hold before it, and the finger still held after it.
    const Counts counts = match({label(Intended::Hold, PixelRegion::VolumeDown, 1000, 1800),
                                 label(Intended::Hold, PixelRegion::VolumeDown, 1800, 2600)},
                                {gesture(Recognised::Hold, PixelRegion::VolumeDown, 1016, 1520, 1800),
                                 gesture(Recognised::Hold, PixelRegion::VolumeDown, 1856, 2360, 2600)});
    EXPECT_EQ(cell(counts, kHold, PixelRegion::VolumeDown), (ClassCounts{2, 0, 0}));
    EXPECT_EQ(counts.latencyUs[kHold], (std::vector<int64_t>{520'000, 560'000}));
    EXPECT_EQ(counts.split, 0u);
    EXPECT_EQ(counts.merged, 0u);
}

TEST(MatchingTest, HoldThatRunsOverTheNextLabelIsMerged) {
    const Counts counts = match({label(Intended::Hold, PixelRegion::VolumeDown, 1000, 1800),
                                 label(Intended::Hold, PixelRegion::VolumeDown, 1800, 2600)},
                                {gesture(Recognised::Hold, PixelRegion::VolumeDown, 1016, 1520, 2600)});
    EXPECT_EQ(cell(counts, kHold, PixelRegion::VolumeDown), (ClassCounts{1, 0, 1}));
    EXPECT_EQ(counts.merged, 1u);
    EXPECT_EQ(counts.falseRejects, 1u);
}

TEST(MatchingTest, SecondGestureOnOneLabelIsASplit) {
    const Counts counts = match({label(Intended::Hold, PixelRegion::VolumeUp, 1000, 2000)},
                                {gesture(Recognised::Tap, PixelRegion::VolumeUp, 1010, 1200, 1200),
                                 gesture(Recognised::Tap, PixelRegion::VolumeUp, 1500, 1700, 1700)});
    EXPECT_EQ(counts.split, 1u);
    EXPECT_EQ(cell(counts, kHold, PixelRegion::VolumeUp), (ClassCounts{0, 0, 1}));
    EXPECT_EQ(cell(counts, kTap, PixelRegion::VolumeUp), (ClassCounts{0, 2, 0}));
    EXPECT_EQ(confusion(counts, Intended::Hold, Recognised::Tap), 1u);
}

TEST(MatchingTest, RightKindInTheWrongZoneIsAWrongPlace) {
    const Counts counts = match({label(Intended::Slide, PixelRegion::VolumeUp, 1000, 2600, PixelRegion::VolumeDown)},
                                {gesture(Recognised::Slide, PixelRegion::VolumeUp, 1010, 1510, 2600, PixelRegion::PlayPause)});
    EXPECT_EQ(counts.wrongPlace, 1u);
    EXPECT_EQ(cell(counts, kSlide, PixelRegion::VolumeUp), (ClassCounts{0, 1, 1}));
    EXPECT_EQ(counts.falseRejects, 0u);
    EXPECT_EQ(confusion(counts, Intended::Slide, Recognised::Slide), 1u);
}

TEST(MatchingTest, GestureOnABrushIsAFalsePositiveAndNothingOnItIsRight) {
    const Counts counts = match({label(Intended::Brush, PixelRegion::VolumeDown, 1000, 1090),
                                 label(Intended::Brush, PixelRegion::PlayPause, 3000, 3090)},
                                {gesture(Recognised::Tap, PixelRegion::VolumeDown, 1070, 1090, 1090)});
    EXPECT_EQ(cell(counts, kTap, PixelRegion::VolumeDown), (ClassCounts{0, 1, 0}));
    EXPECT_EQ(confusion(counts, Intended::Brush, Recognised::Tap), 1u);
    EXPECT_EQ(confusion(counts, Intended::Brush, Recognised::Nothing), 1u);
    EXPECT_EQ(counts.intendedGestures, 0u);
}

TEST(MatchingTest, NearestLabelStartTakesAGestureWithinReachOfTwo) {
    const Counts counts = match({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1100), label(Intended::Tap, PixelRegion::VolumeUp, 1150, 1250)},
                                {gesture(Recognised::Tap, PixelRegion::VolumeUp, 1140, 1200, 1200)});
    EXPECT_EQ(confusion(counts, Intended::Tap, Recognised::Nothing), 1u);
    EXPECT_EQ(cell(counts, kTap, PixelRegion::VolumeUp), (ClassCounts{1, 0, 1}));
    EXPECT_EQ(counts.latencyUs[kTap], std::vector<int64_t>{50'000});
}

std::vector<Mismatch> mismatches(const std::vector<Label>& labels, const std::vector<RecognisedGesture>& recognised) {
    Counts counts;
    std::vector<Mismatch> found;
    matchRecording(labels, recognised, 10'000'000, kTolerance, counts, &found);
    return found;
}

Mismatch stretch(MismatchKind kind, int64_t startMs, int64_t endMs) { return Mismatch{kind, startMs * 1000, endMs * 1000}; }

TEST(MatchingTest, MismatchesAreTheMissedLabelAndTheFalseGestureOfATapTooLate) {
    EXPECT_EQ(mismatches({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1120)},
                         {gesture(Recognised::Tap, PixelRegion::VolumeUp, 1221, 1300, 1300)}),
              (std::vector<Mismatch>{stretch(MismatchKind::False, 1221, 1300), stretch(MismatchKind::Missed, 1000, 1120)}));
}

TEST(MatchingTest, MismatchesNameSplitsMergesAndWrongZones) {
    EXPECT_EQ(mismatches({label(Intended::Tap, PixelRegion::PlayPause, 1000, 1100)},
                         {gesture(Recognised::Tap, PixelRegion::PlayPause, 1000, 1090, 1090),
                          gesture(Recognised::Tap, PixelRegion::PlayPause, 1150, 1190, 1190)}),
              (std::vector<Mismatch>{stretch(MismatchKind::Split, 1150, 1190)}));
    EXPECT_EQ(mismatches({label(Intended::Hold, PixelRegion::PlayPause, 1000, 2000), label(Intended::Tap, PixelRegion::VolumeUp, 2500, 2600)},
                         {gesture(Recognised::Hold, PixelRegion::PlayPause, 1000, 1500, 3000)}),
              (std::vector<Mismatch>{stretch(MismatchKind::Missed, 2500, 2600), stretch(MismatchKind::Merged, 1000, 3000)}));
    EXPECT_EQ(mismatches({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1100)},
                         {gesture(Recognised::Tap, PixelRegion::VolumeDown, 1000, 1090, 1090)}),
              (std::vector<Mismatch>{stretch(MismatchKind::WrongZone, 1000, 1090)}));
    EXPECT_EQ(mismatchName(MismatchKind::WrongZone), "wrong zone");
}

TEST(MatchingTest, RecordingWithoutLabelsCountsEveryGestureAsAFalseActivation) {
    const Counts counts = match({}, {gesture(Recognised::Tap, PixelRegion::PlayPause, 1000, 1100, 1100),
                                     gesture(Recognised::Hold, PixelRegion::VolumeUp, 5000, 5500, 6000)},
                                1'800'000);
    EXPECT_EQ(counts.noiseOnlyUs, 1'800'000'000u);
    EXPECT_EQ(counts.falseActivations, 2u);
    EXPECT_EQ(cell(counts, kTap, PixelRegion::PlayPause), (ClassCounts{0, 1, 0}));
    EXPECT_EQ(confusion(counts, Intended::None, Recognised::Hold), 1u);
    EXPECT_EQ(falseActivationsPerHour(counts), 4.0);
    EXPECT_EQ(falseRejectRate(counts), std::nullopt);
}

TEST(MatchingTest, RecordingWithLabelsAddsNothingToTheNoiseOnlyTime) {
    const Counts counts = match({label(Intended::Tap, PixelRegion::VolumeUp, 1000, 1120)}, {});
    EXPECT_EQ(counts.noiseOnlyUs, 0u);
    EXPECT_EQ(falseActivationsPerHour(counts), std::nullopt);
    EXPECT_EQ(falseRejectRate(counts), 1.0);
}

TEST(MatchingTest, MacroF1WeighsEveryKindAndZoneThatSawAGestureTheSame) {
    Counts counts;
    counts.classes[kTap][0] = ClassCounts{9, 0, 0};   // F1 1
    counts.classes[kHold][1] = ClassCounts{1, 1, 0};  // F1 2/3
    counts.classes[kSlide][2] = ClassCounts{0, 0, 3};  // no recall: F1 0
    EXPECT_DOUBLE_EQ(*macroF1(counts), (1.0 + 2.0 / 3.0 + 0.0) / 3.0);
    EXPECT_EQ(macroF1(Counts{}), std::nullopt);
}

}  // namespace
}  // namespace TolkaTouch::Workbench

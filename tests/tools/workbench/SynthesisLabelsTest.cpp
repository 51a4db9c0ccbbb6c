// The labels of a synthesised recording say what each line of its script means to happen, with
// resets cutting holds into pieces.

#include <gtest/gtest.h>

#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"
#include "tools/workbench/SynthesisLabels.h"

namespace TolkaTouch::Workbench {
namespace {

std::vector<Label> labelsOf(const char* script) { return labelsOfSynthesis(Tools::synthesize(Tools::GestureScript::parse(script), 1)); }

// The first frame arrives a fraction of a millisecond after the synthesis starts: labels are
// measured from it, so they sit that fraction earlier than the script's round numbers.
int64_t ms(const Label& label, bool end = false) { return ((end ? label.endUs : label.startUs) + 999) / 1000; }

TEST(SynthesisLabelsTest, EveryTouchLineIsOneLabelOverItsTime) {
    const std::vector<Label> labels = labelsOf(
        "tap volume-up 120ms\nwait 1s\nhold play-pause 800ms\nset Algs.HoldTimeoutMilliseconds 700\n"
        "slide volume-up volume-down 1.5s\nbrush volume-down 90ms\nwait 200ms\nreset\nwait 100ms\n");
    ASSERT_EQ(labels.size(), 4u);
    EXPECT_EQ(labels[0].kind, Intended::Tap);
    EXPECT_EQ(labels[0].zone, PixelRegion::VolumeUp);
    EXPECT_EQ(ms(labels[0]), 304);
    EXPECT_EQ(ms(labels[0], true), 424);
    EXPECT_EQ(labels[1].kind, Intended::Hold);
    EXPECT_EQ(labels[1].zone, PixelRegion::PlayPause);
    EXPECT_EQ(ms(labels[1]), 1424);
    EXPECT_EQ(ms(labels[1], true), 2224);
    EXPECT_EQ(labels[2].kind, Intended::Slide);
    EXPECT_EQ(labels[2].zone, PixelRegion::VolumeUp);
    EXPECT_EQ(labels[2].toZone, PixelRegion::VolumeDown);
    EXPECT_EQ(ms(labels[2], true), 3724);
    EXPECT_EQ(labels[3].kind, Intended::Brush);
    EXPECT_EQ(ms(labels[3]), 3724);
    EXPECT_EQ(ms(labels[3], true), 3814);
}

TEST(SynthesisLabelsTest, ResetCutsAHoldIntoHoldsAndShortPiecesMeantToGiveNothing) {
    const std::vector<Label> labels = labelsOf("hold volume-down 2s\nreset 1500ms\ntap play-pause 200ms\nreset 50ms\n");
    ASSERT_EQ(labels.size(), 4u);
    EXPECT_EQ(labels[0].kind, Intended::Hold);
    EXPECT_EQ(ms(labels[0], true), 304 + 1500);
    EXPECT_EQ(labels[1].kind, Intended::None);  // 500 ms of the hold after the reset: 560 ms needed
    EXPECT_EQ(labels[1].zone, PixelRegion::None);
    EXPECT_EQ(ms(labels[1]), 304 + 1500);
    EXPECT_EQ(labels[2].kind, Intended::None);
    EXPECT_EQ(labels[3].kind, Intended::None);
    EXPECT_EQ(ms(labels[3], true), 304 + 2000 + 200);
}

TEST(SynthesisLabelsTest, ResetPieceLongEnoughStaysAHold) {
    const std::vector<Label> labels = labelsOf("hold volume-down 2s\nreset 800ms\n");
    ASSERT_EQ(labels.size(), 2u);
    EXPECT_EQ(labels[0].kind, Intended::Hold);
    EXPECT_EQ(labels[1].kind, Intended::Hold);
    EXPECT_EQ(ms(labels[1]), 304 + 800);
}

}  // namespace
}  // namespace TolkaTouch::Workbench

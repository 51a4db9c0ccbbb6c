// The labels document: read in start order, written back the same, and every mistake named with
// the label it is in.

#include <gtest/gtest.h>

#include "tools/workbench/Labels.h"

namespace TolkaTouch::Workbench {
namespace {

std::string errorOf(std::string_view text) {
    try {
        parseLabels(text);
    } catch (const LabelsError& error) {
        return error.what();
    }
    return "no error";
}

TEST(LabelsTest, ReadsEveryKindInStartOrder) {
    const std::vector<Label> labels = parseLabels(R"({"Version": 1, "Labels": [
        {"Kind": "slide", "Zone": "volume-up", "ToZone": "volume-down", "StartMs": 900, "EndMs": 2100.5},
        {"Kind": "tap", "Zone": "play-pause", "StartMs": 304, "EndMs": 424},
        {"Kind": "none", "StartMs": 3000, "EndMs": 3100},
        {"Kind": "brush", "Zone": "volume-down", "StartMs": 2500, "EndMs": 2590},
        {"Kind": "hold", "Zone": "volume-up", "StartMs": 2200, "EndMs": 2900}]})");
    const std::vector<Label> expected{
        {Intended::Tap, PixelRegion::PlayPause, PixelRegion::None, 304'000, 424'000},
        {Intended::Slide, PixelRegion::VolumeUp, PixelRegion::VolumeDown, 900'000, 2'100'500},
        {Intended::Hold, PixelRegion::VolumeUp, PixelRegion::None, 2'200'000, 2'900'000},
        {Intended::Brush, PixelRegion::VolumeDown, PixelRegion::None, 2'500'000, 2'590'000},
        {Intended::None, PixelRegion::None, PixelRegion::None, 3'000'000, 3'100'000},
    };
    EXPECT_EQ(labels, expected);
}

TEST(LabelsTest, WrittenDocumentReadsBackTheSameLabels) {
    const std::vector<Label> labels{
        {Intended::Tap, PixelRegion::VolumeDown, PixelRegion::None, 304'000, 424'000},
        {Intended::Slide, PixelRegion::PlayPause, PixelRegion::VolumeUp, 900'000, 2'100'000},
        {Intended::None, PixelRegion::None, PixelRegion::None, 3'000'000, 3'100'000},
    };
    EXPECT_EQ(parseLabels(labelsDocument(labels)), labels);
    EXPECT_EQ(labelsDocument({}), "{\"Version\": 1,\n \"Labels\": []}\n");
    EXPECT_TRUE(parseLabels(labelsDocument({})).empty());
}

TEST(LabelsTest, NamesTheLabelAndWhatIsWrong) {
    EXPECT_EQ(errorOf("[1"), "not JSON");
    EXPECT_EQ(errorOf("[]"), "not a labels document (expected an object)");
    EXPECT_EQ(errorOf(R"({"Labels": []})"), "no Version");
    EXPECT_EQ(errorOf(R"({"Version": 2, "Labels": []})"), "unsupported Version 2");
    EXPECT_EQ(errorOf(R"({"Version": 1})"), "no Labels list");
    EXPECT_EQ(errorOf(R"({"Version": 1, "Labels": [], "Extra": 1})"), "unknown key 'Extra'");
    const auto one = [](std::string_view label) { return errorOf(R"({"Version": 1, "Labels": [)" + std::string(label) + "]}"); };
    EXPECT_EQ(one("3"), "label 1: not an object");
    EXPECT_EQ(one(R"({"Zone": "volume-up", "StartMs": 1, "EndMs": 2})"), "label 1: no Kind");
    EXPECT_EQ(one(R"({"Kind": "tapp", "Zone": "volume-up", "StartMs": 1, "EndMs": 2})"),
              "label 1: unknown kind 'tapp' (tap, hold, slide, brush, none)");
    EXPECT_EQ(one(R"({"Kind": "tap", "StartMs": 1, "EndMs": 2})"), "label 1: no Zone");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "middle", "StartMs": 1, "EndMs": 2})"),
              "label 1: unknown zone 'middle' (play-pause, volume-up, volume-down)");
    EXPECT_EQ(one(R"({"Kind": "none", "Zone": "volume-up", "StartMs": 1, "EndMs": 2})"), "label 1: a none label has no Zone");
    EXPECT_EQ(one(R"({"Kind": "slide", "Zone": "volume-up", "StartMs": 1, "EndMs": 2})"), "label 1: no ToZone");
    EXPECT_EQ(one(R"({"Kind": "slide", "Zone": "volume-up", "ToZone": "volume-up", "StartMs": 1, "EndMs": 2})"),
              "label 1: a slide needs two different zones");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "ToZone": "volume-down", "StartMs": 1, "EndMs": 2})"),
              "label 1: only a slide has a ToZone");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "EndMs": 2})"), "label 1: no StartMs");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "StartMs": "1", "EndMs": 2})"), "label 1: StartMs is not a number");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "StartMs": -1, "EndMs": 2})"), "label 1: StartMs is out of range");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "StartMs": 5, "EndMs": 2})"), "label 1: EndMs is before StartMs");
    EXPECT_EQ(one(R"({"Kind": "tap", "Zone": "volume-up", "StartMs": 1, "EndMs": 2, "Note": "x"})"), "label 1: unknown key 'Note'");
}

TEST(LabelsTest, LabelsLiveBesideTheirDocument) {
    EXPECT_EQ(labelsPathFor("corpus/taps-1.json"), "corpus/taps-1.labels.json");
    EXPECT_EQ(labelsPathFor("recorded/session.0002.jsonl"), "recorded/session.0002.labels.json");
    EXPECT_EQ(labelsPathFor("session.rec"), "session.rec.labels.json");
    EXPECT_TRUE(isLabelsPath("corpus/taps-1.labels.json"));
    EXPECT_FALSE(isLabelsPath("corpus/taps-1.json"));
}

}  // namespace
}  // namespace TolkaTouch::Workbench

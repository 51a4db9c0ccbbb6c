#include "tools/GestureScript.h"

#include <gtest/gtest.h>

namespace TolkaTouch::Tools {
namespace {

std::string errorOf(std::string_view text) {
    try {
        GestureScript::parse(text);
    } catch (const GestureScriptError& error) {
        return error.what();
    }
    return "no error";
}

TEST(GestureScriptTest, ReadsEveryGestureWithItsZonesAndDuration) {
    const GestureScript script = GestureScript::parse(
        "tap play-pause 120ms\nhold volume-up 1.5s\nslide volume-up play-pause 2s\nbrush volume-down 300\nwait 1s\n"
        "reset\nset Algs.HoldTimeoutMilliseconds 700\n");
    ASSERT_EQ(script.gestures.size(), 7u);
    EXPECT_EQ(script.gestures[0].kind, GestureKind::Tap);
    EXPECT_EQ(script.gestures[0].zone, Zone::PlayPause);
    EXPECT_EQ(script.gestures[0].durationMs, 120u);
    EXPECT_EQ(script.gestures[1].kind, GestureKind::Hold);
    EXPECT_EQ(script.gestures[1].zone, Zone::VolumeUp);
    EXPECT_EQ(script.gestures[1].durationMs, 1500u);
    EXPECT_EQ(script.gestures[2].kind, GestureKind::Slide);
    EXPECT_EQ(script.gestures[2].zone, Zone::VolumeUp);
    EXPECT_EQ(script.gestures[2].toZone, Zone::PlayPause);
    EXPECT_EQ(script.gestures[2].durationMs, 2000u);
    EXPECT_EQ(script.gestures[3].kind, GestureKind::Brush);
    EXPECT_EQ(script.gestures[3].zone, Zone::VolumeDown);
    EXPECT_EQ(script.gestures[3].durationMs, 300u);
    EXPECT_EQ(script.gestures[4].kind, GestureKind::Wait);
    EXPECT_EQ(script.gestures[4].durationMs, 1000u);
    EXPECT_EQ(script.gestures[5].kind, GestureKind::Reset);
    EXPECT_FALSE(script.gestures[5].hasOffset);
    EXPECT_EQ(script.gestures[6].kind, GestureKind::Set);
    EXPECT_EQ(script.gestures[6].key, "Algs.HoldTimeoutMilliseconds");
    EXPECT_EQ(script.gestures[6].value, PropertyValue(700u));
}

TEST(GestureScriptTest, SkipsCommentsAndBlankLinesAndKeepsLineNumbers) {
    const GestureScript script = GestureScript::parse("# a session\n\n  tap volume-up 100ms   # louder\r\n\t\nwait 1s");
    ASSERT_EQ(script.gestures.size(), 2u);
    EXPECT_EQ(script.gestures[0].line, 3);
    EXPECT_EQ(script.gestures[1].line, 5);
    const GestureScript crlf = GestureScript::parse("tap volume-up 100ms\r\nwait 1s\r\n");
    ASSERT_EQ(crlf.gestures.size(), 2u);
    EXPECT_EQ(crlf.gestures[0].durationMs, 100u);
}

TEST(GestureScriptTest, SetValueIsReadAsJsonOtherwiseAsText) {
    const GestureScript script = GestureScript::parse(
        "set Algs.EnableTapSuppression false\nset Algs.ActivationThreshold 0.5  # lower\nset Key \"a # b\"\nset Key plain text\n");
    ASSERT_EQ(script.gestures.size(), 4u);
    EXPECT_EQ(script.gestures[0].value, PropertyValue(false));
    EXPECT_EQ(script.gestures[1].value, PropertyValue(0.5));
    EXPECT_EQ(script.gestures[2].value, PropertyValue("a # b"));
    EXPECT_EQ(script.gestures[3].value, PropertyValue("plain text"));
}

TEST(GestureScriptTest, ResetWithOffsetFallsInsideTheTouchBeforeIt) {
    const GestureScript script = GestureScript::parse("hold volume-up 2s\nreset 900ms\n");
    ASSERT_EQ(script.gestures.size(), 2u);
    EXPECT_TRUE(script.gestures[1].hasOffset);
    EXPECT_EQ(script.gestures[1].durationMs, 900u);
    EXPECT_EQ(errorOf("hold volume-up 2s\nreset 2s\n"), "line 2: a reset offset must fall inside the touch on a line before it");
    EXPECT_EQ(errorOf("wait 2s\nreset 1s\n"), "line 2: a reset offset must fall inside the touch on a line before it");
    EXPECT_EQ(errorOf("reset 1s\n"), "line 1: a reset offset must fall inside the touch on a line before it");
}

TEST(GestureScriptTest, RefusesWhatTheFingerModelCannotMake) {
    EXPECT_EQ(errorOf("tap volume-up 10ms"), "line 1: a touch lasts at least 16ms (two frames)");
    EXPECT_EQ(errorOf("brush volume-up 15ms"), "line 1: a touch lasts at least 16ms (two frames)");
    EXPECT_EQ(errorOf("brush volume-up 401ms"), "line 1: a brush lasts at most 400ms: a finger that stays longer touches");
    EXPECT_EQ(errorOf("slide volume-up volume-down 2s\nreset 1s\n"),
              "line 2: a reset can fall inside a tap or a hold, not inside a slide or a brush");
    EXPECT_EQ(errorOf("brush volume-up 300ms\nreset 100ms\n"),
              "line 2: a reset can fall inside a tap or a hold, not inside a slide or a brush");
    EXPECT_NO_THROW(GestureScript::parse("tap volume-up 16ms\nbrush volume-down 400ms\nhold play-pause 1s\nreset 600ms\n"));
}

TEST(GestureScriptTest, NamesTheLineAndWhatIsWrong) {
    EXPECT_EQ(errorOf("wait 1s\njump volume-up 1s\n"),
              "line 2: unknown gesture 'jump' (tap, hold, slide, brush, wait, reset, set)");
    EXPECT_EQ(errorOf("tap volume-left 100ms"), "line 1: unknown zone 'volume-left' (play-pause, volume-up, volume-down)");
    EXPECT_EQ(errorOf("tap volume-up soon"), "line 1: bad duration 'soon' (e.g. 120ms, 1.5s)");
    EXPECT_EQ(errorOf("tap volume-up"), "line 1: expected 'tap <zone> <duration>'");
    EXPECT_EQ(errorOf("hold volume-up 1s extra"), "line 1: expected 'hold <zone> <duration>'");
    EXPECT_EQ(errorOf("slide volume-up volume-up 2s"), "line 1: a slide needs two different zones");
    EXPECT_EQ(errorOf("slide volume-up play-pause 900ms"), "line 1: a slide lasts at least 1s: it is held before it moves");
    EXPECT_EQ(errorOf("wait 3000s\nwait 600s\nwait 1ms\n"), "line 3: the script lasts longer than an hour");
    EXPECT_EQ(errorOf("set Algs.HoldTimeoutMilliseconds"), "line 1: expected 'set <key> <value>'");
}

TEST(GestureScriptTest, DurationsTakeMillisecondsSecondsOrABareNumber) {
    EXPECT_EQ(durationFromText("120ms"), 120u);
    EXPECT_EQ(durationFromText("1.5s"), 1500u);
    EXPECT_EQ(durationFromText("80"), 80u);
    EXPECT_EQ(durationFromText("0.0004s"), 0u);
    EXPECT_FALSE(durationFromText("-5ms"));
    EXPECT_FALSE(durationFromText("ms"));
    EXPECT_FALSE(durationFromText("5 ms"));
    EXPECT_FALSE(durationFromText("2d"));
    EXPECT_FALSE(durationFromText("1e12s"));
    EXPECT_FALSE(durationFromText("nans"));
}

TEST(GestureScriptTest, ZonesMapToTheirRegions) {
    EXPECT_EQ(regionOfZone(Zone::PlayPause), PixelRegion::PlayPause);
    EXPECT_EQ(regionOfZone(Zone::VolumeUp), PixelRegion::VolumeUp);
    EXPECT_EQ(regionOfZone(Zone::VolumeDown), PixelRegion::VolumeDown);
    EXPECT_EQ(zoneFromName("volume-down"), Zone::VolumeDown);
    EXPECT_FALSE(zoneFromName("Volume-Down"));
}

}  // namespace
}  // namespace TolkaTouch::Tools

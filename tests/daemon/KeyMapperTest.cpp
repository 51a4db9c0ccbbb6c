#include "daemon/KeyMapper.h"

#include <gtest/gtest.h>
#include <linux/input-event-codes.h>

#include <chrono>
#include <memory>

#include "daemon/RecordingKeyOutput.h"
#include "platform/Log.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

using std::chrono::milliseconds;
using std::chrono::nanoseconds;

constexpr KeyWrite press(uint16_t code) { return {code, KeyValue::Press}; }
constexpr KeyWrite release(uint16_t code) { return {code, KeyValue::Release}; }

HIDEventRef mayBegin(double region) { return makeDigitizerEvent(0, HIDEventPhase::MayBegin, region); }
HIDEventRef holdStart(double region) { return makeDigitizerEvent(2, HIDEventPhase::Began, region); }
HIDEventRef holdChange(double region) { return makeDigitizerEvent(2, HIDEventPhase::Changed, region); }
HIDEventRef holdEnd(double region) { return makeDigitizerEvent(2, HIDEventPhase::Ended, region); }
HIDEventRef tap(double region) { return makeDigitizerEvent(0x20000, HIDEventPhase::None, region); }
HIDEventRef cancel() { return makeDigitizerEvent(0, HIDEventPhase::Cancelled, 0.0); }

class KeyMapperTest : public ::testing::Test {
protected:
    void advanceTo(milliseconds time) {
        now = time;
        mapper.repeatDue();
    }

    nanoseconds now{milliseconds(1000)};
    RecordingKeyOutput output;
    KeyMapper mapper{output, [this] { return now; }};
};

TEST_F(KeyMapperTest, TapInRegionOnePressesAndReleasesPlayPause) {
    mapper.handleEvent(*tap(1));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_PLAYPAUSE), release(KEY_PLAYPAUSE)}));
}

TEST_F(KeyMapperTest, TapInRegionTwoIsVolumeDownAndInRegionThreeVolumeUp) {
    mapper.handleEvent(*tap(2));
    mapper.handleEvent(*tap(3));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN),
                                                      press(KEY_VOLUMEUP), release(KEY_VOLUMEUP)}));
}

TEST_F(KeyMapperTest, TapWithoutRegionWritesNothing) {
    mapper.handleEvent(*tap(0));
    EXPECT_TRUE(output.writes().empty());
}

TEST_F(KeyMapperTest, MayBeginAndCancelWriteNothing) {
    mapper.handleEvent(*mayBegin(2));
    mapper.handleEvent(*cancel());
    EXPECT_TRUE(output.writes().empty());
    EXPECT_FALSE(mapper.nextRepeatTime());
}

TEST_F(KeyMapperTest, HoldStartInRegionOnePressesAndReleasesVoiceCommandAndHoldsNothing) {
    mapper.handleEvent(*holdStart(1));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOICECOMMAND), release(KEY_VOICECOMMAND)}));
    EXPECT_FALSE(mapper.heldKey());
    EXPECT_FALSE(mapper.nextRepeatTime());
}

TEST_F(KeyMapperTest, HoldStartInRegionThreePressesVolumeUpAndHoldsIt) {
    mapper.handleEvent(*holdStart(3));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEUP)}));
    EXPECT_EQ(mapper.heldKey(), KEY_VOLUMEUP);
    EXPECT_EQ(mapper.nextRepeatTime(), nanoseconds(milliseconds(1150)));
}

TEST_F(KeyMapperTest, HeldVolumeKeyStepsAgainEvery150Milliseconds) {
    mapper.handleEvent(*holdStart(2));
    advanceTo(milliseconds(1149));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN)}));
    advanceTo(milliseconds(1150));
    advanceTo(milliseconds(1300));
    EXPECT_EQ(output.writes(),
              (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN), press(KEY_VOLUMEDOWN),
                                     release(KEY_VOLUMEDOWN), press(KEY_VOLUMEDOWN)}));
    EXPECT_EQ(mapper.nextRepeatTime(), nanoseconds(milliseconds(1450)));
}

TEST_F(KeyMapperTest, LateRepeatWritesOneStepAndSchedulesTheNextFromNow) {
    mapper.handleEvent(*holdStart(3));
    advanceTo(milliseconds(1700));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEUP), release(KEY_VOLUMEUP), press(KEY_VOLUMEUP)}));
    EXPECT_EQ(mapper.nextRepeatTime(), nanoseconds(milliseconds(1850)));
}

TEST_F(KeyMapperTest, HoldEndReleasesTheKeyAndStopsRepeating) {
    mapper.handleEvent(*holdStart(3));
    now = milliseconds(1100);
    mapper.handleEvent(*holdEnd(3));
    advanceTo(milliseconds(2000));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEUP), release(KEY_VOLUMEUP)}));
    EXPECT_FALSE(mapper.nextRepeatTime());
}

TEST_F(KeyMapperTest, CancelDuringHoldReleasesTheKey) {
    mapper.handleEvent(*holdStart(2));
    mapper.handleEvent(*cancel());
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN)}));
    EXPECT_FALSE(mapper.heldKey());
}

TEST_F(KeyMapperTest, HoldChangeSwitchesToTheNewRegionsKeyAndRestartsItsRepeat) {
    mapper.handleEvent(*holdStart(2));
    now = milliseconds(1100);
    mapper.handleEvent(*holdChange(3));
    EXPECT_EQ(output.writes(),
              (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN), press(KEY_VOLUMEUP)}));
    EXPECT_EQ(mapper.nextRepeatTime(), nanoseconds(milliseconds(1250)));
    advanceTo(milliseconds(1250));
    EXPECT_EQ(output.writes().back(), press(KEY_VOLUMEUP));
    EXPECT_EQ(output.writes().size(), 5u);
}

TEST_F(KeyMapperTest, HoldChangeToTheSameRegionKeepsTheKeyAndItsRhythm) {
    mapper.handleEvent(*holdStart(3));
    now = milliseconds(1100);
    mapper.handleEvent(*holdChange(3));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEUP)}));
    EXPECT_EQ(mapper.nextRepeatTime(), nanoseconds(milliseconds(1150)));
}

TEST_F(KeyMapperTest, HoldChangeToRegionOneReleasesTheVolumeKeyAndPressesNothingElse) {
    mapper.handleEvent(*holdStart(3));
    mapper.handleEvent(*holdChange(1));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEUP), release(KEY_VOLUMEUP)}));
    EXPECT_FALSE(mapper.nextRepeatTime());
}

TEST_F(KeyMapperTest, HoldChangeFromRegionOneToRegionTwoStartsVolumeDown) {
    mapper.handleEvent(*holdStart(1));
    output.clear();
    mapper.handleEvent(*holdChange(2));
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN)}));
    EXPECT_EQ(mapper.heldKey(), KEY_VOLUMEDOWN);
}

TEST_F(KeyMapperTest, NewHoldStartLetsGoOfAKeyStillHeld) {
    mapper.handleEvent(*holdStart(2));
    mapper.handleEvent(*holdStart(3));
    EXPECT_EQ(output.writes(),
              (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN), press(KEY_VOLUMEUP)}));
}

TEST_F(KeyMapperTest, ReleaseAllLetsGoOfTheHeldKeyOnce) {
    mapper.handleEvent(*holdStart(2));
    mapper.releaseAll();
    mapper.releaseAll();
    EXPECT_EQ(output.writes(), (std::vector<KeyWrite>{press(KEY_VOLUMEDOWN), release(KEY_VOLUMEDOWN)}));
}

TEST_F(KeyMapperTest, RepeatDueWithoutAHeldKeyWritesNothing) {
    advanceTo(milliseconds(5000));
    EXPECT_TRUE(output.writes().empty());
}

TEST_F(KeyMapperTest, FirmwareResetIsLoggedAndWritesNothing) {
    auto sink = std::make_shared<SystemLog::MemorySink>();
    SystemLog::setSink(sink);
    mapper.handleEvent(*GestureCodec::encode(GestureKind::Reset));
    SystemLog::setSink(nullptr);
    EXPECT_TRUE(output.writes().empty());
    EXPECT_EQ(sink->messages(), (std::vector<std::string>{"the surface's firmware reported a reset"}));
}

}  // namespace
}  // namespace TolkaTouch

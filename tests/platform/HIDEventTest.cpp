#include "platform/HIDEvent.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

TEST(HIDEventTest, DigitizerEventCarriesOnlyItsMaskPhaseAndY) {
    const HIDEventRef event = makeDigitizerEvent(2, HIDEventPhase::Began, 3.0);
    ASSERT_NE(event, nullptr);
    EXPECT_EQ(event->type, HIDEventType::Digitizer);
    EXPECT_EQ(event->timestamp, 0u);
    EXPECT_EQ(event->transducerType, 2u);
    EXPECT_EQ(event->transducerIndex, 0u);
    EXPECT_EQ(event->identity, 0u);
    EXPECT_EQ(event->eventMask, 2u);
    EXPECT_EQ(event->buttonMask, 0u);
    EXPECT_EQ(event->x, 0.0);
    EXPECT_EQ(event->y, 3.0);
    EXPECT_EQ(event->z, 0.0);
    EXPECT_EQ(event->tipPressure, 0.0);
    EXPECT_EQ(event->barrelPressure, 0.0);
    EXPECT_FALSE(event->range);
    EXPECT_FALSE(event->touch);
    EXPECT_EQ(event->options, 0u);
    EXPECT_EQ(event->phase, 1u);
    EXPECT_EQ(event->integerValue(kDigitizerFrameNumberField), 0);
}

TEST(HIDEventTest, DigitizerEventMadeWithoutAPhaseReadsBackPhaseZero) {
    const HIDEventRef tap = makeDigitizerEvent(0x20000, HIDEventPhase::None, 1.0);
    EXPECT_EQ(tap->phase, 0u);
}

TEST(HIDEventTest, PhaseNumbersAreTheHostsOnes) {
    EXPECT_EQ(HIDEventPhase::None, 0u);
    EXPECT_EQ(HIDEventPhase::Began, 1u);
    EXPECT_EQ(HIDEventPhase::Changed, 2u);
    EXPECT_EQ(HIDEventPhase::Ended, 4u);
    EXPECT_EQ(HIDEventPhase::Cancelled, 8u);
    EXPECT_EQ(HIDEventPhase::MayBegin, 128u);
}

TEST(HIDEventTest, FrameNumberFieldIs0xB001BAndReadsBackWhatWasSet) {
    EXPECT_EQ(kDigitizerFrameNumberField, 0xB001Bu);
    const HIDEventRef event = makeDigitizerEvent(0, HIDEventPhase::MayBegin, 1.0);
    event->setIntegerValue(0xB001B, 4294967295);
    EXPECT_EQ(event->integerValue(0xB001B), 4294967295);
    EXPECT_EQ(event->frameNumberField, 4294967295);
}

TEST(HIDEventTest, OtherIntegerFieldsReadAsZeroAndIgnoreWrites) {
    const HIDEventRef event = makeDigitizerEvent(0, HIDEventPhase::MayBegin, 1.0);
    event->setIntegerValue(0xB001A, 99);
    EXPECT_EQ(event->integerValue(0xB001A), 0);
    EXPECT_EQ(event->integerValue(0xB001B), 0);
}

TEST(HIDEventTest, FirmwareResetEventIsVendorDefinedOnUsagePage0xFF60Usage2) {
    const HIDEventRef event = makeVendorDefinedEvent(0xFF60, 2);
    ASSERT_NE(event, nullptr);
    EXPECT_EQ(event->type, HIDEventType::VendorDefined);
    EXPECT_EQ(static_cast<uint32_t>(event->type), 1u);
    EXPECT_EQ(event->timestamp, 0u);
    EXPECT_EQ(event->usagePage, 0xFF60u);
    EXPECT_EQ(event->usage, 2u);
    EXPECT_EQ(event->version, 0u);
    EXPECT_TRUE(event->payload.empty());
    EXPECT_EQ(event->options, 0u);
}

TEST(HIDEventTest, DigitizerTypeIsEleven) { EXPECT_EQ(static_cast<uint32_t>(HIDEventType::Digitizer), 11u); }

TEST(HIDEventTest, DigitizerDescriptionNamesEveryDistinguishingField) {
    const HIDEventRef event = makeDigitizerEvent(2, HIDEventPhase::Changed, 3.0);
    event->timestamp = 123456789;
    event->setIntegerValue(kDigitizerFrameNumberField, 42);
    EXPECT_EQ(event->description(),
              "Digitizer timestamp=123456789 phase=2 mask=0x2 y=3 frame=42 transducer=2 index=0 identity=0 range=0 "
              "touch=0 options=0");
}

TEST(HIDEventTest, TapDescriptionShowsItsMaskInHex) {
    const HIDEventRef event = makeDigitizerEvent(0x20000, HIDEventPhase::None, 1.0);
    EXPECT_EQ(event->description(),
              "Digitizer timestamp=0 phase=0 mask=0x20000 y=1 frame=0 transducer=2 index=0 identity=0 range=0 "
              "touch=0 options=0");
}

TEST(HIDEventTest, FirmwareResetDescriptionNamesItsUsage) {
    const HIDEventRef event = makeVendorDefinedEvent(0xFF60, 2);
    event->timestamp = 77;
    EXPECT_EQ(event->description(), "VendorDefined timestamp=77 usagePage=0xFF60 usage=2 version=0 length=0 options=0");
}

}  // namespace
}  // namespace TolkaTouch

#include "daemon/EventJson.h"

#include <gtest/gtest.h>

#include "tools/EventPrinter.h"

namespace TolkaTouch {
namespace {

std::vector<HIDEventRef> everyKindOfEvent() {
    std::vector<HIDEventRef> events{
        makeDigitizerEvent(0, HIDEventPhase::MayBegin, 1),  makeDigitizerEvent(2, HIDEventPhase::Began, 2),
        makeDigitizerEvent(2, HIDEventPhase::Changed, 3),   makeDigitizerEvent(2, HIDEventPhase::Ended, 3),
        makeDigitizerEvent(0x20000, HIDEventPhase::None, 1), makeDigitizerEvent(0, HIDEventPhase::Cancelled, 0),
        makeDigitizerEvent(0, HIDEventPhase::Began, 2),     makeFirmwareResetEvent(),
    };
    auto other = makeFirmwareResetEvent();
    other->usage = 7;
    events.push_back(other);
    uint64_t stamp = 123456789;
    int64_t frame = 1000;
    for (auto& event : events) {
        event->timestamp = stamp++;
        if (event->type == HIDEventType::Digitizer) event->setIntegerValue(kDigitizerFrameNumberField, frame++);
    }
    return events;
}

TEST(EventJsonTest, TapLineCarriesFrameKindRegionPhaseAndTimestamp) {
    auto event = makeDigitizerEvent(0x20000, HIDEventPhase::None, 3);
    event->setIntegerValue(kDigitizerFrameNumberField, 1234);
    event->timestamp = 987;
    EXPECT_EQ(eventJsonLine(*event), R"({"frame":1234,"event":"tap","region":3,"phase":0,"timestamp":987})");
}

TEST(EventJsonTest, ResetLineHasNoFrame) {
    auto event = makeFirmwareResetEvent();
    EXPECT_EQ(eventJsonLine(*event), R"({"frame":null,"event":"reset","region":0,"phase":0,"timestamp":0})");
}

TEST(EventJsonTest, EveryLineEqualsTheReplayToolsLine) {
    for (const auto& event : everyKindOfEvent()) {
        EXPECT_EQ(eventJsonLine(*event), Tools::eventJsonLine(*event));
    }
}

}  // namespace
}  // namespace TolkaTouch

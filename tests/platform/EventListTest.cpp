#include "platform/EventList.h"

#include <gtest/gtest.h>

#include <memory>
#include <utility>
#include <vector>

namespace TolkaTouch {
namespace {

HIDEventRef eventOfRegion(double y) { return makeDigitizerEvent(0, HIDEventPhase::MayBegin, y); }

std::vector<double> regionsOf(const EventList& events) {
    std::vector<double> regions;
    for (const HIDEventRef& event : events) regions.push_back(event->y);
    return regions;
}

TEST(EventListTest, KeepsItsEventsAliveAndInOrder) {
    std::weak_ptr<HIDEvent> watched;
    {
        EventList events;
        events.push_back(makeDigitizerEvent(0, HIDEventPhase::MayBegin, 1.0));
        events.push_back(makeVendorDefinedEvent(0xFF60, 2));
        watched = events.front();
        EXPECT_EQ(events[0]->type, HIDEventType::Digitizer);
        EXPECT_EQ(events[1]->type, HIDEventType::VendorDefined);
        EXPECT_EQ(events.back()->type, HIDEventType::VendorDefined);
        EXPECT_FALSE(watched.expired());
    }
    EXPECT_TRUE(watched.expired());
}

TEST(EventListTest, StartsEmpty) {
    const EventList events;
    EXPECT_TRUE(events.empty());
    EXPECT_EQ(events.size(), 0u);
    EXPECT_EQ(events.begin(), events.end());
}

TEST(EventListTest, KeepsOrderPastTheEventsHeldInPlace) {
    EventList events{eventOfRegion(1), eventOfRegion(2)};
    for (int region = 3; region <= 9; ++region) events.push_back(eventOfRegion(region));
    EXPECT_EQ(events.size(), 9u);
    EXPECT_EQ(regionsOf(events), (std::vector<double>{1, 2, 3, 4, 5, 6, 7, 8, 9}));
    EXPECT_EQ(events.front()->y, 1);
    EXPECT_EQ(events.back()->y, 9);
}

TEST(EventListTest, ClearReleasesEveryEventAndTheListTakesNewOnes) {
    EventList events{eventOfRegion(1), eventOfRegion(2), eventOfRegion(3)};
    const std::weak_ptr<HIDEvent> first = events.front();
    const std::weak_ptr<HIDEvent> third = events.back();
    events.clear();
    EXPECT_TRUE(events.empty());
    EXPECT_TRUE(first.expired());
    EXPECT_TRUE(third.expired());
    events.push_back(eventOfRegion(4));
    EXPECT_EQ(regionsOf(events), (std::vector<double>{4}));
}

TEST(EventListTest, CopyHoldsAnotherReferenceOnTheSameEvents) {
    for (int count : {1, 2, 5}) {
        EventList events;
        for (int region = 1; region <= count; ++region) events.push_back(eventOfRegion(region));
        const EventList copy = events;
        ASSERT_EQ(copy.size(), events.size());
        for (size_t i = 0; i < copy.size(); ++i) {
            EXPECT_EQ(copy[i], events[i]);
            EXPECT_EQ(copy[i].use_count(), 2);
        }
    }
}

TEST(EventListTest, CopyAssignmentReplacesWhatTheListHeld) {
    EventList many{eventOfRegion(1), eventOfRegion(2), eventOfRegion(3)};
    const std::weak_ptr<HIDEvent> dropped = many.back();
    const EventList few{eventOfRegion(7)};
    many = few;
    EXPECT_EQ(regionsOf(many), (std::vector<double>{7}));
    EXPECT_TRUE(dropped.expired());
    EventList again{eventOfRegion(8)};
    again = EventList{eventOfRegion(4), eventOfRegion(5), eventOfRegion(6)};
    EXPECT_EQ(regionsOf(again), (std::vector<double>{4, 5, 6}));
}

TEST(EventListTest, MovedFromListIsEmptyAndTheEventsMoveAlong) {
    for (int count : {1, 2, 4}) {
        EventList events;
        for (int region = 1; region <= count; ++region) events.push_back(eventOfRegion(region));
        const std::weak_ptr<HIDEvent> first = events.front();
        EventList moved = std::move(events);
        EXPECT_TRUE(events.empty());  // NOLINT(bugprone-use-after-move): the moved-from state is the point
        EXPECT_EQ(moved.size(), static_cast<size_t>(count));
        EXPECT_EQ(first.use_count(), 1);
        EventList assigned;
        assigned = std::move(moved);
        EXPECT_TRUE(moved.empty());  // NOLINT(bugprone-use-after-move)
        EXPECT_EQ(assigned.front()->y, 1);
        EXPECT_EQ(assigned.back()->y, count);
    }
}

}  // namespace
}  // namespace TolkaTouch

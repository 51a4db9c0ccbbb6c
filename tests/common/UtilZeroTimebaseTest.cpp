// Time conversion with a host clock that reports a 0/0 timebase: each conversion, dividing by
// zero, gives 0 instead of failing.
#include "common/Util.h"

#include <gtest/gtest.h>

#include "platform/HostClock.h"

namespace TolkaTouch {
namespace {

class ZeroTimebaseEnvironment : public ::testing::Environment {
public:
    void SetUp() override { Host::setTimebase(Timebase{0, 0}); }
};

const auto* const environment = ::testing::AddGlobalTestEnvironment(new ZeroTimebaseEnvironment);

TEST(UtilZeroTimebaseTest, NanosecondsToTicksWithAZeroNumeratorGiveZero) {
    EXPECT_EQ(Util::machTimeFromNanoseconds(0), 0u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(1000), 0u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(UINT64_MAX), 0u);
}

TEST(UtilZeroTimebaseTest, TicksToNanosecondsWithAZeroDenominatorGiveZero) {
    EXPECT_EQ(Util::nanosecondsFromMachTime(0), 0u);
    EXPECT_EQ(Util::nanosecondsFromMachTime(1000), 0u);
    EXPECT_EQ(Util::nanosecondsFromMachTime(UINT64_MAX), 0u);
}

}  // namespace
}  // namespace TolkaTouch

// Time conversion with a host clock whose timebase is 125/3 (a tick is 41.67 ns). The timebase is
// read once per process, so it is installed before any conversion runs.
#include "common/Util.h"

#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "platform/HostClock.h"

namespace TolkaTouch {
namespace {

class TimebaseEnvironment : public ::testing::Environment {
public:
    void SetUp() override { Host::setTimebase(Timebase{125, 3}); }
};

const auto* const environment = ::testing::AddGlobalTestEnvironment(new TimebaseEnvironment);

TEST(UtilTimebaseTest, TicksBecomeNanosecondsByNumeratorOverDenominator) {
    EXPECT_EQ(Util::nanosecondsFromMachTime(0), 0u);
    EXPECT_EQ(Util::nanosecondsFromMachTime(3), 125u);
    EXPECT_EQ(Util::nanosecondsFromMachTime(1000000), 41666666u);
}

TEST(UtilTimebaseTest, NanosecondsBecomeTicksByDenominatorOverNumerator) {
    EXPECT_EQ(Util::machTimeFromNanoseconds(0), 0u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(125), 3u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(41666666), 999999u);
}

TEST(UtilTimebaseTest, ConversionsTruncate) {
    EXPECT_EQ(Util::nanosecondsFromMachTime(1), 41u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(100), 2u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(41), 0u);
}

TEST(UtilTimebaseTest, RoundTripNeedNotGiveBackTheStartingValue) {
    EXPECT_EQ(Util::nanosecondsFromMachTime(Util::machTimeFromNanoseconds(100)), 83u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(Util::nanosecondsFromMachTime(1)), 0u);
}

TEST(UtilTimebaseTest, MultiplicationComesFirstAndWrapsInSixtyFourBits) {
    // 125 * (2^64 - 1) wraps to 2^64 - 125 before the division by 3.
    EXPECT_EQ(Util::nanosecondsFromMachTime(UINT64_MAX), 6148914691236517163u);
    // 3 * (2^64 - 1) wraps to 2^64 - 3 before the division by 125.
    EXPECT_EQ(Util::machTimeFromNanoseconds(UINT64_MAX), 147573952589676412u);
    // 125 * 2^60 wraps to 13 * 2^60.
    EXPECT_EQ(Util::nanosecondsFromMachTime(uint64_t{1} << 60), 4995993186629670229u);
}

TEST(UtilTimebaseTest, ConcurrentFirstConversionsAllSeeTheSameTimebase) {
    std::vector<uint64_t> results(8);
    std::vector<std::thread> threads;
    for (size_t i = 0; i < results.size(); ++i)
        threads.emplace_back([&results, i] { results[i] = Util::nanosecondsFromMachTime(3000); });
    for (auto& thread : threads) thread.join();
    for (uint64_t result : results) EXPECT_EQ(result, 125000u);
}

TEST(UtilTimebaseTest, TheTimebaseIsReadOnlyOnce) {
    EXPECT_EQ(Util::nanosecondsFromMachTime(3), 125u);
    Host::setTimebase(Timebase{1, 1});
    EXPECT_EQ(Util::nanosecondsFromMachTime(3), 125u);
    EXPECT_EQ(Util::machTimeFromNanoseconds(125), 3u);
    Host::setTimebase(Timebase{125, 3});
}

}  // namespace
}  // namespace TolkaTouch

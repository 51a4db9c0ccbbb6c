#include "platform/LogRateGuard.h"

#include <gtest/gtest.h>

#include <vector>

namespace TolkaTouch {
namespace {

constexpr uint64_t kMillisecond = 1'000'000;
constexpr uint64_t kSecond = 1000 * kMillisecond;
constexpr int kDefault = 2;
constexpr int kError = 3;
const char* const kFrameFormat = "Received image frame: %ju";
const char* const kOtherFormat = "Dispatch event: %s";

using Verdict = LogRateGuard::Verdict;

// The verdicts for lines of one format at 125 a second (every 8 ms) from time zero.
std::vector<Verdict> verdictsAt125Hz(LogRateGuard& guard, const LogRate& rate, int count, int level = kDefault) {
    std::vector<Verdict> verdicts;
    for (int i = 0; i < count; ++i) verdicts.push_back(guard.admit(kFrameFormat, rate, i * 8 * kMillisecond, level).verdict);
    return verdicts;
}

TEST(LogRateGuardTest, TheFirstTenLinesOfAFormatAreWrittenAndTheNextAreFolded) {
    LogRateGuard guard;
    const std::vector<Verdict> verdicts = verdictsAt125Hz(guard, LogRate{}, 12);
    const std::vector<Verdict> expected{10, Verdict::Write};
    EXPECT_EQ(std::vector<Verdict>(verdicts.begin(), verdicts.begin() + 10), expected);
    EXPECT_EQ(verdicts[10], Verdict::Fold);
    EXPECT_EQ(verdicts[11], Verdict::Fold);
}

TEST(LogRateGuardTest, AFormatAt125HzWritesOneSummaryASecondAfterItsBurst) {
    LogRateGuard guard;
    const std::vector<Verdict> verdicts = verdictsAt125Hz(guard, LogRate{}, 125 * 10);
    int written = 0, summaries = 0;
    for (Verdict verdict : verdicts) {
        written += verdict == Verdict::Write;
        summaries += verdict == Verdict::Summary;
    }
    EXPECT_EQ(written, 10);
    // The bucket refills a line a second; the first second's line is taken by the summary.
    EXPECT_EQ(summaries, 9);
}

TEST(LogRateGuardTest, ASummaryCountsTheFoldedLinesAndItselfSinceTheFirstFolded) {
    LogRateGuard guard;
    const LogRate rate{1, 1.0, false};
    EXPECT_EQ(guard.admit(kFrameFormat, rate, 0, kDefault).verdict, Verdict::Write);
    EXPECT_EQ(guard.admit(kFrameFormat, rate, 100 * kMillisecond, kDefault).verdict, Verdict::Fold);
    EXPECT_EQ(guard.admit(kFrameFormat, rate, 500 * kMillisecond, kDefault).verdict, Verdict::Fold);
    const LogRateGuard::Decision summary = guard.admit(kFrameFormat, rate, 1100 * kMillisecond, kDefault);
    EXPECT_EQ(summary, (LogRateGuard::Decision{Verdict::Summary, 3, 1.0, kDefault}));
}

TEST(LogRateGuardTest, ASummaryOfFoldedErrorsIsAtErrorLevel) {
    LogRateGuard guard;
    const LogRate rate{1, 1.0, false};
    guard.admit(kFrameFormat, rate, 0, kError);
    guard.admit(kFrameFormat, rate, 10 * kMillisecond, kError);
    EXPECT_EQ(guard.admit(kFrameFormat, rate, kSecond, kDefault).level, kError);
}

TEST(LogRateGuardTest, EachFormatHasItsOwnBucket) {
    LogRateGuard guard;
    const LogRate rate{1, 1.0, false};
    EXPECT_EQ(guard.admit(kFrameFormat, rate, 0, kDefault).verdict, Verdict::Write);
    EXPECT_EQ(guard.admit(kFrameFormat, rate, 1, kDefault).verdict, Verdict::Fold);
    EXPECT_EQ(guard.admit(kOtherFormat, rate, 2, kDefault).verdict, Verdict::Write);
}

TEST(LogRateGuardTest, AnUnlimitedFormatIsNeverFolded) {
    LogRateGuard guard;
    const std::vector<Verdict> verdicts = verdictsAt125Hz(guard, LogRate{0, 0, true}, 500);
    EXPECT_EQ(verdicts, std::vector<Verdict>(500, Verdict::Write));
}

TEST(LogRateGuardTest, FlushWritesTheSummaryOfABurstThatStoppedOnceItsRateAllows) {
    LogRateGuard guard;
    const LogRate rate{1, 1.0, false};
    guard.admit(kFrameFormat, rate, 0, kDefault);
    guard.admit(kFrameFormat, rate, 8 * kMillisecond, kDefault);
    guard.admit(kFrameFormat, rate, 16 * kMillisecond, kDefault);
    EXPECT_TRUE(guard.flush(500 * kMillisecond).empty());
    const std::vector<LogRateGuard::Pending> due = guard.flush(kSecond + 8 * kMillisecond);
    ASSERT_EQ(due.size(), 1u);
    EXPECT_EQ(due[0], (LogRateGuard::Pending{kFrameFormat, kDefault, 2, 1.0}));
    EXPECT_TRUE(guard.flush(10 * kSecond).empty());
}

TEST(LogRateGuardTest, FlushingEverythingAtExitCountsWhatTheRateWouldStillHold) {
    LogRateGuard guard;
    const LogRate rate{1, 1.0, false};
    guard.admit(kFrameFormat, rate, 0, kDefault);
    guard.admit(kFrameFormat, rate, 8 * kMillisecond, kError);
    const std::vector<LogRateGuard::Pending> due = guard.flush(16 * kMillisecond, true);
    ASSERT_EQ(due.size(), 1u);
    EXPECT_EQ(due[0].folded, 1u);
    EXPECT_EQ(due[0].level, kError);
}

TEST(LogRateGuardTest, TheSummaryLineIsTheLastLineWithTheCountAndSpan) {
    EXPECT_EQ(foldedSummary("Received image frame: 1245", 121, 0.98),
              "Received image frame: 1245 (121 lines like this in 1.0 s, this the last)");
}

}  // namespace
}  // namespace TolkaTouch

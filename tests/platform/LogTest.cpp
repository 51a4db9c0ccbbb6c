#include "platform/Log.h"

#include "platform/Format.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <stdexcept>
#include <string>

#include "platform/PropertyValue.h"

namespace TolkaTouch {
namespace {

// The starting debug levels come from the environment when the first log is made; these tests
// are about the defaults, so a developer's own setting must not leak in.
const bool environmentCleared = [] { return unsetenv("TOLKATOUCH_DEBUG") == 0; }();

constexpr const char* kSubsystem = "com.zantor.hid.TolkaTouch";

class LogTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(environmentCleared);
        SystemLog::setSink(sink);
    }
    void TearDown() override {
        SystemLog::setSink(nullptr);
        SystemLog::setDebugEnabled(false);
    }

    std::shared_ptr<SystemLog::MemorySink> sink = std::make_shared<SystemLog::MemorySink>();
};

TEST_F(LogTest, LevelNamesAreDebugDefaultAndError) {
    EXPECT_STREQ(logLevelName(LogLevel::Debug), "debug");
    EXPECT_STREQ(logLevelName(LogLevel::Default), "default");
    EXPECT_STREQ(logLevelName(LogLevel::Error), "error");
}

TEST_F(LogTest, AMinimumLevelKeepsThatLevelAndThoseAboveIt) {
    const Log log(kSubsystem, "Levels");
    SystemLog::setMinimumLevel(static_cast<int>(LogLevel::Error), "Levels");
    log.debug("d");
    log.log("default");
    log.error("e");
    EXPECT_EQ(sink->messages(), (std::vector<std::string>{"e"}));
    SystemLog::setMinimumLevel(kLogOff, "Levels");
    log.error("dropped");
    EXPECT_EQ(sink->messages(), (std::vector<std::string>{"e"}));
    SystemLog::setMinimumLevel(static_cast<int>(LogLevel::Debug), "Levels");
    EXPECT_TRUE(log.debugEnabled());
    SystemLog::setMinimumLevel(static_cast<int>(LogLevel::Default), "Levels");
}

TEST_F(LogTest, LevelNamesReadBackAndOtherWordsAreNoLevel) {
    for (const char* name : {"debug", "info", "default", "error", "fault", "off"}) {
        const auto level = SystemLog::levelFromName(name);
        ASSERT_TRUE(level) << name;
        EXPECT_STREQ(SystemLog::levelName(*level), name);
    }
    EXPECT_FALSE(SystemLog::levelFromName("verbose"));
}

TEST_F(LogTest, AConfigurationSetsEachCategoryAndTheRest) {
    const Log algs(kSubsystem, "ConfiguredAlgs");
    const Log other(kSubsystem, "ConfiguredOther");
    SystemLog::applyConfiguration("# levels\nConfiguredAlgs debug\n\n* error   # everything else\n");
    EXPECT_TRUE(algs.debugEnabled());
    EXPECT_FALSE(other.enabled(LogLevel::Default));
    EXPECT_TRUE(other.enabled(LogLevel::Error));
    EXPECT_EQ(SystemLog::minimumLevels().at("*"), "error");
    EXPECT_EQ(SystemLog::minimumLevels().at("ConfiguredAlgs"), "debug");
    SystemLog::applyConfiguration("* default\n");
}

TEST_F(LogTest, AConfigurationLineThatDoesNotReadIsRefusedAndNothingIsApplied) {
    const Log log(kSubsystem, "Refused");
    try {
        SystemLog::applyConfiguration("Refused debug\nAlgs loud\n");
        FAIL() << "taken";
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(),
                     "line 2: expected a category (or *) and one of debug, info, default, error, fault, off");
    }
    EXPECT_FALSE(log.debugEnabled());
}

TEST_F(LogTest, LogKeepsItsSubsystemAndCategory) {
    const Log log(kSubsystem, "Algs");
    EXPECT_EQ(log.subsystem(), kSubsystem);
    EXPECT_EQ(log.category(), "Algs");
}

TEST_F(LogTest, DebugIsOffByDefaultAndWritesNothing) {
    const Log log(kSubsystem, "DefaultsCategory");
    EXPECT_FALSE(log.debugEnabled());
    log.debug("frame %u", 7u);
    EXPECT_TRUE(sink->records().empty());
}

TEST_F(LogTest, DefaultAndErrorLinesAreWrittenWhileDebugIsOff) {
    const Log log(kSubsystem, "HIDService");
    log.log("Version=%d", 1);
    log.error("open failed: 0x%08X", 0xE00002BEu);
    const std::vector<LogRecord> expected{
        {kSubsystem, "HIDService", LogLevel::Default, "Version=1"},
        {kSubsystem, "HIDService", LogLevel::Error, "open failed: 0xE00002BE"},
    };
    EXPECT_EQ(sink->records(), expected);
}

TEST_F(LogTest, MemorySinkKeepsExactRecordsInOrderAcrossLevelsAndCategories) {
    SystemLog::setDebugEnabled(true);
    const Log algs(kSubsystem, "Algs");
    const Log service(kSubsystem, "HIDService");
    algs.debug("ActiveRegion=%d", 2);
    service.log("%s", PropertyValue(PropertyValue::Array{1, "x"}).description().c_str());
    algs.error("%s", "bad");
    const std::vector<LogRecord> expected{
        {kSubsystem, "Algs", LogLevel::Debug, "ActiveRegion=2"},
        {kSubsystem, "HIDService", LogLevel::Default, "[1, \"x\"]"},
        {kSubsystem, "Algs", LogLevel::Error, "bad"},
    };
    EXPECT_EQ(sink->records(), expected);
    EXPECT_EQ(sink->messages(), (std::vector<std::string>{"ActiveRegion=2", "[1, \"x\"]", "bad"}));
}

TEST_F(LogTest, EnablingOneCategoryLeavesTheOthersOff) {
    const Log algs(kSubsystem, "AlgsOnly");
    const Log service(kSubsystem, "ServiceStaysOff");
    SystemLog::setDebugEnabled(true, "AlgsOnly");
    EXPECT_TRUE(algs.debugEnabled());
    EXPECT_FALSE(service.debugEnabled());
    algs.debug("one");
    service.debug("two");
    EXPECT_EQ(sink->messages(), std::vector<std::string>{"one"});
}

TEST_F(LogTest, EnablingEveryCategoryAlsoCoversLogsMadeLater) {
    const Log before(kSubsystem, "MadeBefore");
    SystemLog::setDebugEnabled(true);
    const Log after(kSubsystem, "MadeAfter");
    EXPECT_TRUE(before.debugEnabled());
    EXPECT_TRUE(after.debugEnabled());
    SystemLog::setDebugEnabled(false);
    EXPECT_FALSE(before.debugEnabled());
    EXPECT_FALSE(after.debugEnabled());
}

TEST_F(LogTest, LogsOfTheSameCategoryShareTheirLevel) {
    const Log first(kSubsystem, "Shared");
    const Log second(kSubsystem, "Shared");
    SystemLog::setDebugEnabled(true, "Shared");
    EXPECT_TRUE(first.debugEnabled());
    EXPECT_TRUE(second.debugEnabled());
}

TEST_F(LogTest, LongMessagesAreKeptWhole) {
    const Log log(kSubsystem, "Algs");
    const std::string text(5000, 'q');
    log.log("%s!", text.c_str());
    ASSERT_EQ(sink->messages().size(), 1u);
    EXPECT_EQ(sink->messages()[0], text + "!");
}

TEST_F(LogTest, MessagesOneEitherSideOfWhatFitsOnTheStackAreKeptWhole) {
    const Log log(kSubsystem, "Algs");
    for (size_t length : {254u, 255u, 256u, 257u}) log.log("%s", std::string(length, 'w').c_str());
    const std::vector<std::string> messages = sink->messages();
    ASSERT_EQ(messages.size(), 4u);
    EXPECT_EQ(messages[0], std::string(254, 'w'));
    EXPECT_EQ(messages[1], std::string(255, 'w'));
    EXPECT_EQ(messages[2], std::string(256, 'w'));
    EXPECT_EQ(messages[3], std::string(257, 'w'));
}

TEST_F(LogTest, ClearingTheMemorySinkForgetsItsRecords) {
    const Log log(kSubsystem, "Algs");
    log.log("one");
    sink->clear();
    log.log("two");
    EXPECT_EQ(sink->messages(), std::vector<std::string>{"two"});
}

TEST_F(LogTest, RemovingTheSinkStopsRecording) {
    const Log log(kSubsystem, "Algs");
    SystemLog::setDefaultDestination(SystemLog::Destination::StandardError);
    SystemLog::setSink(nullptr);
    testing::internal::CaptureStderr();
    log.log("to standard error");
    const std::string written = testing::internal::GetCapturedStderr();
    SystemLog::setDefaultDestination(SystemLog::Destination::Automatic);
    EXPECT_TRUE(sink->records().empty());
    EXPECT_EQ(written, "[default] Algs: to standard error\n");
}

TEST_F(LogTest, ARateGuardedSinkGetsTheBurstThenOneSummaryOfTheRestAtFlush) {
    SystemLog::setSink(sink, true);
    const Log log(kSubsystem, "Guarded");
    for (unsigned frame = 1; frame <= 15; ++frame) log.log("Received image frame: %u", frame);
    EXPECT_EQ(sink->messages().size(), 10u);
    SystemLog::flushFolded(true);
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 11u);
    EXPECT_EQ(records.back().message.substr(0, 46), "Received image frame: 15 (5 lines like this in");
    EXPECT_EQ(records.back().folded, 5u);
}

TEST_F(LogTest, EachSummaryEndsWithTheTextAndContextOfTheLastLineFoldedSinceTheOneBefore) {
    SystemLog::setSink(sink, true);
    const Log log(kSubsystem, "GuardedTwice");
    SystemLog::setThreadContext(LogContext{"simulated:/a/longer/document/name.json", 1u, 0u});
    for (unsigned frame = 1; frame <= 15; ++frame) log.log("Twice folded frame: %u", frame);
    SystemLog::flushFolded(true);
    SystemLog::setThreadContext(LogContext{"/dev/hidraw0", 2u, 18u});
    for (unsigned frame = 16; frame <= 18; ++frame) log.log("Twice folded frame: %u", frame);
    SystemLog::flushFolded(true);
    SystemLog::flushFolded(true);  // nothing folded since: no third summary
    SystemLog::clearThreadContext();
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 12u);
    EXPECT_EQ(records[10].message.substr(0, 44), "Twice folded frame: 15 (5 lines like this in");
    EXPECT_EQ(records[10].context.device, "simulated:/a/longer/document/name.json");
    EXPECT_EQ(records[11].message.substr(0, 44), "Twice folded frame: 18 (3 lines like this in");
    EXPECT_EQ(records[11].context.device, "/dev/hidraw0");
    EXPECT_EQ(records[11].context.service, 2u);
    EXPECT_EQ(records[11].context.frame, 18u);
    EXPECT_EQ(records[11].folded, 3u);
}

TEST_F(LogTest, AFoldedLineOfNumbersIsFormattedForItsSummaryAsItWouldHaveBeenAtOnce) {
    SystemLog::setSink(sink, true);
    const Log log(kSubsystem, "GuardedNumbers");
    const float third = 1.0f / 3.0f;
    for (int line = 0; line < 12; ++line) {
        log.log("%d %u %.9f %jx %c %lld", -line, 7u, third, static_cast<uintmax_t>(0xfeedull << line), 'a' + line,
                -1234567890123ll);
    }
    SystemLog::flushFolded(true);
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 11u);
    EXPECT_EQ(records[9].message, formatString("%d %u %.9f %jx %c %lld", -9, 7u, third, static_cast<uintmax_t>(0xfeedull << 9),
                                               'a' + 9, -1234567890123ll));
    const std::string last = formatString("%d %u %.9f %jx %c %lld", -11, 7u, third,
                                          static_cast<uintmax_t>(0xfeedull << 11), 'a' + 11, -1234567890123ll);
    EXPECT_EQ(records[10].message.substr(0, last.size() + 15), last + " (2 lines like ");
}

TEST_F(LogTest, FoldedErrorsAreSummarisedAtErrorLevel) {
    SystemLog::setSink(sink, true);
    const Log log(kSubsystem, "GuardedErrors");
    for (unsigned frame = 1; frame <= 12; ++frame) log.error("Disjoint image (frame number: %u -> %u)", frame, frame + 2);
    SystemLog::flushFolded(true);
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 11u);
    EXPECT_EQ(records.back().level, LogLevel::Error);
    EXPECT_EQ(records.back().folded, 2u);
}

TEST_F(LogTest, ARateRuleForAFormatStartLetsThatFormatThroughWhileOthersAreFolded) {
    SystemLog::setSink(sink, true);
    SystemLog::applyConfiguration("rate RuleCategory unlimited Dispatch event\n");
    const Log log(kSubsystem, "RuleCategory");
    for (int i = 0; i < 20; ++i) {
        log.log("Dispatch event: %d", i);
        log.log("Received image frame: %d", i);
    }
    SystemLog::resetRates();
    size_t dispatched = 0;
    for (const std::string& message : sink->messages()) dispatched += message.rfind("Dispatch event: ", 0) == 0;
    EXPECT_EQ(dispatched, 20u);
    EXPECT_EQ(sink->messages().size(), 30u);
    SystemLog::flushFolded(true);
}

TEST_F(LogTest, RateLinesReadWithOrWithoutACategoryAndAFormatStart) {
    EXPECT_EQ(SystemLog::parseRateLine(" 10 1"), (LogRateRule{"", "", LogRate{10, 1.0, false}}));
    EXPECT_EQ(SystemLog::parseRateLine("Algs 5 0.5"), (LogRateRule{"Algs", "", LogRate{5, 0.5, false}}));
    EXPECT_EQ(SystemLog::parseRateLine("HIDService unlimited Dispatch event"),
              (LogRateRule{"HIDService", "Dispatch event", LogRate{0, 0, true}}));
    EXPECT_EQ(SystemLog::parseRateLine("* unlimited"), (LogRateRule{"", "", LogRate{0, 0, true}}));
    for (const char* bad : {"", "fast", "Algs", "Algs 10", "10 0", "0 1", "10 x", "unlimited Dispatch event", "Algs -1 1"}) {
        EXPECT_FALSE(SystemLog::parseRateLine(bad)) << bad;
    }
}

TEST_F(LogTest, ABadRateLineIsRefusedWithItsLineNumber) {
    try {
        SystemLog::applyConfiguration("* default\nrate ten 1\n");
        FAIL() << "accepted";
    } catch (const std::invalid_argument& error) {
        EXPECT_EQ(std::string(error.what()).substr(0, 7), "line 2:");
    }
}

TEST_F(LogTest, ARecordNamesTheCallersSourceLineAndFunction) {
    const Log log(kSubsystem, "Where");
    const unsigned line = __LINE__ + 1;
    log.log("here");
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 1u);
    EXPECT_STREQ(records[0].file, "tests/platform/LogTest.cpp");
    EXPECT_EQ(records[0].line, line);
    EXPECT_STREQ(records[0].function, "TestBody");
}

TEST_F(LogTest, TheMessageIdIsOneForEachFormatWhateverTheValues) {
    const Log log(kSubsystem, "Ids");
    for (int i = 0; i < 2; ++i) log.log("frame %d", i);
    log.log("other %d", 1);
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 3u);
    EXPECT_EQ(SystemLog::messageId(records[0]), SystemLog::messageId(records[1]));
    EXPECT_NE(SystemLog::messageId(records[0]), SystemLog::messageId(records[2]));
    EXPECT_EQ(SystemLog::messageId(records[0]).size(), 32u);
}

TEST_F(LogTest, TheThreadContextNamesTheDeviceServiceAndFrameUntilCleared) {
    const Log log(kSubsystem, "Context");
    SystemLog::setThreadContext(LogContext{"/dev/hidraw3", 2u, 1024u});
    log.log("with");
    SystemLog::clearThreadContext();
    log.log("without");
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0].context.device, "/dev/hidraw3");
    EXPECT_EQ(records[0].context.service, 2u);
    EXPECT_EQ(records[0].context.frame, 1024u);
    EXPECT_TRUE(records[1].context.device.empty());
    EXPECT_FALSE(records[1].context.frame);
}

TEST_F(LogTest, TheObserverSeesEveryLineTheRateGuardFolds) {
    SystemLog::setSink(sink, true);
    auto observer = std::make_shared<SystemLog::MemorySink>();
    SystemLog::setObserver(observer);
    const Log log(kSubsystem, "Observed");
    for (int i = 0; i < 30; ++i) log.log("line %d", i);
    SystemLog::setObserver(nullptr);
    log.log("line %d", 30);
    EXPECT_EQ(observer->messages().size(), 30u);
    EXPECT_EQ(sink->messages().size(), 10u);
    SystemLog::flushFolded(true);
}

}  // namespace
}  // namespace TolkaTouch

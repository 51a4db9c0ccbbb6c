#include "platform/Log.h"

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

}  // namespace
}  // namespace TolkaTouch

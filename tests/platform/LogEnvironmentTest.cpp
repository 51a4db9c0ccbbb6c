// The starting debug levels from TOLKATOUCH_DEBUG. The variable is read once, when the first log
// is made, so it is set before main runs; the "all" and "1" forms run in a fresh child process.
#include "platform/Log.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace TolkaTouch {
namespace {

constexpr const char* kSubsystem = "com.zantor.hid.TolkaTouch";

// A child started for one of the whole-process forms passes that form down in this variable.
constexpr const char* kChildValue = "TOLKATOUCH_DEBUG_TEST_CHILD_VALUE";

const bool environmentSet = [] {
    const char* child = std::getenv(kChildValue);
    return setenv("TOLKATOUCH_DEBUG", child ? child : "HIDService,Recording", 1) == 0;
}();

TEST(LogEnvironmentTest, ListedCategoriesStartWithDebugOn) {
    ASSERT_TRUE(environmentSet);
    EXPECT_TRUE(Log(kSubsystem, "HIDService").debugEnabled());
    EXPECT_TRUE(Log(kSubsystem, "Recording").debugEnabled());
}

TEST(LogEnvironmentTest, CategoriesNotListedStartWithDebugOff) {
    EXPECT_FALSE(Log(kSubsystem, "Algs").debugEnabled());
    EXPECT_FALSE(Log(kSubsystem, "HIDServiceX").debugEnabled());
    EXPECT_FALSE(Log(kSubsystem, "").debugEnabled());
}

TEST(LogEnvironmentTest, ListedCategoriesCanStillBeTurnedOff) {
    const Log log(kSubsystem, "Recording");
    SystemLog::setDebugEnabled(false, "Recording");
    EXPECT_FALSE(log.debugEnabled());
    SystemLog::setDebugEnabled(true, "Recording");
    EXPECT_TRUE(log.debugEnabled());
}

// Runs in a child process whose TOLKATOUCH_DEBUG is value; exits 0 when debug is on for a
// category nobody listed.
void expectEveryCategoryOnFor(const char* value) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");  // the child re-executes, so its levels start afresh
    ASSERT_EQ(setenv(kChildValue, value, 1), 0);
    EXPECT_EXIT(std::exit(Log(kSubsystem, "AnyCategory").debugEnabled() ? 0 : 1), ::testing::ExitedWithCode(0), "")
        << "TOLKATOUCH_DEBUG=" << value;
    unsetenv(kChildValue);
}

TEST(LogEnvironmentTest, AllTurnsDebugOnForEveryCategory) { expectEveryCategoryOnFor("all"); }

TEST(LogEnvironmentTest, OneTurnsDebugOnForEveryCategory) { expectEveryCategoryOnFor("1"); }

TEST(LogEnvironmentTest, AnyOtherSingleWordNamesOneCategory) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    ASSERT_EQ(setenv(kChildValue, "Algs", 1), 0);
    EXPECT_EXIT(std::exit(Log(kSubsystem, "Algs").debugEnabled() && !Log(kSubsystem, "HIDService").debugEnabled()
                              ? 0
                              : 1),
                ::testing::ExitedWithCode(0), "");
    unsetenv(kChildValue);
}

}  // namespace
}  // namespace TolkaTouch

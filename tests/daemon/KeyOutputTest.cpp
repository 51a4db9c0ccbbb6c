#include "daemon/KeyOutput.h"

#include <gtest/gtest.h>
#include <linux/input-event-codes.h>

namespace TolkaTouch {
namespace {

TEST(KeyOutputTest, WriteIsDescribedByKeyNameAndValue) {
    EXPECT_EQ(describeKeyWrite({KEY_PLAYPAUSE, 1}), "KEY_PLAYPAUSE 1");
    EXPECT_EQ(describeKeyWrite({KEY_VOLUMEUP, 0}), "KEY_VOLUMEUP 0");
    EXPECT_EQ(describeKeyWrite({KEY_VOLUMEDOWN, 1}), "KEY_VOLUMEDOWN 1");
    EXPECT_EQ(describeKeyWrite({KEY_VOICECOMMAND, 0}), "KEY_VOICECOMMAND 0");
}

TEST(KeyOutputTest, AnyKeyIsDescribedByTheInputSubsystemsName) {
    EXPECT_EQ(describeKeyWrite({30, 1}), "KEY_A 1");
}

TEST(KeyOutputTest, ACodeWithoutANameIsDescribedByItsNumber) {
    EXPECT_EQ(describeKeyWrite({0x2fe, 0}), "KEY_766 0");
}

}  // namespace
}  // namespace TolkaTouch

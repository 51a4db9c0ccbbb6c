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

TEST(KeyOutputTest, OtherKeyIsDescribedByItsCode) {
    EXPECT_EQ(describeKeyWrite({30, 1}), "KEY_30 1");
}

}  // namespace
}  // namespace TolkaTouch

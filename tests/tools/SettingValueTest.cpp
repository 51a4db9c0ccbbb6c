#include "tools/SettingValue.h"

#include <gtest/gtest.h>

namespace TolkaTouch::Tools {
namespace {

TEST(SettingValueTest, JsonTextGivesItsValue) {
    EXPECT_EQ(settingValueFromText("true"), PropertyValue(true));
    EXPECT_EQ(settingValueFromText("700"), PropertyValue(700u));
    EXPECT_EQ(settingValueFromText("-3"), PropertyValue(-3));
    EXPECT_EQ(settingValueFromText("0.5"), PropertyValue(0.5));
    EXPECT_EQ(settingValueFromText("\"text\""), PropertyValue("text"));
    EXPECT_EQ(settingValueFromText("null"), PropertyValue());
    EXPECT_EQ(settingValueFromText("[1, 2]"), PropertyValue(PropertyValue::Array{PropertyValue(1u), PropertyValue(2u)}));
}

TEST(SettingValueTest, TextThatIsNotJsonStaysText) {
    EXPECT_EQ(settingValueFromText("yes"), PropertyValue("yes"));
    EXPECT_EQ(settingValueFromText(""), PropertyValue(""));
    EXPECT_EQ(settingValueFromText("1, 2"), PropertyValue("1, 2"));
    EXPECT_EQ(settingValueFromText("1] [2"), PropertyValue("1] [2"));
}

TEST(SettingValueTest, AssignmentSplitsAtTheFirstEquals) {
    const auto [key, value] = settingFromAssignment("Algs.HoldTimeoutMilliseconds=700");
    EXPECT_EQ(key, "Algs.HoldTimeoutMilliseconds");
    EXPECT_EQ(value, PropertyValue(700u));
    const auto [otherKey, otherValue] = settingFromAssignment("Key=a=b");
    EXPECT_EQ(otherKey, "Key");
    EXPECT_EQ(otherValue, PropertyValue("a=b"));
}

}  // namespace
}  // namespace TolkaTouch::Tools

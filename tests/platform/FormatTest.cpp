#include "platform/Format.h"

#include <gtest/gtest.h>

#include <string>

namespace TolkaTouch {
namespace {

TEST(FormatTest, ShortTextIsFormattedLikePrintf) {
    EXPECT_EQ(formatString("%s=%d %02x", "ActiveRegion", 3, 10), "ActiveRegion=3 0a");
    EXPECT_EQ(formatString("%s", ""), "");
}

TEST(FormatTest, TextLongerThanTheSmallBufferIsKeptWhole) {
    const std::string long1000(1000, 'x');
    const std::string text = formatString("<%s>", long1000.c_str());
    EXPECT_EQ(text, "<" + long1000 + ">");
    const std::string exactly255(255, 'y');
    EXPECT_EQ(formatString("%s", exactly255.c_str()), exactly255);
    const std::string exactly256(256, 'z');
    EXPECT_EQ(formatString("%s", exactly256.c_str()), exactly256);
}

TEST(FormatTest, NegativeFieldWidthLeftAlignsWithItsAbsoluteWidth) {
    EXPECT_EQ(formatString("%*s|", -3, ""), "   |");
    EXPECT_EQ(formatString("%*jd|", 2, intmax_t{7}), " 7|");
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/Hex.h"

#include <stdexcept>

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

const std::vector<uint8_t> kBytes{0x0a, 0xff, 0x00};

TEST(HexTest, TheRecordingFormWritesTwoLowerCaseDigitsAndASpaceAfterEachByte) {
    EXPECT_EQ(Hex::text(kBytes, Hex::Spacing::AfterEach), "0a ff 00 ");
    EXPECT_EQ(Hex::text({}, Hex::Spacing::AfterEach), "");
}

TEST(HexTest, TheReadableFormPutsSpacesOnlyBetweenBytes) {
    EXPECT_EQ(Hex::text(kBytes, Hex::Spacing::Between), "0a ff 00");
    EXPECT_EQ(Hex::text(std::vector<uint8_t>{0x7f}, Hex::Spacing::Between), "7f");
}

TEST(HexTest, PairsAreReadInEitherCaseWithTheIgnoredCharactersSkipped) {
    EXPECT_EQ(Hex::bytesFromPairs("0A ff:00", " :"), kBytes);
    EXPECT_EQ(Hex::bytesFromPairs("0aff00"), kBytes);
    EXPECT_EQ(Hex::bytesFromPairs(""), std::vector<uint8_t>{});
}

TEST(HexTest, ADigitThatIsNotHexOrALonelyDigitIsRefused) {
    try {
        Hex::bytesFromPairs("0g");
        FAIL();
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "not hex");
    }
    try {
        Hex::bytesFromPairs("0a f");
        FAIL();
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "odd number of hex digits");
    }
    EXPECT_THROW(Hex::bytesFromPairs("0a:ff"), std::invalid_argument);
}

TEST(HexTest, WrittenTextReadsBackAsTheSameBytes) {
    std::vector<uint8_t> all(256);
    for (size_t i = 0; i < all.size(); ++i) all[i] = static_cast<uint8_t>(i);
    EXPECT_EQ(Hex::bytesFromPairs(Hex::text(all, Hex::Spacing::AfterEach)), all);
    EXPECT_EQ(Hex::bytesFromPairs(Hex::text(all, Hex::Spacing::Between)), all);
}

}  // namespace
}  // namespace TolkaTouch

#include "common/Util.h"

#include <gtest/gtest.h>

#include <random>
#include <stdexcept>
#include <string>
#include <vector>

namespace TolkaTouch {
namespace {

using Bytes = std::vector<uint8_t>;

// Expects bytesFromHexString(text) to fail with exactly the "invalid hex string" message.
void expectInvalidHexString(const std::string& text) {
    try {
        (void)Util::bytesFromHexString(text);
        ADD_FAILURE() << "no error for \"" << text << "\"";
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "invalid hex string") << "for \"" << text << "\"";
    }
}

InputReport::Image imageWithPixels(const std::vector<int16_t>& pixels, uint32_t frameNumber = 0, uint32_t timeMs = 0) {
    InputReport::Image image{};
    image.frameNumber = frameNumber;
    image.timeMs = timeMs;
    for (size_t i = 0; i < kPixelCount && i < pixels.size(); ++i) image.pixels[i] = pixels[i];
    return image;
}

std::vector<std::string> lines(const std::string& text) {
    std::vector<std::string> result;
    size_t start = 0;
    for (size_t end; (end = text.find('\n', start)) != std::string::npos; start = end + 1)
        result.push_back(text.substr(start, end - start));
    result.push_back(text.substr(start));
    return result;
}

// --- hex text ---

TEST(UtilTest, HexStringOfNoBytesIsEmpty) { EXPECT_EQ(Util::hexStringFromBytes({}), ""); }

TEST(UtilTest, HexStringOfTheByte05IsItsTwoDigitsAndOneSpace) { EXPECT_EQ(Util::hexStringFromBytes({0x05}), "05 "); }

TEST(UtilTest, HexStringOfThreeBytesIsLowerCasePairsEachFollowedByASpace) {
    const std::string text = Util::hexStringFromBytes({0x0A, 0xFF, 0x00});
    EXPECT_EQ(text, "0a ff 00 ");
    EXPECT_EQ(text.size(), 9u);
}

TEST(UtilTest, BytesFromTheEmptyStringAreNone) { EXPECT_EQ(Util::bytesFromHexString(std::string()), Bytes{}); }

TEST(UtilTest, BytesFromAStringOfSpacesAreNone) { EXPECT_EQ(Util::bytesFromHexString("    "), Bytes{}); }

TEST(UtilTest, BytesFromAnAbsentStringAreNone) {
    EXPECT_EQ(Util::bytesFromHexString(static_cast<const std::string*>(nullptr)), Bytes{});
}

TEST(UtilTest, BytesFromAPresentStringPointerReadThatString) {
    const std::string text = "0a ff";
    EXPECT_EQ(Util::bytesFromHexString(&text), (Bytes{0x0A, 0xFF}));
}

TEST(UtilTest, BytesFrom0x1fAreThe0x1FByte) { EXPECT_EQ(Util::bytesFromHexString("0x1f"), Bytes{0x1F}); }

TEST(UtilTest, BytesFromUpperCasePrefixAndDigitsAreRead) { EXPECT_EQ(Util::bytesFromHexString("0X1F"), Bytes{0x1F}); }

TEST(UtilTest, BytesFromUpperCaseFFAreThe0xFFByte) { EXPECT_EQ(Util::bytesFromHexString("FF"), Bytes{0xFF}); }

TEST(UtilTest, BytesFrom12zz34StopAtTheFirstTokenThatDoesNotRead) {
    EXPECT_EQ(Util::bytesFromHexString("12 zz 34"), Bytes{0x12});
}

TEST(UtilTest, BytesFrom12And1ffFailWithInvalidHexString) { expectInvalidHexString("12 1ff"); }

TEST(UtilTest, BytesFromHexTextWithAndWithoutTheTrailingSpaceAreTheSame) {
    EXPECT_EQ(Util::bytesFromHexString("0a ff 00 "), (Bytes{0x0A, 0xFF, 0x00}));
    EXPECT_EQ(Util::bytesFromHexString("0a ff 00"), (Bytes{0x0A, 0xFF, 0x00}));
}

TEST(UtilTest, BytesFromCommaSeparatedTextEndAtTheComma) { EXPECT_EQ(Util::bytesFromHexString("0a,ff"), Bytes{0x0A}); }

TEST(UtilTest, BytesFromTheToken100FailWithInvalidHexString) { expectInvalidHexString("100"); }

TEST(UtilTest, BytesFromTheTokenFf0FailWithInvalidHexString) { expectInvalidHexString("ff0"); }

TEST(UtilTest, BytesFromTheLargestSixteenBitTokenFailWithInvalidHexString) { expectInvalidHexString("ffff"); }

TEST(UtilTest, BytesFromATokenBeyondSixteenBitsEndTheParseQuietly) {
    EXPECT_EQ(Util::bytesFromHexString("10000"), Bytes{});
    EXPECT_EQ(Util::bytesFromHexString("12 10000 34"), Bytes{0x12});
}

TEST(UtilTest, BytesFromANegativeTokenFailWithInvalidHexString) {
    // The stream reads "-1" into 16 bits as 0xFFFF, which is not a byte.
    expectInvalidHexString("-1");
}

TEST(UtilTest, BytesFromASingleDigitTokenAreThatDigit) { EXPECT_EQ(Util::bytesFromHexString("a"), Bytes{0x0A}); }

TEST(UtilTest, BytesFromTokensSeparatedByAnyWhitespaceAreAllRead) {
    EXPECT_EQ(Util::bytesFromHexString("\t1\n02  \r\n3 "), (Bytes{0x01, 0x02, 0x03}));
}

TEST(UtilTest, HexRoundTripKeepsEveryByteValue) {
    Bytes all(256);
    for (size_t i = 0; i < all.size(); ++i) all[i] = static_cast<uint8_t>(i);
    EXPECT_EQ(Util::bytesFromHexString(Util::hexStringFromBytes(all)), all);
}

TEST(UtilTest, HexRoundTripKeepsRandomByteVectors) {
    std::mt19937 random(20261121);
    std::uniform_int_distribution<int> lengthOf(0, 600);
    std::uniform_int_distribution<int> byteOf(0, 255);
    for (int round = 0; round < 500; ++round) {
        Bytes bytes(static_cast<size_t>(lengthOf(random)));
        for (auto& byte : bytes) byte = static_cast<uint8_t>(byteOf(random));
        ASSERT_EQ(Util::bytesFromHexString(Util::hexStringFromBytes(bytes)), bytes) << "round " << round;
    }
}

// --- state-key domains ---

TEST(UtilTest, StripDomainRemovesTheDomainAndItsDot) {
    std::string key = "Algs.numTaps";
    EXPECT_TRUE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "numTaps");
}

TEST(UtilTest, StripDomainLeavesAKeyOfAnotherDomainAlone) {
    std::string key = "Algsx.numTaps";
    EXPECT_FALSE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "Algsx.numTaps");
}

TEST(UtilTest, StripDomainLeavesAKeyShorterThanThePrefixAlone) {
    std::string key = "Alg";
    EXPECT_FALSE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "Alg");
}

TEST(UtilTest, StripDomainOfAKeyThatIsJustThePrefixLeavesTheEmptyString) {
    std::string key = "Algs.";
    EXPECT_TRUE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "");
}

TEST(UtilTest, StripDomainOfTheBareDomainWithoutDotFails) {
    std::string key = "Algs";
    EXPECT_FALSE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "Algs");
}

TEST(UtilTest, StripDomainRemovesOnlyTheFirstOccurrenceAtTheStart) {
    std::string key = "Pipeline.Pipeline.X";
    EXPECT_TRUE(Util::stripDomainFromKey(key, "Pipeline"));
    EXPECT_EQ(key, "Pipeline.X");
    std::string inner = "Pipeline.Algs.HoldTimeoutMilliseconds";
    EXPECT_FALSE(Util::stripDomainFromKey(inner, "Algs"));
    EXPECT_EQ(inner, "Pipeline.Algs.HoldTimeoutMilliseconds");
}

TEST(UtilTest, StripDomainIsCaseSensitive) {
    std::string key = "algs.numTaps";
    EXPECT_FALSE(Util::stripDomainFromKey(key, "Algs"));
    EXPECT_EQ(key, "algs.numTaps");
}

TEST(UtilTest, StripDomainWithAnEmptyDomainRemovesALeadingDot) {
    std::string dotted = ".numTaps";
    EXPECT_TRUE(Util::stripDomainFromKey(dotted, ""));
    EXPECT_EQ(dotted, "numTaps");
    std::string plain = "numTaps";
    EXPECT_FALSE(Util::stripDomainFromKey(plain, ""));
    EXPECT_EQ(plain, "numTaps");
}

// --- time conversion with the host's 1/1 timebase ---

TEST(UtilTest, WithAOneToOneTimebaseTicksAndNanosecondsAreEqual) {
    for (uint64_t value : {uint64_t{0}, uint64_t{1}, uint64_t{999}, uint64_t{1} << 40, UINT64_MAX}) {
        EXPECT_EQ(Util::nanosecondsFromMachTime(value), value);
        EXPECT_EQ(Util::machTimeFromNanoseconds(value), value);
        EXPECT_EQ(Util::nanosecondsFromMachTime(Util::machTimeFromNanoseconds(value)), value);
    }
}

// --- the text drawing of an image ---

TEST(UtilTest, ImageDrawingOfAnAllZeroImagePrintsASpaceZeroAndTwoSpacesInEveryField) {
    const std::string expected =
        "# Image frame 0    time 0 ms\n"
        "\n"
        "            0        0            \n"
        "                 0                 \n"
        "      0                    0      \n"
        "          0            0          \n"
        "      0                    0      \n"
        "  0                            0  \n"
        "                 0                 \n"
        "  0                            0  \n"
        "      0                    0      \n"
        "          0            0          \n"
        "      0                    0      \n"
        "                 0                 \n"
        "            0        0            \n";
    EXPECT_EQ(Util::stringFromImage(InputReport::Image{}, false), expected);
    EXPECT_EQ(Util::stringFromImage(InputReport::Image{}, true), expected);
}

TEST(UtilTest, ImageDrawingOfMinus32768PrintsItsSixCharactersAndTwoSpaces) {
    std::vector<int16_t> pixels(kPixelCount, 0);
    pixels['K' - 'A'] = -32768;
    const auto rows = lines(Util::stringFromImage(imageWithPixels(pixels), false));
    ASSERT_EQ(rows.size(), 16u);
    EXPECT_EQ(rows[8], std::string(16, ' ') + "-32768  " + std::string(15, ' '));
}

TEST(UtilTest, ImageDrawingPadsEachReadingToItsRunOrOneSpaceBeyond) {
    // 7 fills a four-letter run as " 7  ", 123 as "123 ", 12345 and -1234 overflow it by one and
    // still get one space after them.
    std::vector<int16_t> pixels{7, 123, 12345, -1234, -32768, 0, 1, -1, 99, 100, 32767, -5, 55, -99, 10};
    const std::string expected =
        "# Image frame 4294967295    time 123456 ms\n"
        "\n"
        "           -1        1            \n"
        "                99                 \n"
        "     123                   7      \n"
        "         100          100         \n"
        "      0                   -32768      \n"
        "  7                           123 \n"
        "                32767                \n"
        " -1234                          12345 \n"
        "     -32768                    0      \n"
        "         -5           -5          \n"
        "     12345                  -1234     \n"
        "                55                 \n"
        "           -99      10            \n";
    EXPECT_EQ(Util::stringFromImage(imageWithPixels(pixels, 4294967295u, 123456u), false), expected);
}

TEST(UtilTest, ImageDrawingOfRawPixelsShowsTheUnsignedReadings) {
    InputReport::Image image{};
    image.frameNumber = 1;
    image.timeMs = 2;
    for (size_t i = 0; i < kPixelCount; ++i) {
        image.rawPixels[i] = static_cast<uint16_t>(1000 + i);
        image.pixels[i] = -7;  // must not show
    }
    const std::string expected =
        "# Image frame 1    time 2 ms\n"
        "\n"
        "           1007     1006          \n"
        "                1008               \n"
        "     1001                 1000    \n"
        "         1009         1009        \n"
        "     1005                 1004    \n"
        " 1000                         1001\n"
        "                1010               \n"
        " 1003                         1002\n"
        "     1004                 1005    \n"
        "         1011         1011        \n"
        "     1002                 1003    \n"
        "                1012               \n"
        "           1013     1014          \n";
    EXPECT_EQ(Util::stringFromImage(image, true), expected);
}

TEST(UtilTest, ImageDrawingOfRaw65535PrintsItUnsigned) {
    InputReport::Image image{};
    image.rawPixels['K' - 'A'] = 65535;
    image.pixels['K' - 'A'] = -1;
    EXPECT_EQ(lines(Util::stringFromImage(image, true))[8], std::string(16, ' ') + "65535 " + std::string(15, ' '));
    EXPECT_EQ(lines(Util::stringFromImage(image, false))[8], std::string(16, ' ') + "-1  " + std::string(15, ' '));
}

TEST(UtilTest, ImageDrawingRowsAreOneCharacterShorterThanTheLayoutPerRunWhenReadingsFit) {
    const auto rows = lines(Util::stringFromImage(InputReport::Image{}, false));
    ASSERT_EQ(rows.size(), 16u);  // header, blank line, 13 rows, nothing after the last newline
    EXPECT_EQ(rows[0], "# Image frame 0    time 0 ms");
    EXPECT_EQ(rows[1], "");
    const size_t runsPerRow[13] = {2, 1, 2, 2, 2, 2, 1, 2, 2, 2, 2, 1, 2};
    for (size_t row = 0; row < 13; ++row) EXPECT_EQ(rows[row + 2].size(), 36 - runsPerRow[row]) << "row " << row + 1;
    EXPECT_EQ(rows[15], "");
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/Hex.h"

#include <gtest/gtest.h>

#include <cctype>
#include <optional>
#include <random>
#include <string>
#include <vector>

namespace TolkaTouch {
namespace {

using Bytes = std::vector<uint8_t>;

std::optional<Bytes> decoded(const std::string& text) {
    Bytes bytes{0xEE};  // storage reused, whatever it held
    if (!Hex::bytesFromRecordingForm(text, bytes)) return std::nullopt;
    return bytes;
}

int digitValue(unsigned char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

// The writer's form read one character at a time: what the decoder must agree with.
std::optional<Bytes> byTheRules(const std::string& text) {
    if (text.size() % 3 == 1) return std::nullopt;
    Bytes bytes;
    for (size_t at = 0; at < text.size(); at += 3) {
        const int high = digitValue(static_cast<unsigned char>(text[at]));
        const int low = digitValue(static_cast<unsigned char>(text[at + 1]));
        if (high < 0 || low < 0) return std::nullopt;
        if (at + 2 < text.size() && text[at + 2] != ' ') return std::nullopt;
        bytes.push_back(static_cast<uint8_t>(high << 4 | low));
    }
    return bytes;
}

std::string writerForm(const Bytes& bytes, bool upper) {
    static const char* lowerDigits = "0123456789abcdef";
    static const char* upperDigits = "0123456789ABCDEF";
    const char* digits = upper ? upperDigits : lowerDigits;
    std::string text;
    for (const uint8_t byte : bytes) text += {digits[byte >> 4], digits[byte & 15], ' '};
    return text;
}

TEST(HexRecordingFormTest, EveryByteValueDecodesInEitherCaseWithOrWithoutTheLastSpace) {
    Bytes every(256);
    for (int i = 0; i < 256; ++i) every[i] = static_cast<uint8_t>(i);
    for (const bool upper : {false, true}) {
        std::string text = writerForm(every, upper);
        EXPECT_EQ(decoded(text), every);
        text.pop_back();
        EXPECT_EQ(decoded(text), every);
    }
}

TEST(HexRecordingFormTest, EmptyTextIsNoBytes) { EXPECT_EQ(decoded(""), Bytes{}); }

TEST(HexRecordingFormTest, TextOfAnotherFormIsRefused) {
    EXPECT_EQ(decoded("0"), std::nullopt);
    EXPECT_EQ(decoded("01 0"), std::nullopt);
    EXPECT_EQ(decoded("01,0a"), std::nullopt);
    EXPECT_EQ(decoded("1 a  ff"), std::nullopt);
    EXPECT_EQ(decoded("0g "), std::nullopt);
}

// A report's 73 bytes span four blocks of sixteen and a remainder: a wrong character anywhere,
// of any value, is refused, and nothing else is.
TEST(HexRecordingFormTest, OneWrongCharacterAnywhereInALongReportIsRefused) {
    Bytes report(73);
    for (size_t i = 0; i < report.size(); ++i) report[i] = static_cast<uint8_t>(i * 37 + 11);
    const std::string text = writerForm(report, false);
    for (size_t at = 0; at < text.size(); ++at) {
        for (int c = 0; c < 256; ++c) {
            std::string changed = text;
            changed[at] = static_cast<char>(c);
            ASSERT_EQ(decoded(changed), byTheRules(changed)) << "character " << c << " at " << at;
        }
    }
}

TEST(HexRecordingFormTest, RandomTextsOfHexLikeCharactersDecodeByTheRules) {
    const std::string alphabet = "0123456789abcdefABCDEF /:@`gG\x7f\x80\xb0\xff";
    std::mt19937 random(20261124);
    size_t accepted = 0;
    for (int round = 0; round < 20000; ++round) {
        const size_t length = random() % 160;
        std::string text;
        for (size_t i = 0; i < length; ++i) {
            // Mostly the writer's form, so that long runs of it are reached.
            const bool formal = random() % 64 != 0;
            if (formal) {
                text += i % 3 == 2 ? ' ' : alphabet[random() % 22];
            } else {
                text += alphabet[random() % alphabet.size()];
            }
        }
        const std::optional<Bytes> expected = byTheRules(text);
        accepted += expected.has_value();
        ASSERT_EQ(decoded(text), expected) << text;
    }
    EXPECT_GT(accepted, 1000u);
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/PropertyValue.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace TolkaTouch {
namespace {

using Kind = PropertyValue::Kind;

TEST(PropertyValueTest, DefaultValueIsNull) {
    const PropertyValue value;
    EXPECT_EQ(value.kind(), Kind::Null);
    EXPECT_TRUE(value.isNull());
    EXPECT_EQ(PropertyValue(nullptr).kind(), Kind::Null);
}

TEST(PropertyValueTest, EveryKindIsWhatItWasMadeFrom) {
    EXPECT_EQ(PropertyValue(true).kind(), Kind::Boolean);
    EXPECT_EQ(PropertyValue(-3).kind(), Kind::Signed);
    EXPECT_EQ(PropertyValue(int64_t{-3}).kind(), Kind::Signed);
    EXPECT_EQ(PropertyValue(3u).kind(), Kind::Unsigned);
    EXPECT_EQ(PropertyValue(uint64_t{3}).kind(), Kind::Unsigned);
    EXPECT_EQ(PropertyValue(0.5).kind(), Kind::Floating);
    EXPECT_EQ(PropertyValue(0.5f).kind(), Kind::Floating);
    EXPECT_EQ(PropertyValue("text").kind(), Kind::String);
    EXPECT_EQ(PropertyValue(std::string("text")).kind(), Kind::String);
    EXPECT_EQ(PropertyValue(PropertyValue::Data{1, 2}).kind(), Kind::Data);
    EXPECT_EQ(PropertyValue(PropertyValue::Array{}).kind(), Kind::Array);
    EXPECT_EQ(PropertyValue(PropertyValue::Dictionary{}).kind(), Kind::Dictionary);
}

TEST(PropertyValueTest, TypedAccessGivesTheValueOnlyForItsOwnKind) {
    const PropertyValue number(int64_t{-3});
    EXPECT_EQ(number.signedInteger(), std::optional<int64_t>(-3));
    EXPECT_EQ(number.unsignedInteger(), std::nullopt);
    EXPECT_EQ(number.floating(), std::nullopt);
    EXPECT_EQ(number.boolean(), std::nullopt);
    EXPECT_EQ(number.string(), nullptr);
    EXPECT_EQ(number.data(), nullptr);
    EXPECT_EQ(number.array(), nullptr);
    EXPECT_EQ(number.dictionary(), nullptr);

    const PropertyValue text("hello");
    ASSERT_NE(text.string(), nullptr);
    EXPECT_EQ(*text.string(), "hello");
    const PropertyValue data(PropertyValue::Data{0x0A, 0xFF});
    ASSERT_NE(data.data(), nullptr);
    EXPECT_EQ(*data.data(), (PropertyValue::Data{0x0A, 0xFF}));
    EXPECT_EQ(PropertyValue(false).boolean(), std::optional<bool>(false));
    EXPECT_EQ(PropertyValue(0.25).floating(), std::optional<double>(0.25));
}

TEST(PropertyValueTest, LargestUnsignedNumberIsKeptExactly) {
    const PropertyValue value(uint64_t{18446744073709551615u});
    EXPECT_EQ(value.kind(), Kind::Unsigned);
    EXPECT_EQ(value.unsignedInteger(), std::optional<uint64_t>(18446744073709551615u));
    EXPECT_EQ(value.toUInt64(), 18446744073709551615u);
    EXPECT_EQ(value.description(), "18446744073709551615");
}

TEST(PropertyValueTest, SmallestSignedNumberIsKeptExactly) {
    const PropertyValue value(std::numeric_limits<int64_t>::min());
    EXPECT_EQ(value.signedInteger(), std::optional<int64_t>(std::numeric_limits<int64_t>::min()));
    EXPECT_EQ(value.description(), "-9223372036854775808");
}

TEST(PropertyValueTest, SignedAndUnsignedNumbersAreKeptApart) {
    const PropertyValue signedOne(int64_t{1});
    const PropertyValue unsignedOne(uint64_t{1});
    EXPECT_NE(signedOne, unsignedOne);
    EXPECT_EQ(signedOne.unsignedInteger(), std::nullopt);
    EXPECT_EQ(unsignedOne.signedInteger(), std::nullopt);
    EXPECT_TRUE(signedOne.isInteger());
    EXPECT_TRUE(unsignedOne.isInteger());
}

TEST(PropertyValueTest, BooleansFloatsAndIntegersOfTheSameNumberDiffer) {
    EXPECT_NE(PropertyValue(true), PropertyValue(1));
    EXPECT_NE(PropertyValue(1.0), PropertyValue(1));
    EXPECT_NE(PropertyValue(0), PropertyValue());
    EXPECT_NE(PropertyValue(""), PropertyValue());
}

TEST(PropertyValueTest, EqualityLooksIntoNestedArraysAndDictionaries) {
    auto make = [](int inner) {
        return PropertyValue(PropertyValue::Dictionary{
            {"a", PropertyValue(PropertyValue::Array{1, "two", PropertyValue(PropertyValue::Data{3})})},
            {"b", PropertyValue(PropertyValue::Dictionary{{"c", inner}})},
        });
    };
    EXPECT_EQ(make(4), make(4));
    EXPECT_NE(make(4), make(5));
    EXPECT_EQ(PropertyValue(), PropertyValue());
    EXPECT_NE(PropertyValue(PropertyValue::Array{1, 2}), PropertyValue(PropertyValue::Array{2, 1}));
    EXPECT_NE(PropertyValue(PropertyValue::Array{1}), PropertyValue(PropertyValue::Array{1, 1}));
}

TEST(PropertyValueTest, CopiesAreEqualToTheirOriginal) {
    const PropertyValue original(PropertyValue::Array{1, "x"});
    const PropertyValue copy = original;  // NOLINT(performance-unnecessary-copy-initialization)
    EXPECT_EQ(copy, original);
    EXPECT_EQ(copy.array(), original.array());  // one shared value, not a deep copy
}

TEST(PropertyValueTest, BooleansCountAsNumbersButTextDoesNot) {
    EXPECT_TRUE(PropertyValue(true).isNumber());
    EXPECT_TRUE(PropertyValue(-1).isNumber());
    EXPECT_TRUE(PropertyValue(1u).isNumber());
    EXPECT_TRUE(PropertyValue(1.5).isNumber());
    EXPECT_FALSE(PropertyValue("1").isNumber());
    EXPECT_FALSE(PropertyValue().isNumber());
    EXPECT_FALSE(PropertyValue(PropertyValue::Data{1}).isNumber());
    EXPECT_FALSE(PropertyValue(PropertyValue::Array{1}).isNumber());
    EXPECT_FALSE(PropertyValue(PropertyValue::Dictionary{}).isNumber());
}

TEST(PropertyValueTest, TrueCoercesToOneAndFalseToZero) {
    EXPECT_EQ(PropertyValue(true).toDouble(), 1.0);
    EXPECT_EQ(PropertyValue(true).toFloat(), 1.0f);
    EXPECT_EQ(PropertyValue(true).toUInt64(), 1u);
    EXPECT_EQ(PropertyValue(true).toInt64(), 1);
    EXPECT_TRUE(PropertyValue(true).toBool());
    EXPECT_EQ(PropertyValue(false).toDouble(), 0.0);
    EXPECT_EQ(PropertyValue(false).toUInt64(), 0u);
    EXPECT_FALSE(PropertyValue(false).toBool());
}

TEST(PropertyValueTest, ValuesThatAreNotNumbersCoerceToZero) {
    const PropertyValue values[] = {
        PropertyValue(),
        PropertyValue("42"),
        PropertyValue(PropertyValue::Data{42}),
        PropertyValue(PropertyValue::Array{42}),
        PropertyValue(PropertyValue::Dictionary{{"a", 42}}),
    };
    for (const auto& value : values) {
        EXPECT_EQ(value.toDouble(), 0.0) << value.description();
        EXPECT_EQ(value.toFloat(), 0.0f) << value.description();
        EXPECT_EQ(value.toUInt64(), 0u) << value.description();
        EXPECT_EQ(value.toInt64(), 0) << value.description();
        EXPECT_FALSE(value.toBool()) << value.description();
    }
}

TEST(PropertyValueTest, NumbersCoerceAsTheLanguageConvertsThem) {
    EXPECT_EQ(PropertyValue(2.75).toUInt64(), 2u);
    EXPECT_EQ(PropertyValue(-2.75).toInt64(), -2);
    EXPECT_EQ(PropertyValue(2.75).toFloat(), 2.75f);
    EXPECT_EQ(PropertyValue(-1).toUInt64(), UINT64_MAX);
    EXPECT_EQ(PropertyValue(uint64_t{1} << 63).toInt64(), std::numeric_limits<int64_t>::min());
    EXPECT_EQ(PropertyValue(7u).toDouble(), 7.0);
    EXPECT_TRUE(PropertyValue(0.5).toBool());
    EXPECT_FALSE(PropertyValue(0.0).toBool());
    EXPECT_TRUE(PropertyValue(-1).toBool());
}

TEST(PropertyValueTest, OddFloatingValuesCoerceWithoutUndefinedBehaviour) {
    EXPECT_EQ(PropertyValue(std::nan("")).toUInt64(), 0u);
    EXPECT_EQ(PropertyValue(std::nan("")).toInt64(), 0);
    EXPECT_EQ(PropertyValue(1e30).toUInt64(), UINT64_MAX);
    EXPECT_EQ(PropertyValue(1e30).toInt64(), std::numeric_limits<int64_t>::max());
    EXPECT_EQ(PropertyValue(-1e30).toInt64(), std::numeric_limits<int64_t>::min());
    EXPECT_EQ(PropertyValue(-1.0).toUInt64(), UINT64_MAX);
}

TEST(PropertyValueTest, FindReadsADictionaryMember) {
    const PropertyValue dictionary(PropertyValue::Dictionary{{"Version", 1}, {"Name", "x"}});
    ASSERT_NE(dictionary.find("Version"), nullptr);
    EXPECT_EQ(*dictionary.find("Version"), PropertyValue(1));
    EXPECT_EQ(dictionary.find("Missing"), nullptr);
    EXPECT_EQ(PropertyValue(PropertyValue::Array{1}).find("Version"), nullptr);
    EXPECT_EQ(PropertyValue().find("Version"), nullptr);
}

TEST(PropertyValueTest, DescriptionOfScalarsIsTheirPlainText) {
    EXPECT_EQ(PropertyValue().description(), "null");
    EXPECT_EQ(PropertyValue(true).description(), "true");
    EXPECT_EQ(PropertyValue(false).description(), "false");
    EXPECT_EQ(PropertyValue(-42).description(), "-42");
    EXPECT_EQ(PropertyValue(42u).description(), "42");
    EXPECT_EQ(PropertyValue(0.5).description(), "0.5");
    EXPECT_EQ(PropertyValue(1.0 / 3.0).description(), "0.333333333");
    EXPECT_EQ(PropertyValue(3.0).description(), "3");
}

TEST(PropertyValueTest, DescriptionQuotesAndEscapesText) {
    EXPECT_EQ(PropertyValue("a \"b\"\\\n\t\x01").description(), "\"a \\\"b\\\"\\\\\\n\\t\\u0001\"");
    EXPECT_EQ(PropertyValue("").description(), "\"\"");
}

TEST(PropertyValueTest, DescriptionOfDataIsItsBytesInHex) {
    EXPECT_EQ(PropertyValue(PropertyValue::Data{0x0A, 0xFF, 0x00}).description(), "<0a ff 00>");
    EXPECT_EQ(PropertyValue(PropertyValue::Data{}).description(), "<>");
}

TEST(PropertyValueTest, DescriptionOfContainersListsTheirMembersInOrder) {
    const PropertyValue value(PropertyValue::Dictionary{
        {"b", PropertyValue(PropertyValue::Array{1, "x", PropertyValue()})},
        {"a", true},
    });
    EXPECT_EQ(value.description(), "{\"a\": true, \"b\": [1, \"x\", null]}");
    EXPECT_EQ(PropertyValue(PropertyValue::Array{}).description(), "[]");
    EXPECT_EQ(PropertyValue(PropertyValue::Dictionary{}).description(), "{}");
}

}  // namespace
}  // namespace TolkaTouch

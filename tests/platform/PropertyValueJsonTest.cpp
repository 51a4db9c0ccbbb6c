#include "platform/PropertyValueJson.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>
#include <string_view>

namespace TolkaTouch {
namespace {

std::optional<PropertyValue> parseText(std::string_view text) {
    return PropertyValueJson::parse(reinterpret_cast<const uint8_t*>(text.data()), text.size());
}

std::string nested(size_t depth, std::string_view inner = "") {
    return std::string(depth, '[') + std::string(inner) + std::string(depth, ']');
}

TEST(PropertyValueJsonTest, NumbersKeepTheirKinds) {
    const auto value = parseText(R"([5, -5, 1.0, 18446744073709551615, 9007199254740993, 1e3, -0])");
    ASSERT_TRUE(value.has_value());
    const auto& array = *value->array();
    EXPECT_EQ(array[0].unsignedInteger(), 5u);
    EXPECT_EQ(array[1].signedInteger(), -5);
    EXPECT_EQ(array[2].floating(), 1.0);
    EXPECT_EQ(array[3].unsignedInteger(), std::numeric_limits<uint64_t>::max());
    EXPECT_EQ(array[4].unsignedInteger(), 9007199254740993u);
    EXPECT_EQ(array[5].floating(), 1000.0);
    EXPECT_EQ(array[6].signedInteger(), 0);
}

TEST(PropertyValueJsonTest, IntegerBeyondSixtyFourBitsBecomesFloating) {
    const auto value = parseText("[18446744073709551616]");
    ASSERT_TRUE(value.has_value());
    EXPECT_TRUE(value->array()->front().isFloating());
}

TEST(PropertyValueJsonTest, ObjectsArraysStringsBooleansAndNullAreRead) {
    const auto value = parseText(R"({"a": [true, false, null], "b": {"c": "t\u00e9xt\n"}, "e": {}})");
    ASSERT_TRUE(value.has_value());
    const PropertyValue expected(PropertyValue::Dictionary{
        {"a", PropertyValue(PropertyValue::Array{PropertyValue(true), PropertyValue(false), PropertyValue()})},
        {"b", PropertyValue(PropertyValue::Dictionary{{"c", PropertyValue("t\xc3\xa9xt\n")}})},
        {"e", PropertyValue(PropertyValue::Dictionary{})},
    });
    EXPECT_EQ(*value, expected);
}

TEST(PropertyValueJsonTest, RepeatedObjectKeyKeepsTheLastValue) {
    const auto value = parseText(R"({"a": 1, "a": 2})");
    ASSERT_TRUE(value.has_value());
    EXPECT_EQ(value->dictionary()->size(), 1u);
    EXPECT_EQ(*value->find("a"), PropertyValue(2u));
}

TEST(PropertyValueJsonTest, BareScalarsAtTheTopLevelAreRefused) {
    EXPECT_FALSE(parseText("1").has_value());
    EXPECT_FALSE(parseText("\"a\"").has_value());
    EXPECT_FALSE(parseText("true").has_value());
    EXPECT_FALSE(parseText("null").has_value());
}

TEST(PropertyValueJsonTest, SyntaxErrorsAndEmptyTextAreRefused) {
    EXPECT_FALSE(parseText("").has_value());
    EXPECT_FALSE(parseText("{").has_value());
    EXPECT_FALSE(parseText("[1,]").has_value());
    EXPECT_FALSE(parseText("{} {}").has_value());
    EXPECT_FALSE(parseText("[1] x").has_value());
    EXPECT_FALSE(parseText("{'a': 1}").has_value());
    EXPECT_FALSE(PropertyValueJson::parse(nullptr, 0).has_value());
}

TEST(PropertyValueJsonTest, StringThatIsNotUtf8IsRefused) {
    EXPECT_FALSE(parseText("[\"\xff\"]").has_value());
}

TEST(PropertyValueJsonTest, NestingUpToTheLimitIsAccepted) {
    const auto value = parseText(nested(PropertyValueJson::kMaxNestingDepth, "7"));
    ASSERT_TRUE(value.has_value());
    const PropertyValue* level = &*value;
    for (size_t i = 1; i < PropertyValueJson::kMaxNestingDepth; ++i) level = &level->array()->front();
    EXPECT_EQ(level->array()->front(), PropertyValue(7u));
}

TEST(PropertyValueJsonTest, NestingOneBeyondTheLimitIsRefused) {
    EXPECT_FALSE(parseText(nested(PropertyValueJson::kMaxNestingDepth + 1)).has_value());
    std::string objects;
    for (size_t i = 0; i <= PropertyValueJson::kMaxNestingDepth; ++i) objects += "{\"a\":";
    objects += "1" + std::string(PropertyValueJson::kMaxNestingDepth + 1, '}');
    EXPECT_FALSE(parseText(objects).has_value());
}

TEST(PropertyValueJsonTest, HundredThousandLevelsAreRefusedWithoutOverflowingTheStack) {
    EXPECT_FALSE(parseText(nested(100000)).has_value());
    EXPECT_FALSE(parseText(std::string(100000, '[')).has_value());
}

TEST(PropertyValueJsonTest, ValuesConvertToJsonOfTheSameKind) {
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue()).dump(), "null");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(true)).dump(), "true");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(-3)).dump(), "-3");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(std::numeric_limits<uint64_t>::max())).dump(),
              "18446744073709551615");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(1.0)).dump(), "1.0");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(0.1f)).dump(), "0.10000000149011612");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue("a\"b")).dump(), R"("a\"b")");
}

TEST(PropertyValueJsonTest, ByteDataIsWrittenAsHexText) {
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(PropertyValue::Data{0x0a, 0xff, 0x00})).dump(), R"("0a ff 00 ")");
}

TEST(PropertyValueJsonTest, NumbersThatAreNotFiniteAreWrittenAsNull) {
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(std::nan(""))).dump(), "null");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(std::numeric_limits<double>::infinity())).dump(), "null");
}

TEST(PropertyValueJsonTest, ContainersNestedBeyondTheGivenDepthAreWrittenAsNull) {
    const PropertyValue value(PropertyValue::Array{PropertyValue(PropertyValue::Dictionary{
        {"a", PropertyValue(PropertyValue::Array{PropertyValue(1)})}, {"b", PropertyValue(2)}})});
    EXPECT_EQ(PropertyValueJson::toJson(value, 3).dump(), R"([{"a":[1],"b":2}])");
    EXPECT_EQ(PropertyValueJson::toJson(value, 2).dump(), R"([{"a":null,"b":2}])");
    EXPECT_EQ(PropertyValueJson::toJson(value, 0).dump(), "null");
    EXPECT_EQ(PropertyValueJson::toJson(PropertyValue(5), 0).dump(), "5");
}

TEST(PropertyValueJsonTest, DictionaryMembersAreWrittenInSortedOrder) {
    const PropertyValue value(PropertyValue::Dictionary{
        {"b", PropertyValue(PropertyValue::Array{PropertyValue(1), PropertyValue("x")})},
        {"a", PropertyValue(PropertyValue::Dictionary{})},
    });
    EXPECT_EQ(PropertyValueJson::toJson(value).dump(), R"({"a":{},"b":[1,"x"]})");
}

TEST(PropertyValueJsonTest, ParsedJsonBecomesTheMatchingPropertyKinds) {
    const PropertyValue value = PropertyValueJson::fromJson(nlohmann::json::parse(
        R"({"s": -1, "u": 2, "f": 1.5, "b": false, "n": null, "t": "x", "a": [1], "d": {"k": true}})"));
    ASSERT_TRUE(value.isDictionary());
    EXPECT_EQ(value.find("s")->kind(), PropertyValue::Kind::Signed);
    EXPECT_EQ(*value.find("s"), PropertyValue(-1));
    EXPECT_EQ(value.find("u")->kind(), PropertyValue::Kind::Unsigned);
    EXPECT_EQ(*value.find("u"), PropertyValue(2u));
    EXPECT_EQ(*value.find("f"), PropertyValue(1.5));
    EXPECT_EQ(*value.find("b"), PropertyValue(false));
    EXPECT_TRUE(value.find("n")->isNull());
    EXPECT_EQ(*value.find("t"), PropertyValue("x"));
    EXPECT_EQ(*value.find("a"), PropertyValue(PropertyValue::Array{PropertyValue(1u)}));
    EXPECT_EQ(*value.find("d"), PropertyValue(PropertyValue::Dictionary{{"k", PropertyValue(true)}}));
}

TEST(PropertyValueJsonTest, ParsedScalarsConvertOnTheirOwn) {
    EXPECT_EQ(PropertyValueJson::fromJson(nlohmann::json(18446744073709551615ull)),
              PropertyValue(std::numeric_limits<uint64_t>::max()));
    EXPECT_EQ(PropertyValueJson::fromJson(nlohmann::json("text")), PropertyValue("text"));
    EXPECT_TRUE(PropertyValueJson::fromJson(nlohmann::json()).isNull());
}

}  // namespace
}  // namespace TolkaTouch

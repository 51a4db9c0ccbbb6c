#include "daemon/PropertyJson.h"

#include <gtest/gtest.h>

#include <limits>

namespace TolkaTouch {
namespace {

TEST(PropertyJsonTest, ScalarsKeepTheirKinds) {
    EXPECT_EQ(jsonFromProperty(PropertyValue(true)).dump(), "true");
    EXPECT_EQ(jsonFromProperty(PropertyValue(-3)).dump(), "-3");
    EXPECT_EQ(jsonFromProperty(PropertyValue(18446744073709551615ull)).dump(), "18446744073709551615");
    EXPECT_EQ(jsonFromProperty(PropertyValue(0.5)).dump(), "0.5");
    EXPECT_EQ(jsonFromProperty(PropertyValue("text")).dump(), R"("text")");
    EXPECT_EQ(jsonFromProperty(PropertyValue()).dump(), "null");
}

TEST(PropertyJsonTest, NumberThatIsNotFiniteBecomesNull) {
    EXPECT_EQ(jsonFromProperty(PropertyValue(std::numeric_limits<double>::infinity())).dump(), "null");
}

TEST(PropertyJsonTest, ByteDataBecomesHexText) {
    EXPECT_EQ(jsonFromProperty(PropertyValue(PropertyValue::Data{0x01, 0x0a, 0xff})).dump(), R"("01 0a ff ")");
}

TEST(PropertyJsonTest, ContainersConvertMemberByMember) {
    PropertyValue::Dictionary dictionary;
    dictionary.emplace("a", PropertyValue(PropertyValue::Array{1, "b"}));
    EXPECT_EQ(jsonFromProperty(PropertyValue(dictionary)).dump(), R"({"a":[1,"b"]})");
}

TEST(PropertyJsonTest, JsonBecomesTheMatchingPropertyKinds) {
    auto value = propertyFromJson(nlohmann::json::parse(R"({"s": -1, "u": 2, "f": 1.5, "b": false, "n": null,
                                                           "t": "x", "a": [1]})"));
    EXPECT_EQ(value.find("s")->kind(), PropertyValue::Kind::Signed);
    EXPECT_EQ(value.find("u")->kind(), PropertyValue::Kind::Unsigned);
    EXPECT_EQ(*value.find("f"), PropertyValue(1.5));
    EXPECT_EQ(*value.find("b"), PropertyValue(false));
    EXPECT_TRUE(value.find("n")->isNull());
    EXPECT_EQ(*value.find("t"), PropertyValue("x"));
    EXPECT_EQ(*value.find("a"), PropertyValue(PropertyValue::Array{PropertyValue(1u)}));
}

}  // namespace
}  // namespace TolkaTouch

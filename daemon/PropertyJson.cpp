#include "daemon/PropertyJson.h"

#include <cmath>

namespace TolkaTouch {

nlohmann::json jsonFromProperty(const PropertyValue& value) {
    switch (value.kind()) {
    case PropertyValue::Kind::Null: return nullptr;
    case PropertyValue::Kind::Boolean: return *value.boolean();
    case PropertyValue::Kind::Signed: return *value.signedInteger();
    case PropertyValue::Kind::Unsigned: return *value.unsignedInteger();
    case PropertyValue::Kind::Floating: {
        double number = *value.floating();
        if (!std::isfinite(number)) return nullptr;
        return number;
    }
    case PropertyValue::Kind::String: return *value.string();
    case PropertyValue::Kind::Data: {
        static constexpr char kDigits[] = "0123456789abcdef";
        std::string text;
        for (uint8_t byte : *value.data()) {
            text += kDigits[byte >> 4];
            text += kDigits[byte & 0xF];
            text += ' ';
        }
        return text;
    }
    case PropertyValue::Kind::Array: {
        auto array = nlohmann::json::array();
        for (const auto& element : *value.array()) array.push_back(jsonFromProperty(element));
        return array;
    }
    case PropertyValue::Kind::Dictionary: {
        auto object = nlohmann::json::object();
        for (const auto& [key, element] : *value.dictionary()) object[key] = jsonFromProperty(element);
        return object;
    }
    }
    return nullptr;
}

PropertyValue propertyFromJson(const nlohmann::json& json) {
    switch (json.type()) {
    case nlohmann::json::value_t::boolean: return PropertyValue(json.get<bool>());
    case nlohmann::json::value_t::number_integer: return PropertyValue(json.get<long long>());
    case nlohmann::json::value_t::number_unsigned: return PropertyValue(json.get<unsigned long long>());
    case nlohmann::json::value_t::number_float: return PropertyValue(json.get<double>());
    case nlohmann::json::value_t::string: return PropertyValue(json.get<std::string>());
    case nlohmann::json::value_t::array: {
        PropertyValue::Array array;
        for (const auto& element : json) array.push_back(propertyFromJson(element));
        return PropertyValue(std::move(array));
    }
    case nlohmann::json::value_t::object: {
        PropertyValue::Dictionary dictionary;
        for (const auto& [key, element] : json.items()) dictionary.emplace(key, propertyFromJson(element));
        return PropertyValue(std::move(dictionary));
    }
    default: return PropertyValue();
    }
}

}  // namespace TolkaTouch

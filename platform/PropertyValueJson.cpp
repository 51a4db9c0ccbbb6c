#include "platform/PropertyValueJson.h"

#include <cmath>
#include <string>
#include <utility>
#include <vector>

#include "platform/Format.h"
#include "platform/Hex.h"

namespace TolkaTouch::PropertyValueJson {

namespace {

// Receives the parser's events and assembles the value bottom-up. Each open array or object is
// one entry of `_open`; a closed one becomes a value of its parent. Returning false from any
// callback ends the parse as a failure.
class Builder final : public nlohmann::json_sax<nlohmann::json> {
public:
    bool null() override { return add(PropertyValue()); }
    bool boolean(bool value) override { return add(PropertyValue(value)); }
    bool number_integer(number_integer_t value) override {
        return add(PropertyValue(static_cast<long long>(value)));
    }
    bool number_unsigned(number_unsigned_t value) override {
        return add(PropertyValue(static_cast<unsigned long long>(value)));
    }
    bool number_float(number_float_t value, const string_t&) override { return add(PropertyValue(value)); }
    bool string(string_t& value) override { return add(PropertyValue(std::move(value))); }
    bool binary(binary_t&) override { return false; }  // JSON text has no binary values

    bool start_object(std::size_t) override { return open(true); }
    bool key(string_t& key) override {
        _open.back().key = std::move(key);
        return true;
    }
    bool end_object() override { return close(); }
    bool start_array(std::size_t) override { return open(false); }
    bool end_array() override { return close(); }

    bool parse_error(std::size_t, const std::string&, const nlohmann::detail::exception&) override { return false; }

    std::optional<PropertyValue> take() { return std::move(_result); }

private:
    struct Open {
        bool isObject = false;
        PropertyValue::Array array;
        PropertyValue::Dictionary dictionary;
        std::string key;  // the member whose value comes next, in an object
    };

    bool open(bool isObject) {
        if (_open.size() >= kMaxNestingDepth) return false;
        Open level;
        level.isObject = isObject;
        _open.push_back(std::move(level));
        return true;
    }

    bool close() {
        Open level = std::move(_open.back());
        _open.pop_back();
        if (level.isObject) return add(PropertyValue(std::move(level.dictionary)));
        return add(PropertyValue(std::move(level.array)));
    }

    bool add(PropertyValue value) {
        if (_open.empty()) {
            _result = std::move(value);
            return true;
        }
        Open& parent = _open.back();
        if (parent.isObject) {
            parent.dictionary.insert_or_assign(std::move(parent.key), std::move(value));
            parent.key.clear();
        } else {
            parent.array.push_back(std::move(value));
        }
        return true;
    }

    std::vector<Open> _open;
    std::optional<PropertyValue> _result;
};

}  // namespace

std::optional<PropertyValue> parse(const uint8_t* text, size_t length) {
    static const uint8_t empty = 0;
    if (text == nullptr) text = &empty, length = 0;
    Builder builder;
    if (!nlohmann::json::sax_parse(text, text + length, &builder)) return std::nullopt;
    std::optional<PropertyValue> value = builder.take();
    // Only a document (an object or an array) at the top level, as the host's parser demands.
    if (!value || !(value->isDictionary() || value->isArray())) return std::nullopt;
    return value;
}

nlohmann::ordered_json toJson(const PropertyValue& value, size_t maxDepth) {
    if ((value.isArray() || value.isDictionary()) && maxDepth == 0) return nullptr;
    switch (value.kind()) {
    case PropertyValue::Kind::Null: return nullptr;
    case PropertyValue::Kind::Boolean: return *value.boolean();
    case PropertyValue::Kind::Signed: return *value.signedInteger();
    case PropertyValue::Kind::Unsigned: return *value.unsignedInteger();
    case PropertyValue::Kind::Floating: {
        const double number = *value.floating();
        if (!std::isfinite(number)) return nullptr;
        return number;
    }
    case PropertyValue::Kind::String: return *value.string();
    case PropertyValue::Kind::Data: return Hex::text(*value.data(), Hex::Spacing::AfterEach);
    case PropertyValue::Kind::Array: {
        nlohmann::ordered_json array = nlohmann::ordered_json::array();
        for (const PropertyValue& element : *value.array()) array.push_back(toJson(element, maxDepth - 1));
        return array;
    }
    case PropertyValue::Kind::Dictionary: {
        // The dictionary's keys are unique and sorted already; filling the member list directly
        // spares the ordered object's linear duplicate search per member.
        std::vector<std::pair<std::string, nlohmann::ordered_json>> members;
        members.reserve(value.dictionary()->size());
        for (const auto& [key, element] : *value.dictionary()) members.emplace_back(key, toJson(element, maxDepth - 1));
        nlohmann::ordered_json::object_t object(std::make_move_iterator(members.begin()),
                                                std::make_move_iterator(members.end()));
        return nlohmann::ordered_json(std::move(object));
    }
    }
    return nullptr;
}

PropertyValue fromJson(const nlohmann::json& json) {
    switch (json.type()) {
    case nlohmann::json::value_t::boolean: return PropertyValue(json.get<bool>());
    case nlohmann::json::value_t::number_integer: return PropertyValue(json.get<long long>());
    case nlohmann::json::value_t::number_unsigned: return PropertyValue(json.get<unsigned long long>());
    case nlohmann::json::value_t::number_float: return PropertyValue(json.get<double>());
    case nlohmann::json::value_t::string: return PropertyValue(json.get<std::string>());
    case nlohmann::json::value_t::array: {
        PropertyValue::Array array;
        for (const auto& element : json) array.push_back(fromJson(element));
        return PropertyValue(std::move(array));
    }
    case nlohmann::json::value_t::object: {
        PropertyValue::Dictionary dictionary;
        for (const auto& [key, element] : json.items()) dictionary.emplace(key, fromJson(element));
        return PropertyValue(std::move(dictionary));
    }
    default: return PropertyValue();
    }
}

}  // namespace TolkaTouch::PropertyValueJson

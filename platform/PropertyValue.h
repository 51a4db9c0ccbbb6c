#pragma once
// PropertyValue: the dynamic value that service properties, state keys and recorded state frames
// carry. Immutable and shared by reference count: copying a PropertyValue only adds a reference.

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace TolkaTouch {

class PropertyValue {
public:
    using Array = std::vector<PropertyValue>;
    using Dictionary = std::map<std::string, PropertyValue, std::less<>>;
    using Data = std::vector<uint8_t>;

    enum class Kind { Null, Boolean, Signed, Unsigned, Floating, String, Data, Array, Dictionary };

    PropertyValue() = default;  // null
    PropertyValue(std::nullptr_t) {}
    PropertyValue(bool value);
    PropertyValue(int value) : PropertyValue(static_cast<long long>(value)) {}
    PropertyValue(long value) : PropertyValue(static_cast<long long>(value)) {}
    PropertyValue(long long value);
    PropertyValue(unsigned value) : PropertyValue(static_cast<unsigned long long>(value)) {}
    PropertyValue(unsigned long value) : PropertyValue(static_cast<unsigned long long>(value)) {}
    PropertyValue(unsigned long long value);
    PropertyValue(float value) : PropertyValue(static_cast<double>(value)) {}
    PropertyValue(double value);
    PropertyValue(const char* value) : PropertyValue(std::string(value)) {}
    PropertyValue(std::string_view value) : PropertyValue(std::string(value)) {}
    PropertyValue(std::string value);
    PropertyValue(Data value);
    PropertyValue(Array value);
    PropertyValue(Dictionary value);

    Kind kind() const;
    bool isNull() const { return kind() == Kind::Null; }
    bool isBoolean() const { return kind() == Kind::Boolean; }
    bool isString() const { return kind() == Kind::String; }
    bool isData() const { return kind() == Kind::Data; }
    bool isArray() const { return kind() == Kind::Array; }
    bool isDictionary() const { return kind() == Kind::Dictionary; }
    bool isInteger() const { return kind() == Kind::Signed || kind() == Kind::Unsigned; }
    bool isFloating() const { return kind() == Kind::Floating; }
    // Booleans count as numbers (true is 1, false is 0); nothing else that is not numeric does.
    bool isNumber() const;

    // Typed access: the value when it is of that kind, otherwise nothing.
    std::optional<bool> boolean() const;
    std::optional<int64_t> signedInteger() const;
    std::optional<uint64_t> unsignedInteger() const;
    std::optional<double> floating() const;
    const std::string* string() const;
    const Data* data() const;
    const Array* array() const;
    const Dictionary* dictionary() const;

    // Numeric coercion for written settings: a number converts as C++ would convert it,
    // a boolean is 1 or 0, and any value that is not a number counts as 0.
    double toDouble() const;
    float toFloat() const { return static_cast<float>(toDouble()); }
    uint64_t toUInt64() const;
    int64_t toInt64() const;
    bool toBool() const;

    // Dictionary member, or nullptr when this is not a dictionary or the key is missing.
    const PropertyValue* find(std::string_view key) const;

    // Readable one-line text, as log lines show an object value ("%@").
    std::string description() const;

    friend bool operator==(const PropertyValue& a, const PropertyValue& b);

private:
    using Storage = std::variant<bool, int64_t, uint64_t, double, std::string, Data, Array, Dictionary>;
    std::shared_ptr<const Storage> _storage;  // empty for null
};

}  // namespace TolkaTouch

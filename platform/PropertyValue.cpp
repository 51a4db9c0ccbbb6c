#include "platform/PropertyValue.h"

#include "platform/Hex.h"

#include <cmath>
#include <cstdio>
#include <limits>

namespace TolkaTouch {

PropertyValue::PropertyValue(bool value) : _storage(std::make_shared<const Storage>(value)) {}
PropertyValue::PropertyValue(long long value)
    : _storage(std::make_shared<const Storage>(static_cast<int64_t>(value))) {}
PropertyValue::PropertyValue(unsigned long long value)
    : _storage(std::make_shared<const Storage>(static_cast<uint64_t>(value))) {}
PropertyValue::PropertyValue(double value) : _storage(std::make_shared<const Storage>(value)) {}
PropertyValue::PropertyValue(std::string value)
    : _storage(std::make_shared<const Storage>(std::move(value))) {}
PropertyValue::PropertyValue(Data value) : _storage(std::make_shared<const Storage>(std::move(value))) {}
PropertyValue::PropertyValue(Array value) : _storage(std::make_shared<const Storage>(std::move(value))) {}
PropertyValue::PropertyValue(Dictionary value)
    : _storage(std::make_shared<const Storage>(std::move(value))) {}

PropertyValue::Kind PropertyValue::kind() const {
    if (!_storage) return Kind::Null;
    switch (_storage->index()) {
    case 0: return Kind::Boolean;
    case 1: return Kind::Signed;
    case 2: return Kind::Unsigned;
    case 3: return Kind::Floating;
    case 4: return Kind::String;
    case 5: return Kind::Data;
    case 6: return Kind::Array;
    default: return Kind::Dictionary;
    }
}

bool PropertyValue::isNumber() const {
    const Kind k = kind();
    return k == Kind::Boolean || k == Kind::Signed || k == Kind::Unsigned || k == Kind::Floating;
}

template <typename T>
static const T* alternative(const std::shared_ptr<const std::variant<bool, int64_t, uint64_t, double, std::string,
                                                                     PropertyValue::Data, PropertyValue::Array,
                                                                     PropertyValue::Dictionary>>& storage) {
    return storage ? std::get_if<T>(storage.get()) : nullptr;
}

std::optional<bool> PropertyValue::boolean() const {
    if (auto p = alternative<bool>(_storage)) return *p;
    return std::nullopt;
}
std::optional<int64_t> PropertyValue::signedInteger() const {
    if (auto p = alternative<int64_t>(_storage)) return *p;
    return std::nullopt;
}
std::optional<uint64_t> PropertyValue::unsignedInteger() const {
    if (auto p = alternative<uint64_t>(_storage)) return *p;
    return std::nullopt;
}
std::optional<double> PropertyValue::floating() const {
    if (auto p = alternative<double>(_storage)) return *p;
    return std::nullopt;
}
const std::string* PropertyValue::string() const { return alternative<std::string>(_storage); }
const PropertyValue::Data* PropertyValue::data() const { return alternative<Data>(_storage); }
const PropertyValue::Array* PropertyValue::array() const { return alternative<Array>(_storage); }
const PropertyValue::Dictionary* PropertyValue::dictionary() const { return alternative<Dictionary>(_storage); }

double PropertyValue::toDouble() const {
    if (auto b = boolean()) return *b ? 1.0 : 0.0;
    if (auto i = signedInteger()) return static_cast<double>(*i);
    if (auto u = unsignedInteger()) return static_cast<double>(*u);
    if (auto d = floating()) return *d;
    return 0.0;
}

// Floating values convert the way a saturating C cast would, so odd input never invokes
// undefined behaviour: NaN is 0, out-of-range values clamp to the type's ends.
template <typename Int>
static Int saturatingCast(double d) {
    if (std::isnan(d)) return 0;
    if (d <= static_cast<double>(std::numeric_limits<Int>::min())) return std::numeric_limits<Int>::min();
    if (d >= static_cast<double>(std::numeric_limits<Int>::max())) return std::numeric_limits<Int>::max();
    return static_cast<Int>(d);
}

uint64_t PropertyValue::toUInt64() const {
    if (auto b = boolean()) return *b ? 1 : 0;
    if (auto i = signedInteger()) return static_cast<uint64_t>(*i);  // wraps, as an unsigned read of a signed number does
    if (auto u = unsignedInteger()) return *u;
    if (auto d = floating()) {
        if (*d < 0) return static_cast<uint64_t>(saturatingCast<int64_t>(*d));
        return saturatingCast<uint64_t>(*d);
    }
    return 0;
}

int64_t PropertyValue::toInt64() const {
    if (auto b = boolean()) return *b ? 1 : 0;
    if (auto i = signedInteger()) return *i;
    if (auto u = unsignedInteger()) return static_cast<int64_t>(*u);
    if (auto d = floating()) return saturatingCast<int64_t>(*d);
    return 0;
}

bool PropertyValue::toBool() const {
    if (auto b = boolean()) return *b;
    if (auto i = signedInteger()) return *i != 0;
    if (auto u = unsignedInteger()) return *u != 0;
    if (auto d = floating()) return *d != 0.0;
    return false;
}

const PropertyValue* PropertyValue::find(std::string_view key) const {
    const Dictionary* dict = dictionary();
    if (!dict) return nullptr;
    auto it = dict->find(key);
    return it == dict->end() ? nullptr : &it->second;
}

static void appendQuoted(std::string& out, const std::string& text) {
    out += '"';
    for (char c : text) {
        switch (c) {
        case '"': out += "\\\""; break;
        case '\\': out += "\\\\"; break;
        case '\n': out += "\\n"; break;
        case '\t': out += "\\t"; break;
        default:
            if (static_cast<unsigned char>(c) < 0x20) {
                char buf[8];
                std::snprintf(buf, sizeof buf, "\\u%04x", static_cast<unsigned>(c));
                out += buf;
            } else {
                out += c;
            }
        }
    }
    out += '"';
}

static void describe(const PropertyValue& value, std::string& out) {
    char buf[64];
    switch (value.kind()) {
    case PropertyValue::Kind::Null: out += "null"; break;
    case PropertyValue::Kind::Boolean: out += *value.boolean() ? "true" : "false"; break;
    case PropertyValue::Kind::Signed:
        std::snprintf(buf, sizeof buf, "%lld", static_cast<long long>(*value.signedInteger()));
        out += buf;
        break;
    case PropertyValue::Kind::Unsigned:
        std::snprintf(buf, sizeof buf, "%llu", static_cast<unsigned long long>(*value.unsignedInteger()));
        out += buf;
        break;
    case PropertyValue::Kind::Floating:
        std::snprintf(buf, sizeof buf, "%.9g", *value.floating());
        out += buf;
        break;
    case PropertyValue::Kind::String: appendQuoted(out, *value.string()); break;
    case PropertyValue::Kind::Data:
        out += '<';
        out += Hex::text(*value.data(), Hex::Spacing::Between);
        out += '>';
        break;
    case PropertyValue::Kind::Array: {
        out += '[';
        bool first = true;
        for (const PropertyValue& element : *value.array()) {
            if (!first) out += ", ";
            first = false;
            describe(element, out);
        }
        out += ']';
        break;
    }
    case PropertyValue::Kind::Dictionary: {
        out += '{';
        bool first = true;
        for (const auto& [key, element] : *value.dictionary()) {
            if (!first) out += ", ";
            first = false;
            appendQuoted(out, key);
            out += ": ";
            describe(element, out);
        }
        out += '}';
        break;
    }
    }
}

std::string PropertyValue::description() const {
    std::string out;
    describe(*this, out);
    return out;
}

bool operator==(const PropertyValue& a, const PropertyValue& b) {
    if (a._storage == b._storage) return true;
    if (!a._storage || !b._storage) return false;
    return *a._storage == *b._storage;
}

}  // namespace TolkaTouch

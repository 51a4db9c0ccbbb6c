#pragma once
// PropertyValueJson: JSON text to PropertyValue and back, for the recording document and the
// control socket.
//
// Reading keeps the number kinds apart: a JSON integer without a sign becomes an unsigned
// number, one with a minus sign a signed number, anything with a fraction or exponent a floating
// number, so 64-bit time stamps come back exactly. The reader builds the value with an explicit
// stack, never by recursion, and gives up on anything nested deeper than kMaxNestingDepth arrays
// and objects: such text counts as not JSON, like any other syntax error.
//
// Writing turns a PropertyValue into an ordered nlohmann::json (dictionary members in their
// sorted order). Byte data, which JSON cannot hold, is written as its hex text ("0a ff ");
// floating values that are not finite are written as null. Already parsed JSON (a control
// request's value) converts with fromJson.

#include <cstddef>
#include <cstdint>
#include <optional>

#include <nlohmann/json.hpp>

#include "platform/PropertyValue.h"

namespace TolkaTouch::PropertyValueJson {

inline constexpr size_t kMaxNestingDepth = 512;

// The value of a JSON text whose top level is an object or an array; nothing when the text is
// not JSON, is a bare scalar, or nests too deeply. Object members that repeat a key keep the
// last value. Never throws except when memory runs out.
std::optional<PropertyValue> parse(const uint8_t* text, size_t length);

// The JSON form of a value, for serialisation with dump(). Arrays and dictionaries nested deeper
// than maxDepth levels are written as null, so that whatever is written can be read back (and
// the walk's recursion stays bounded).
nlohmann::ordered_json toJson(const PropertyValue& value, size_t maxDepth = kMaxNestingDepth);

// The value of parsed JSON, kinds as parse() gives them (null, and binary values, become null).
// The walk recurses once per level, so callers bound the depth when parsing, as the control
// socket's parser does.
PropertyValue fromJson(const nlohmann::json& json);

}  // namespace TolkaTouch::PropertyValueJson

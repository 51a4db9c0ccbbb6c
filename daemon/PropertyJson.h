#pragma once
// Conversions between PropertyValue and JSON for the control socket. Byte data has no JSON form
// of its own and travels as hex text ("01 0a ff "); a number that is not finite becomes null.

#include <nlohmann/json.hpp>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

nlohmann::json jsonFromProperty(const PropertyValue& value);
PropertyValue propertyFromJson(const nlohmann::json& json);

}  // namespace TolkaTouch

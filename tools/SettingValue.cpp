#include "tools/SettingValue.h"

#include <cstdint>
#include <optional>

#include "platform/PropertyValueJson.h"

namespace TolkaTouch::Tools {

PropertyValue settingValueFromText(std::string_view text) {
    // The document reader only takes arrays and objects at the top, so a scalar is read as the
    // one element of an array; that keeps its number kinds the same as in a recording.
    const std::string wrapped = "[" + std::string(text) + "]";
    const std::optional<PropertyValue> parsed =
        PropertyValueJson::parse(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
    if (parsed && parsed->isArray() && parsed->array()->size() == 1) return parsed->array()->front();
    return PropertyValue(std::string(text));
}

std::pair<std::string, PropertyValue> settingFromAssignment(std::string_view assignment) {
    const size_t equals = assignment.find('=');
    return {std::string(assignment.substr(0, equals)), settingValueFromText(assignment.substr(equals + 1))};
}

}  // namespace TolkaTouch::Tools

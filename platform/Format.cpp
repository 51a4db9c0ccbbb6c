#include "platform/Format.h"

#include <cstdio>
#include <utility>

namespace TolkaTouch {

std::string_view formatInto(char (&small)[kFormatOnStack], std::string& spill, const char* format, va_list args) {
    va_list copy;
    va_copy(copy, args);
    const int needed = std::vsnprintf(small, sizeof small, format, copy);
    va_end(copy);
    if (needed < 0) return {};
    if (static_cast<size_t>(needed) < sizeof small) return std::string_view(small, static_cast<size_t>(needed));
    spill.assign(static_cast<size_t>(needed), '\0');
    std::vsnprintf(spill.data(), spill.size() + 1, format, args);
    return spill;
}

std::string formatStringV(const char* format, va_list args) {
    char small[kFormatOnStack];
    std::string spill;
    const std::string_view text = formatInto(small, spill, format, args);
    return text.data() == spill.data() ? std::move(spill) : std::string(text);
}

std::string formatString(const char* format, ...) {
    va_list args;
    va_start(args, format);
    std::string text = formatStringV(format, args);
    va_end(args);
    return text;
}

}  // namespace TolkaTouch

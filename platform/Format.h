#pragma once
// printf-style formatting into a std::string, for the system log's printf-style formats.

#include <cstdarg>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace TolkaTouch {

std::string formatString(const char* format, ...) __attribute__((format(printf, 1, 2)));
std::string formatStringV(const char* format, va_list args);

// How much text formatInto formats on the caller's stack.
inline constexpr size_t kFormatOnStack = 256;
// The text of `format` and `args`: in `small` when it fits there, else in `spill`. Empty when the
// format cannot be formatted.
std::string_view formatInto(char (&small)[kFormatOnStack], std::string& spill, const char* format, va_list args);

}  // namespace TolkaTouch

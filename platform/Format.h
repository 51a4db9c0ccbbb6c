#pragma once
// printf-style formatting into a std::string, for the system log's printf-style formats.

#include <cstdarg>
#include <cstdint>
#include <string>
#include <vector>

namespace TolkaTouch {

std::string formatString(const char* format, ...) __attribute__((format(printf, 1, 2)));
std::string formatStringV(const char* format, va_list args);

}  // namespace TolkaTouch

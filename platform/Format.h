#pragma once
// printf-style formatting into a std::string, for log lines and the fixed text formats of diagnostics.

#include <cstdarg>
#include <string>

namespace TolkaTouch {

std::string formatString(const char* format, ...) __attribute__((format(printf, 1, 2)));
std::string formatStringV(const char* format, va_list args);

}  // namespace TolkaTouch

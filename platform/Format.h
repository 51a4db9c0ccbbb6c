#pragma once
// printf-style formatting into a std::string, for log lines and the fixed text formats of diagnostics,
// and the hex text form of byte data.

#include <cstdarg>
#include <cstdint>
#include <string>
#include <vector>

namespace TolkaTouch {

std::string formatString(const char* format, ...) __attribute__((format(printf, 1, 2)));
std::string formatStringV(const char* format, va_list args);

// "%02x " per byte: "0a ff 00 " for {0x0a, 0xff, 0x00}; "" for no bytes.
std::string hexStringFromBytes(const std::vector<uint8_t>& bytes);

}  // namespace TolkaTouch

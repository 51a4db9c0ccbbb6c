#pragma once
// A USB vendor or product ID given on the command line in hexadecimal ("1209", "0x1209").

#include <cstdint>
#include <string>

#include <CLI/CLI.hpp>

namespace TolkaTouch::Tools {

// Throws CLI::ValidationError naming the option when the text is not one to four hex digits.
inline uint16_t hexId(const std::string& text, const char* what) {
    const std::string digits = text.rfind("0x", 0) == 0 || text.rfind("0X", 0) == 0 ? text.substr(2) : text;
    if (digits.empty() || digits.size() > 4 || digits.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos) {
        throw CLI::ValidationError(what, "expected a hexadecimal ID of at most four digits, got \"" + text + "\"");
    }
    return static_cast<uint16_t>(std::stoul(digits, nullptr, 16));
}

}  // namespace TolkaTouch::Tools

#pragma once
// Text quoted from outside (a path, a script's word, a document's text) with its control
// characters shown escaped as \xNN, so that none reaches the terminal as a command.

#include <string>
#include <string_view>

namespace TolkaTouch {

inline std::string printableText(std::string_view text) {
    static constexpr char kDigits[] = "0123456789abcdef";
    std::string out;
    out.reserve(text.size());
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7f) {
            out += "\\x";
            out += kDigits[byte >> 4];
            out += kDigits[byte & 0xF];
        } else {
            out += c;
        }
    }
    return out;
}

}  // namespace TolkaTouch

#include "platform/Hex.h"

#include <stdexcept>

namespace TolkaTouch::Hex {

namespace {

int digitValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

}  // namespace

std::string text(std::span<const uint8_t> bytes, Spacing spacing) {
    static constexpr char kDigits[] = "0123456789abcdef";
    std::string out;
    out.reserve(bytes.size() * 3);
    for (size_t i = 0; i < bytes.size(); ++i) {
        if (spacing == Spacing::Between && i != 0) out += ' ';
        out += kDigits[bytes[i] >> 4];
        out += kDigits[bytes[i] & 0xF];
        if (spacing == Spacing::AfterEach) out += ' ';
    }
    return out;
}

std::vector<uint8_t> bytesFromPairs(std::string_view text, std::string_view ignored) {
    std::vector<uint8_t> bytes;
    int high = -1;
    for (const char c : text) {
        if (ignored.find(c) != std::string_view::npos) continue;
        const int value = digitValue(c);
        if (value < 0) throw std::invalid_argument("not hex");
        if (high < 0) {
            high = value;
        } else {
            bytes.push_back(static_cast<uint8_t>(high << 4 | value));
            high = -1;
        }
    }
    if (high >= 0) throw std::invalid_argument("odd number of hex digits");
    return bytes;
}

}  // namespace TolkaTouch::Hex

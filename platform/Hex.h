#pragma once
// The hex text of byte data, one codec for everyone: two lower-case digits per byte, spaced as the
// caller's format requires; and the strict reading of digit pairs written by people.

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace TolkaTouch::Hex {

enum class Spacing {
    AfterEach,  // "0a ff 00 ": the recording form, a space after every byte
    Between,    // "0a ff 00": the readable form of a value, spaces between bytes
};

std::string text(std::span<const uint8_t> bytes, Spacing spacing);

// Pairs of hex digits (either case), the characters in `ignored` skipped wherever they stand.
// Throws std::invalid_argument "not hex" or "odd number of hex digits".
std::vector<uint8_t> bytesFromPairs(std::string_view text, std::string_view ignored = " ");

// The recording form as documents carry a report ("hh " a byte, digits of either case, the last
// space optional), read at the speed of reading the document around it, sixteen bytes at a time
// where the processor has a byte shuffle: into `bytes`, whose storage is reused; false, with
// `bytes` unspecified, for any other text.
bool bytesFromRecordingForm(std::string_view text, std::vector<uint8_t>& bytes);

}  // namespace TolkaTouch::Hex

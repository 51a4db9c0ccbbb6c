#pragma once
// ReportHex: the hex text the document writer gives a report's bytes ("hh " per byte), decoded
// at the speed of reading the document around it; any other text is left to the general reader.

#include <cstdint>
#include <string_view>
#include <vector>

namespace TolkaTouch::ReportHex {

// The writer's form, two hex digits of either case and a space per byte (the last space
// optional), into `bytes`, whose storage is reused; false, with `bytes` unspecified, for
// anything else.
bool decodeWriterForm(std::string_view text, std::vector<uint8_t>& bytes);

}  // namespace TolkaTouch::ReportHex

#pragma once
// Util: small shared helpers of the pipeline, the recorder and the service: host clock ticks to
// and from nanoseconds, bytes to and from hex text, state-key domains, and a text drawing of an
// image report.

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "common/Reports.h"
#include "platform/Format.h"

namespace TolkaTouch::Util {

// nanoseconds = ticks * numerator / denominator of the host clock's timebase, read once per
// process. The multiplication comes first and wraps in 64 bits; a zero divisor gives 0.
uint64_t machTimeFromNanoseconds(uint64_t nanoseconds);
uint64_t nanosecondsFromMachTime(uint64_t ticks);

// "%02x " per byte: "0a ff 00 " for {0x0a, 0xff, 0x00}; "" for no bytes.
std::string hexStringFromBytes(const std::vector<uint8_t>& bytes);

// Whitespace-separated hex tokens up to the first one that does not read; throws
// std::invalid_argument("invalid hex string") for a token of 256 or more. A null pointer reads
// as the empty string.
std::vector<uint8_t> bytesFromHexString(const std::string* text);
std::vector<uint8_t> bytesFromHexString(const std::string& text);

// True when key starts with domain + "."; that prefix is then removed from key.
bool stripDomainFromKey(std::string& key, const std::string& domain);

// The surface's pixels as they sit on the device: 13 rows of 36 columns, each pixel a run of four
// of its letter ('A' is pixel 0, 'O' pixel 14). A pixel that spans two places (A-F, J, L) appears
// twice. Every run is followed by a space.
inline constexpr std::array<const char*, 13> kImageLayout = {
    "           HHHH      GGGG           ",
    "                IIII                ",
    "     BBBB                  AAAA     ",
    "         JJJJ          JJJJ         ",
    "     FFFF                  EEEE     ",
    " AAAA                          BBBB ",
    "                KKKK                ",
    " DDDD                          CCCC ",
    "     EEEE                  FFFF     ",
    "         LLLL          LLLL         ",
    "     CCCC                  DDDD     ",
    "                MMMM                ",
    "           NNNN      OOOO           ",
};

// The image drawn on the surface's pixel layout: signed readings, or raw ones when useRawPixels.
std::string stringFromImage(const InputReport::Image& image, bool useRawPixels);

}  // namespace TolkaTouch::Util

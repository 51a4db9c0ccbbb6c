// Prints the text drawing of one image report: a finger resting on pixels C and D, as the
// surface's firmware would send it. Shows the report bytes going through the image parser and
// the diagnostic drawing that debug logs use.
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "common/Reports.h"
#include "common/Util.h"

namespace {

using namespace TolkaTouch;

void putU16(std::vector<uint8_t>& bytes, size_t offset, uint16_t value) {
    bytes[offset] = static_cast<uint8_t>(value);
    bytes[offset + 1] = static_cast<uint8_t>(value >> 8);
}

void putU32(std::vector<uint8_t>& bytes, size_t offset, uint32_t value) {
    for (size_t i = 0; i < 4; ++i) bytes[offset + i] = static_cast<uint8_t>(value >> (8 * i));
}

// One image report (ID 1): frame number, firmware time, four carried bytes, then the raw and the
// signed (baseline-removed) readings of pixels A to O, all little-endian.
std::vector<uint8_t> sampleImageReport() {
    //                                 A   B    C    D   E   F  G  H   I  J   K   L  M   N  O
    const int16_t readings[kPixelCount] = {6, 4, 412, 387, 35, 41, 1, -2, 0, 9, 18, 22, 3, -1, 2};
    const uint16_t baseline = 1500;

    std::vector<uint8_t> bytes(InputReport::Image::kReportLength, 0);
    bytes[0] = InputReport::kImageReportID;
    putU32(bytes, 1, 1024);   // frameNumber
    putU32(bytes, 5, 52317);  // timeMs
    for (size_t i = 0; i < kPixelCount; ++i) {
        putU16(bytes, 13 + 2 * i, static_cast<uint16_t>(baseline + readings[i]));
        putU16(bytes, 43 + 2 * i, static_cast<uint16_t>(readings[i]));
    }
    return bytes;
}

}  // namespace

int main() {
    const std::vector<uint8_t> report = sampleImageReport();
    const auto image = InputReport::Image::parse(report.data(), report.size());
    if (!image) {
        std::fprintf(stderr, "the sample image report did not parse\n");
        return EXIT_FAILURE;
    }
    std::fputs(Util::stringFromImage(*image, false).c_str(), stdout);
    return EXIT_SUCCESS;
}

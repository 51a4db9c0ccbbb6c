#include "common/Reports.h"

namespace TolkaTouch {

namespace {

// Reports arrive as plain bytes at any alignment; every multi-byte field is little-endian on the
// wire whatever the host's own byte order, so fields are assembled byte by byte.
uint16_t readU16LE(const uint8_t* p) {
    return static_cast<uint16_t>(p[0] | (p[1] << 8));
}

uint32_t readU32LE(const uint8_t* p) {
    return static_cast<uint32_t>(p[0]) | (static_cast<uint32_t>(p[1]) << 8) | (static_cast<uint32_t>(p[2]) << 16) |
           (static_cast<uint32_t>(p[3]) << 24);
}

int16_t readI16LE(const uint8_t* p) {
    return static_cast<int16_t>(readU16LE(p));
}

}  // namespace

namespace InputReport {

std::optional<Image> Image::parse(const uint8_t* bytes, size_t length) {
    if (bytes == nullptr || length < kReportLength || bytes[0] != kImageReportID) return std::nullopt;
    Image image{};
    image.frameNumber = readU32LE(bytes + 1);
    image.timeMs = readU32LE(bytes + 5);
    image.aux0 = bytes[9];
    image.aux1 = bytes[10];
    image.aux2 = bytes[11];
    image.aux3 = bytes[12];
    const uint8_t* raw = bytes + 13;
    const uint8_t* signedReadings = raw + 2 * kPixelCount;
    for (size_t i = 0; i < kPixelCount; ++i) {
        image.rawPixels[i] = readU16LE(raw + 2 * i);
        image.pixels[i] = readI16LE(signedReadings + 2 * i);
    }
    return image;
}

std::optional<FirmwareEvent> FirmwareEvent::parse(const uint8_t* bytes, size_t length) {
    if (bytes == nullptr || length < kReportLength || bytes[0] != kFirmwareEventReportID) return std::nullopt;
    FirmwareEvent event{};
    event.event = bytes[1];
    for (size_t i = 0; i < sizeof event.context; ++i) event.context[i] = bytes[2 + i];
    return event;
}

uint64_t FirmwareEvent::contextValue() const {
    uint64_t value = 0;
    for (uint8_t byte : context) value = (value << 8) | byte;
    return value;
}

}  // namespace InputReport

namespace FeatureReport {

std::optional<uint32_t> FactoryResetHoldDuration::parse(const uint8_t* bytes, size_t length) {
    if (bytes == nullptr || length < kReportLength || bytes[0] != kReportID) return std::nullopt;
    return readU32LE(bytes + 1);
}

}  // namespace FeatureReport
}  // namespace TolkaTouch

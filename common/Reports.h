#pragma once
// The surface's report formats: the image input report, the firmware event input report and the
// factory-reset hold duration feature report, with parsers that return nothing for a short or
// foreign report.

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>

#include "tolkatouch/PixelRegion.h"

namespace TolkaTouch {

namespace InputReport {

inline constexpr uint8_t kImageReportID = 1;
inline constexpr uint8_t kFirmwareEventReportID = 2;

// One frame of the 15 sensing pixels (A first, O last): the report's 72 bytes after its ID.
struct Image {
    uint32_t frameNumber;
    uint32_t timeMs;
    uint8_t aux0;
    uint8_t aux1;
    uint8_t aux2;
    uint8_t aux3;
    uint16_t rawPixels[kPixelCount];
    int16_t pixels[kPixelCount];  // what the recognizer consumes

    static constexpr size_t kReportLength = 73;  // with the report ID
    static std::optional<Image> parse(const uint8_t* bytes, size_t length);
};
static_assert(sizeof(Image) == 72, "the image record mirrors the report's 72 bytes after its ID");

// An out-of-band notice from the firmware; event code 0 means the firmware has reset.
struct FirmwareEvent {
    uint8_t event;
    uint8_t context[8];

    static constexpr uint8_t kReset = 0;
    static constexpr size_t kReportLength = 10;  // with the report ID
    static std::optional<FirmwareEvent> parse(const uint8_t* bytes, size_t length);

    // The context bytes as one number, the first byte most significant.
    uint64_t contextValue() const;
};
static_assert(sizeof(FirmwareEvent) == 9, "the firmware event record mirrors the report's 9 bytes after its ID");

}  // namespace InputReport

namespace FeatureReport {

struct FactoryResetHoldDuration {
    static constexpr uint8_t kReportID = 0x1F;
    static constexpr size_t kReportLength = 5;  // with the report ID
    static std::optional<uint32_t> parse(const uint8_t* bytes, size_t length);
};

}  // namespace FeatureReport
}  // namespace TolkaTouch

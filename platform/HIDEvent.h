#pragma once
// HIDEvent: one event handed to the host, a digitizer gesture or the vendor-defined reset notice.
// A plain record shared by reference count; EventList (its own header) holds the events that one
// report produced.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace TolkaTouch {

enum class HIDEventType : uint32_t {
    VendorDefined = 1,
    Digitizer = 11,
};

// Digitizer phases as the host's event system numbers them.
namespace HIDEventPhase {
inline constexpr uint32_t None = 0;
inline constexpr uint32_t Began = 1;
inline constexpr uint32_t Changed = 2;
inline constexpr uint32_t Ended = 4;
inline constexpr uint32_t Cancelled = 8;
inline constexpr uint32_t MayBegin = 128;
}  // namespace HIDEventPhase

// Integer field (type 11, index 27) in which the recognizer stores the image's frame number.
inline constexpr uint32_t kDigitizerFrameNumberField = 0xB001B;

struct HIDEvent {
    HIDEventType type = HIDEventType::Digitizer;
    uint64_t timestamp = 0;  // host clock ticks; stamped by the pipeline
    uint32_t options = 0;
    uint32_t phase = HIDEventPhase::None;

    // Digitizer fields.
    uint32_t transducerType = 2;  // finger
    uint32_t transducerIndex = 0;
    uint32_t identity = 0;
    uint32_t eventMask = 0;
    uint32_t buttonMask = 0;
    double x = 0.0;
    double y = 0.0;  // the PixelRegion number
    double z = 0.0;
    double tipPressure = 0.0;
    double barrelPressure = 0.0;
    bool range = false;
    bool touch = false;
    int64_t frameNumberField = 0;  // integer field 0xB001B

    // Vendor-defined fields.
    uint32_t usagePage = 0;
    uint32_t usage = 0;
    uint32_t version = 0;
    std::vector<uint8_t> payload;

    // Integer fields by their host field number; only 0xB001B is carried, others read as 0.
    int64_t integerValue(uint32_t field) const;
    void setIntegerValue(uint32_t field, int64_t value);

    // One readable line, as "Dispatch event: %@" logs it.
    std::string description() const;
};

using HIDEventRef = std::shared_ptr<HIDEvent>;

// A digitizer event with the common defaults: finger, everything zero but mask, phase and y.
HIDEventRef makeDigitizerEvent(uint32_t eventMask, uint32_t phase, double y);

// A vendor-defined event of a usage page and usage, everything else zero.
HIDEventRef makeVendorDefinedEvent(uint32_t usagePage, uint32_t usage);

}  // namespace TolkaTouch

#pragma once
// The gesture codec: the one place that knows how a gesture is carried in a host event (event
// mask, phase, region, the vendor usage page of the firmware reset) and how to read it back.
// The recognizer encodes with it; the JSON form of events, the daemon's keys and the tools decode.

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/HIDEvent.h"
#include "tolkatouch/PixelRegion.h"

namespace TolkaTouch {

enum class GestureKind : uint8_t { MayBegin, HoldStart, HoldChange, HoldEnd, Tap, Cancel, Reset };

struct Gesture {
    GestureKind kind = GestureKind::MayBegin;
    PixelRegion region = PixelRegion::None;   // None for cancel and reset
    std::optional<uint32_t> frameNumber;      // none for the reset
};

namespace GestureCodec {

inline constexpr uint32_t kHoldEventMask = 2;
inline constexpr uint32_t kTapEventMask = 0x20000;
inline constexpr uint16_t kVendorUsagePage = 0xFF60;
inline constexpr uint32_t kResetUsage = 2;

// The event the recognizer hands out for a gesture; a cancel carries no region, whatever is given.
HIDEventRef encode(GestureKind kind, PixelRegion region = PixelRegion::None);

// The gesture an event carries; none for an event that is not one of ours.
std::optional<Gesture> decode(const HIDEvent& event);

// "may-begin", "hold-start", "hold-change", "hold-end", "tap", "cancel", "reset".
std::string_view kindName(GestureKind kind);
// The name of the gesture an event carries, "unknown" for any other event.
std::string_view kindName(const HIDEvent& event);
bool isHold(GestureKind kind);

// One JSON object without a line end, as `tolkatouch replay --json` and `tolkatouchd --print`
// write it so that the two compare line by line:
// {"frame":<frame number, null for reset>,"event":<kind>,"region":<y>,"phase":<phase>,"timestamp":<ticks>}
std::string jsonLine(const HIDEvent& event);

}  // namespace GestureCodec
}  // namespace TolkaTouch

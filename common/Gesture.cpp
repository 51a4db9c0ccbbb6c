#include "tolkatouch/Gesture.h"

#include <nlohmann/json.hpp>

namespace TolkaTouch::GestureCodec {

namespace {

double regionNumber(PixelRegion region) { return static_cast<double>(static_cast<uint32_t>(region)); }

// The region an event carries: its y, when that is a region number at all.
PixelRegion regionOf(const HIDEvent& event) {
    return event.y >= 0.0 && event.y < 16.0 ? static_cast<PixelRegion>(static_cast<uint32_t>(event.y))
                                            : PixelRegion::None;
}

bool isReset(const HIDEvent& event) {
    return event.type == HIDEventType::VendorDefined && event.usagePage == kVendorUsagePage &&
           event.usage == kResetUsage;
}

std::optional<GestureKind> digitizerKind(const HIDEvent& event) {
    if (event.eventMask == kTapEventMask) return GestureKind::Tap;
    const bool hold = event.eventMask == kHoldEventMask;
    switch (event.phase) {
    case HIDEventPhase::MayBegin: return GestureKind::MayBegin;
    case HIDEventPhase::Cancelled: return GestureKind::Cancel;
    case HIDEventPhase::Began: return hold ? std::optional(GestureKind::HoldStart) : std::nullopt;
    case HIDEventPhase::Changed: return hold ? std::optional(GestureKind::HoldChange) : std::nullopt;
    case HIDEventPhase::Ended: return hold ? std::optional(GestureKind::HoldEnd) : std::nullopt;
    default: return std::nullopt;
    }
}

}  // namespace

HIDEventRef encode(GestureKind kind, PixelRegion region) {
    switch (kind) {
    case GestureKind::MayBegin: return makeDigitizerEvent(0, HIDEventPhase::MayBegin, regionNumber(region));
    case GestureKind::HoldStart: return makeDigitizerEvent(kHoldEventMask, HIDEventPhase::Began, regionNumber(region));
    case GestureKind::HoldChange:
        return makeDigitizerEvent(kHoldEventMask, HIDEventPhase::Changed, regionNumber(region));
    case GestureKind::HoldEnd: return makeDigitizerEvent(kHoldEventMask, HIDEventPhase::Ended, regionNumber(region));
    // Created without a phase on purpose: it reads back as 0.
    case GestureKind::Tap: return makeDigitizerEvent(kTapEventMask, HIDEventPhase::None, regionNumber(region));
    case GestureKind::Cancel: return makeDigitizerEvent(0, HIDEventPhase::Cancelled, 0.0);
    case GestureKind::Reset: return makeVendorDefinedEvent(kVendorUsagePage, kResetUsage);
    }
    return nullptr;
}

std::optional<Gesture> decode(const HIDEvent& event) {
    if (isReset(event)) return Gesture{GestureKind::Reset, PixelRegion::None, std::nullopt};
    if (event.type != HIDEventType::Digitizer) return std::nullopt;
    const std::optional<GestureKind> kind = digitizerKind(event);
    if (!kind) return std::nullopt;
    return Gesture{*kind, regionOf(event), static_cast<uint32_t>(event.integerValue(kDigitizerFrameNumberField))};
}

std::string_view kindName(GestureKind kind) {
    switch (kind) {
    case GestureKind::MayBegin: return "may-begin";
    case GestureKind::HoldStart: return "hold-start";
    case GestureKind::HoldChange: return "hold-change";
    case GestureKind::HoldEnd: return "hold-end";
    case GestureKind::Tap: return "tap";
    case GestureKind::Cancel: return "cancel";
    case GestureKind::Reset: return "reset";
    }
    return "unknown";
}

std::string_view kindName(const HIDEvent& event) {
    const std::optional<Gesture> gesture = decode(event);
    return gesture ? kindName(gesture->kind) : "unknown";
}

bool isHold(GestureKind kind) {
    return kind == GestureKind::HoldStart || kind == GestureKind::HoldChange || kind == GestureKind::HoldEnd;
}

std::string jsonLine(const HIDEvent& event) {
    nlohmann::ordered_json line = nlohmann::ordered_json::object();
    if (event.type == HIDEventType::Digitizer) {
        line["frame"] = event.integerValue(kDigitizerFrameNumberField);
    } else {
        line["frame"] = nullptr;
    }
    line["event"] = kindName(event);
    line["region"] = event.type == HIDEventType::Digitizer ? static_cast<int64_t>(event.y) : 0;
    line["phase"] = event.phase;
    line["timestamp"] = event.timestamp;
    return line.dump();
}

}  // namespace TolkaTouch::GestureCodec

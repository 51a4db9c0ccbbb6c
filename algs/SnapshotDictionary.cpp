#include "algs/SnapshotDictionary.h"

#include <array>
#include <cstddef>

namespace TolkaTouch {

namespace {
template <typename T, size_t N>
PropertyValue list(const std::array<T, N>& values) {
    PropertyValue::Array items;
    items.reserve(N);
    for (const T& value : values) items.emplace_back(value);
    return PropertyValue(std::move(items));
}
}  // namespace

PropertyValue snapshotDictionary(const FrameSnapshot& frame) {
    return PropertyValue(PropertyValue::Dictionary{
        {"frame", PropertyValue(frame.frameNumber)},
        {"time", PropertyValue(frame.timeMs)},
        {"readings", list(frame.readings)},
        {"pixel_values", list(frame.pixelValues)},
        {"normalized", list(frame.pixelNormalized)},
        {"on", list(frame.pixelOn)},
        {"virtual_values", list(frame.virtualValues)},
        {"virtual_normalized", list(frame.virtualNormalized)},
        {"virtual_on", list(frame.virtualOn)},
        {"touch_score", PropertyValue(frame.touchScore)},
        {"svm_score", PropertyValue(frame.svmScore)},
        {"strength_rate", PropertyValue(frame.strengthRate)},
        {"strength_per_duration", PropertyValue(frame.strengthPerDuration)},
        {"duration_ratio", PropertyValue(frame.durationRatio)},
        {"active_pixel_count", PropertyValue(frame.activePixelCount)},
        {"tap_score", PropertyValue(frame.tapScore)},
        {"touching", PropertyValue(frame.touching)},
        {"above_noise", PropertyValue(frame.aboveNoise)},
        {"since_touch_start_ms", PropertyValue(frame.sinceTouchStartMs)},
        {"touch_length_ms", PropertyValue(frame.touchLengthMs)},
        {"transition", PropertyValue(static_cast<unsigned>(frame.verdict.transition))},
        {"hold_suppressed", PropertyValue(frame.verdict.holdSuppressed)},
        {"hold_clock", PropertyValue(static_cast<unsigned>(frame.verdict.holdClock))},
        {"region", PropertyValue(static_cast<unsigned>(frame.verdict.region))},
    });
}

}  // namespace TolkaTouch

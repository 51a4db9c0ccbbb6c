#pragma once
// Pixel: one sensing pixel's state from frame to frame: its scaled and normalised reading, the
// peak/valley hysteresis that says whether it is on, and per-touch statistics for tap rejection.

#include <algorithm>
#include <cmath>
#include <cstdint>

#include "common/Reports.h"

namespace TolkaTouch {

// The zone a pixel index belongs to: A-F and K play/pause, L-O volume down, G-J volume up,
// anything else no zone.
PixelRegion pixelRegionOfIndex(int index);

class Pixel {
public:
    // Readings at or below this count are noise.
    static constexpr int32_t kNoiseLevel = 75;
    // An on pixel turns off at this fraction of its peak; an off one turns on above valley / it.
    static constexpr float kHysteresis = 0.6f;

    Pixel(int index, float gain);

    // One frame: scales raw by the gain, normalises by divisor and runs the hysteresis.
    void updatePixelState(int raw, float divisor);
    PixelRegion getPixelRegion() const;
    // Clears the per-touch statistics (wasAboveNoise, wasOn, maxNormalizedAboveNoise) only.
    void resetGlobalStats();

    int32_t value = 0;  // gain x raw, truncated toward zero; 0 until the first reading
    float gain;
    float normalized = 0.0f;
    float peak = 0.0f;
    float valley = 0.0f;
    bool isOn = false;
    bool aboveNoise = false;
    bool wasAboveNoise = false;  // since the last resetGlobalStats
    bool wasOn = false;          // since the last resetGlobalStats
    float maxNormalizedAboveNoise = 0.0f;
    int32_t index;  // 0..14 for pixels A..O; a virtual pixel's strongest member
};

namespace PixelDetail {

// Truncation toward zero. The product of a fixed gain and a 16-bit reading always fits; anything
// else (a gain that is not a number, or huge) saturates instead of overflowing.
inline int32_t truncateToInt32(float x) {
    if (std::isnan(x)) return 0;
    if (x >= 2147483648.0f) return INT32_MAX;
    if (x <= -2147483648.0f) return INT32_MIN;
    return static_cast<int32_t>(x);
}

}  // namespace PixelDetail

// Inline: it runs for 38 elements every frame, and the call would cost as much as the work.
inline void Pixel::updatePixelState(int raw, float divisor) {
    // 1. Scale.
    value = PixelDetail::truncateToInt32(gain * static_cast<float>(raw));

    // 2. Threshold from last frame's state: off at 60 % of the peak; on above valley / 0.6, but
    // never at a normalised value of 1.0 or less.
    const float threshold = isOn ? peak * kHysteresis : std::max(valley / kHysteresis, 1.0f);

    // 3. Normalise; 4. decide.
    normalized = static_cast<float>(value) / divisor;
    isOn = normalized > threshold;

    // 5. Follow the peak while on, the valley while off.
    if (isOn) {
        peak = std::max(normalized, peak);
        valley = normalized;
        wasOn = true;
    } else {
        peak = normalized;
        valley = std::min(normalized, valley);
    }

    // 6., 7. Noise statistics.
    aboveNoise = value > kNoiseLevel;
    if (value >= kNoiseLevel + 1) {
        wasAboveNoise = true;
        maxNormalizedAboveNoise = std::max(normalized, maxNormalizedAboveNoise);
    }
}

}  // namespace TolkaTouch

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
// else (a gain that is not a number, or huge) saturates instead of overflowing. Written with
// selects, not branches, so that a loop of them becomes vector code: the conversion only ever sees
// a number inside the 32-bit range.
inline int32_t truncateToInt32(float x) {
    const bool high = x >= 2147483648.0f;
    const bool low = x <= -2147483648.0f;
    const bool inRange = (x > -2147483648.0f) & (x < 2147483648.0f);  // false for not-a-number
    const int32_t truncated = static_cast<int32_t>(inRange ? x : 0.0f);
    return high ? INT32_MAX : low ? INT32_MIN : truncated;
}

// One element's frame (the steps of Pixel::updatePixelState), on its fields wherever they live:
// in a Pixel, or at one index of a PixelBank's rows. Every field is assigned by a select rather
// than under a branch, so that a loop over many elements becomes vector code; each step is one
// IEEE operation, which gives the same bits in a vector lane as in a scalar register. A flag is a
// bool in a Pixel and a 32-bit 0 or 1 in a bank, a width the vectoriser handles beside floats.
template <typename Flag>
inline void updateElement(int raw, float divisor, float gain, int32_t& value, float& normalized, float& peak,
                          float& valley, Flag& isOn, Flag& aboveNoise, Flag& wasAboveNoise, Flag& wasOn,
                          float& maxNormalizedAboveNoise) {
    constexpr float kHysteresis = Pixel::kHysteresis;
    constexpr int32_t kNoiseLevel = Pixel::kNoiseLevel;

    // 1. Scale.
    const int32_t v = truncateToInt32(gain * static_cast<float>(raw));

    // 2. Threshold from last frame's state: off at 60 % of the peak; on above valley / 0.6, but
    // never at a normalised value of 1.0 or less.
    const float offThreshold = peak * kHysteresis;
    const float onThreshold = std::max(valley / kHysteresis, 1.0f);
    const float threshold = isOn != 0 ? offThreshold : onThreshold;

    // 3. Normalise; 4. decide.
    const float n = static_cast<float>(v) / divisor;
    const bool on = n > threshold;

    // 5. Follow the peak while on, the valley while off.
    const float peakIfOn = std::max(n, peak);
    const float valleyIfOff = std::min(n, valley);
    peak = on ? peakIfOn : n;
    valley = on ? n : valleyIfOff;
    wasOn = static_cast<Flag>(wasOn | on);

    // 6., 7. Noise statistics.
    const bool above = v > kNoiseLevel;
    const float maxIfAbove = std::max(n, maxNormalizedAboveNoise);
    maxNormalizedAboveNoise = above ? maxIfAbove : maxNormalizedAboveNoise;
    wasAboveNoise = static_cast<Flag>(wasAboveNoise | above);
    aboveNoise = static_cast<Flag>(above);
    value = v;
    normalized = n;
    isOn = static_cast<Flag>(on);
}

}  // namespace PixelDetail

// Inline: the call would cost as much as the work.
inline void Pixel::updatePixelState(int raw, float divisor) {
    PixelDetail::updateElement(raw, divisor, gain, value, normalized, peak, valley, isOn, aboveNoise, wasAboveNoise,
                               wasOn, maxNormalizedAboveNoise);
}

}  // namespace TolkaTouch

#include "algs/Pixel.h"

#include <algorithm>
#include <cmath>

namespace TolkaTouch {

namespace {

// Truncation toward zero. The product of a fixed gain and a 16-bit reading always fits; anything
// else (a gain that is not a number, or huge) saturates instead of overflowing.
int32_t truncateToInt32(float x) {
    if (std::isnan(x)) return 0;
    if (x >= 2147483648.0f) return INT32_MAX;
    if (x <= -2147483648.0f) return INT32_MIN;
    return static_cast<int32_t>(x);
}

}  // namespace

PixelRegion pixelRegionOfIndex(int index) {
    if (index >= 0 && index <= 5) return PixelRegion::PlayPause;    // A-F
    if (index >= 6 && index <= 9) return PixelRegion::VolumeUp;     // G-J
    if (index == 10) return PixelRegion::PlayPause;                 // K sits with A-F
    if (index >= 11 && index <= 14) return PixelRegion::VolumeDown; // L-O
    return PixelRegion::None;
}

Pixel::Pixel(int index, float gain) : gain(gain), index(index) {}

void Pixel::updatePixelState(int raw, float divisor) {
    // 1. Scale.
    value = truncateToInt32(gain * static_cast<float>(raw));

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

PixelRegion Pixel::getPixelRegion() const { return pixelRegionOfIndex(index); }

void Pixel::resetGlobalStats() {
    wasAboveNoise = false;
    wasOn = false;
    maxNormalizedAboveNoise = 0.0f;
}

}  // namespace TolkaTouch

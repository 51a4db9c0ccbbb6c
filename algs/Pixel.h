#pragma once
// Pixel: one sensing pixel's state from frame to frame: its scaled and normalised reading, the
// peak/valley hysteresis that says whether it is on, and per-touch statistics for tap rejection.

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

}  // namespace TolkaTouch

#pragma once
// Pixel: one sensing pixel's state from frame to frame: its scaled and normalised reading, the
// peak/valley hysteresis that says whether it is on, and per-touch statistics for tap rejection.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <type_traits>

#include "algs/Lanes.h"
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

// The steps below are written once for a single element (float, int32_t, a bool condition) and
// for eight elements at a time (Lanes::Floats, Lanes::Ints, Lanes::Mask); these give each step
// its meaning for a single element.
inline float toFloat(int32_t x) { return static_cast<float>(x); }
inline Lanes::Floats toFloat(Lanes::Ints x) { return Lanes::toFloats(x); }
// Truncation toward zero of a value inside the 32-bit range.
inline int32_t toInt(float x) { return static_cast<int32_t>(x); }
inline Lanes::Ints toInt(Lanes::Floats x) { return Lanes::toInts(x); }
inline float select(bool m, float a, float b) { return m ? a : b; }
inline int32_t select(bool m, int32_t a, int32_t b) { return m ? a : b; }
using Lanes::select;
inline float maxOf(float a, float b) { return std::max(a, b); }
inline float minOf(float a, float b) { return std::min(a, b); }
using Lanes::maxOf;
using Lanes::minOf;
// A condition as a stored flag: a bool in a Pixel, 0 or 1 in a 32-bit lane.
template <typename Flag>
inline Flag asFlag(bool m) {
    return static_cast<Flag>(m);
}
template <typename Flag>
inline Flag asFlag(Lanes::Mask m) {
    return Lanes::flag(m);
}
// The same constant in every lane.
template <typename T, typename S>
inline T splat(S s) {
    if constexpr (std::is_arithmetic_v<T>) {
        return static_cast<T>(s);
    } else {
        return Lanes::broadcast(s);
    }
}

// Truncation toward zero. The product of a fixed gain and a 16-bit reading always fits; anything
// else (a gain that is not a number, or huge) saturates instead of overflowing, and not-a-number
// gives 0. Written with selects, not branches: the value is first held inside [-2^31, 2^31), so
// the conversion only ever sees a number in the 32-bit range (the bottom converts to INT32_MIN
// itself); the top is replaced after.
template <typename F, typename I>
inline I truncateToInt32(F x) {
    const F upper = splat<F>(2147483648.0f);
    const F lower = splat<F>(-2147483648.0f);
    const F belowUpper = splat<F>(2147483520.0f);  // the largest float below 2^31
    const F held = select(x != x, F{}, minOf(maxOf(x, lower), belowUpper));
    return select(x >= upper, splat<I>(INT32_MAX), toInt(held));
}

// One element's frame (the steps of Pixel::updatePixelState), on its fields wherever they live:
// in a Pixel, or eight at a time in a PixelBank's rows. Every field is assigned by a select rather
// than under a branch; each step is one IEEE operation, which gives the same bits in a vector lane
// as in a scalar register.
template <typename F, typename I, typename Flag>
inline void updateElement(I raw, F divisor, F gain, I& value, F& normalized, F& peak, F& valley, Flag& isOn,
                          Flag& aboveNoise, Flag& wasAboveNoise, Flag& wasOn, F& maxNormalizedAboveNoise) {
    const F hysteresis = splat<F>(Pixel::kHysteresis);

    // 1. Scale.
    const I v = truncateToInt32<F, I>(gain * toFloat(raw));

    // 2. Threshold from last frame's state: off at 60 % of the peak; on above valley / 0.6, but
    // never at a normalised value of 1.0 or less.
    const F offThreshold = peak * hysteresis;
    const F onThreshold = maxOf(valley / hysteresis, splat<F>(1.0f));
    const F threshold = select(isOn != splat<Flag>(0), offThreshold, onThreshold);

    // 3. Normalise; 4. decide.
    const F n = toFloat(v) / divisor;
    const auto on = n > threshold;

    // 5. Follow the peak while on, the valley while off.
    const F peakIfOn = maxOf(n, peak);
    const F valleyIfOff = minOf(n, valley);
    peak = select(on, peakIfOn, n);
    valley = select(on, n, valleyIfOff);
    wasOn = wasOn | asFlag<Flag>(on);

    // 6., 7. Noise statistics.
    const auto above = v > splat<I>(Pixel::kNoiseLevel);
    const F maxIfAbove = maxOf(n, maxNormalizedAboveNoise);
    maxNormalizedAboveNoise = select(above, maxIfAbove, maxNormalizedAboveNoise);
    wasAboveNoise = wasAboveNoise | asFlag<Flag>(above);
    aboveNoise = asFlag<Flag>(above);
    value = v;
    normalized = n;
    isOn = asFlag<Flag>(on);
}

}  // namespace PixelDetail

// Inline: the call would cost as much as the work.
inline void Pixel::updatePixelState(int raw, float divisor) {
    PixelDetail::updateElement<float, int32_t, bool>(raw, divisor, gain, value, normalized, peak, valley, isOn,
                                                     aboveNoise, wasAboveNoise, wasOn, maxNormalizedAboveNoise);
}

}  // namespace TolkaTouch

#pragma once
// FingerModel: what the surface's 15 pixels read while a finger (or nothing) rests on it.
//
// The pixels' pads lie where the image drawing places the letters A to O (pixels A-F, J and L
// have two pads each). A finger couples to each pad by a Gaussian of its distance; a pixel's
// reading is the finger's strength times its pads' coupling, divided by the pixel's gain so
// that the recognizer's scaled values come out alike for every pixel, plus sensor noise. The
// unsigned raw reading is a per-pixel baseline plus the signed one.
//
// Positions are in drawing units: one row of the drawing is 1, one column 0.5 (a character is
// about half as wide as it is tall); the origin is pixel K, in the middle.

#include <array>
#include <cstdint>
#include <optional>
#include <vector>

#include "common/Reports.h"
#include "tools/GestureScript.h"
#include "tools/SeededRandom.h"

namespace TolkaTouch::Tools {

struct SurfacePoint {
    double x = 0.0;
    double y = 0.0;
};

struct FingerContact {
    SurfacePoint centre;
    double strength = 0.0;  // scaled reading of a pad right under the finger
    double radius = 2.0;    // distance at which the coupling has fallen to e^-0.5
};

struct SensorReadings {
    std::array<int16_t, kPixelCount> pixels{};      // signed, what the recognizer consumes
    std::array<uint16_t, kPixelCount> rawPixels{};  // baseline plus signed reading
};

struct Pad {
    int pixel = 0;  // 0 = A ... 14 = O
    SurfacePoint centre;
};

class FingerModel {
public:
    // noiseDeviation: the sensor noise's standard deviation, in signed counts.
    explicit FingerModel(uint64_t seed, double noiseDeviation = kNoiseDeviation);

    // One frame's readings; each call draws new noise.
    SensorReadings read(const std::optional<FingerContact>& contact);

    // The pads as the image drawing places them.
    static const std::vector<Pad>& pads();

    // Where a finger pressing a zone sits: on K for play-pause, on I for volume-up, on M for
    // volume-down.
    static SurfacePoint zoneCentre(Zone zone);

    // The gain the recognizer applies to each pixel's reading.
    static float pixelGain(int pixel);

    static constexpr double kNoiseDeviation = 2.0;  // signed counts

private:
    SeededRandom _random;
    double _noiseDeviation = kNoiseDeviation;
    std::array<double, kPixelCount> _baseline{};  // raw reading with nothing on the surface
    std::array<double, kPixelCount> _drift{};     // slow wander of the baseline, in counts
};

}  // namespace TolkaTouch::Tools

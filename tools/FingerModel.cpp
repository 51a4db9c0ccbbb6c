#include "tools/FingerModel.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string_view>

#include "algs/Algs.h"
#include "common/Util.h"

namespace TolkaTouch::Tools {

namespace {

constexpr double kColumnWidth = 0.5;
constexpr double kCentreRow = 6.0;       // the row of K, counted from 0
constexpr double kCentreColumn = 17.5;  // the middle of K's run

std::vector<Pad> padsFromLayout() {
    std::vector<Pad> pads;
    for (size_t row = 0; row < Util::kImageLayout.size(); ++row) {
        const std::string_view text = Util::kImageLayout[row];
        size_t column = 0;
        while (column < text.size()) {
            if (text[column] == ' ') {
                ++column;
                continue;
            }
            size_t end = column;
            while (end < text.size() && text[end] == text[column]) ++end;
            const double middle = (static_cast<double>(column) + static_cast<double>(end - 1)) / 2.0;
            pads.push_back(Pad{text[column] - 'A',
                               SurfacePoint{(middle - kCentreColumn) * kColumnWidth, static_cast<double>(row) - kCentreRow}});
            column = end;
        }
    }
    return pads;
}

double coupling(const SurfacePoint& pad, const FingerContact& contact) {
    const double dx = pad.x - contact.centre.x;
    const double dy = pad.y - contact.centre.y;
    return std::exp(-(dx * dx + dy * dy) / (2.0 * contact.radius * contact.radius));
}

template <typename T>
T clampTo(double value) {
    return static_cast<T>(std::clamp(std::lround(value), static_cast<long>(std::numeric_limits<T>::min()),
                                     static_cast<long>(std::numeric_limits<T>::max())));
}

}  // namespace

FingerModel::FingerModel(uint64_t seed, double noiseDeviation) : _random(seed), _noiseDeviation(noiseDeviation) {
    for (double& baseline : _baseline) baseline = _random.uniform(1400.0, 2200.0);
}

const std::vector<Pad>& FingerModel::pads() {
    static const std::vector<Pad> pads = padsFromLayout();
    return pads;
}

SurfacePoint FingerModel::zoneCentre(Zone zone) {
    switch (zone) {
    case Zone::PlayPause: return SurfacePoint{0.0, 0.0};
    case Zone::VolumeUp: return SurfacePoint{0.0, -5.0};
    case Zone::VolumeDown: return SurfacePoint{0.0, 5.0};
    }
    return SurfacePoint{};
}

float FingerModel::pixelGain(int pixel) { return Algs::pixelGains.at(static_cast<size_t>(pixel)); }

SensorReadings FingerModel::read(const std::optional<FingerContact>& contact) {
    std::array<double, kPixelCount> scaled{};
    if (contact) {
        for (const Pad& pad : pads()) scaled[static_cast<size_t>(pad.pixel)] += contact->strength * coupling(pad.centre, *contact);
    }
    SensorReadings readings;
    for (size_t pixel = 0; pixel < kPixelCount; ++pixel) {
        // The baseline wanders by a fraction of a count per frame and is pulled back.
        _drift[pixel] = 0.98 * _drift[pixel] + _random.normal(0.3);
        const double reading = scaled[pixel] / Algs::pixelGains[pixel] + _drift[pixel] + _random.normal(_noiseDeviation);
        readings.pixels[pixel] = clampTo<int16_t>(reading);
        readings.rawPixels[pixel] = clampTo<uint16_t>(_baseline[pixel] + readings.pixels[pixel]);
    }
    return readings;
}

}  // namespace TolkaTouch::Tools

#include "tools/FingerModel.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string_view>

namespace TolkaTouch::Tools {

namespace {

// The image drawing of the pixels' physical layout, 13 rows of 36 columns.
constexpr std::array<std::string_view, 13> kLayout = {
    "           HHHH      GGGG           ",
    "                IIII                ",
    "     BBBB                  AAAA     ",
    "         JJJJ          JJJJ         ",
    "     FFFF                  EEEE     ",
    " AAAA                          BBBB ",
    "                KKKK                ",
    " DDDD                          CCCC ",
    "     EEEE                  FFFF     ",
    "         LLLL          LLLL         ",
    "     CCCC                  DDDD     ",
    "                MMMM                ",
    "           NNNN      OOOO           ",
};

constexpr double kColumnWidth = 0.5;
constexpr double kCentreRow = 6.0;       // the row of K, counted from 0
constexpr double kCentreColumn = 17.5;  // the middle of K's run

constexpr std::array<float, kPixelCount> kGains = {1.9219f, 1.8833f, 1.9281f, 1.8837f, 1.9163f,
                                                    1.8105f, 1.0081f, 1.0f,    1.4851f, 1.5033f,
                                                    2.4154f, 1.5378f, 1.5431f, 1.04f,   1.0493f};

std::vector<Pad> padsFromLayout() {
    std::vector<Pad> pads;
    for (size_t row = 0; row < kLayout.size(); ++row) {
        const std::string_view text = kLayout[row];
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

FingerModel::FingerModel(uint64_t seed) : _random(seed) {
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

float FingerModel::pixelGain(int pixel) { return kGains.at(static_cast<size_t>(pixel)); }

SensorReadings FingerModel::read(const std::optional<FingerContact>& contact) {
    std::array<double, kPixelCount> scaled{};
    if (contact) {
        for (const Pad& pad : pads()) scaled[static_cast<size_t>(pad.pixel)] += contact->strength * coupling(pad.centre, *contact);
    }
    SensorReadings readings;
    for (size_t pixel = 0; pixel < kPixelCount; ++pixel) {
        // The baseline wanders by a fraction of a count per frame and is pulled back.
        _drift[pixel] = 0.98 * _drift[pixel] + _random.normal(0.3);
        const double reading = scaled[pixel] / kGains[pixel] + _drift[pixel] + _random.normal(kNoiseDeviation);
        readings.pixels[pixel] = clampTo<int16_t>(reading);
        readings.rawPixels[pixel] = clampTo<uint16_t>(_baseline[pixel] + readings.pixels[pixel]);
    }
    return readings;
}

}  // namespace TolkaTouch::Tools

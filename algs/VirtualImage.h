#pragma once
// VirtualImage: the 23 overlapping letter groups laid over the 15 pixels, with each group's
// summed strength, strongest member and normalisation factor.

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "algs/Pixel.h"
#include "algs/PixelBank.h"

namespace TolkaTouch {

class VirtualImage {
public:
    VirtualImage();

    // This frame's group sums and strongest members from the real pixels' values.
    void updateValues(std::span<const Pixel> pixels);
    // The same from the real pixels' values alone, in index order.
    void updateValues(std::span<const int32_t> pixelValues);
    // The same from the real pixel row's values. Each group's sum also goes into `readings` as its
    // virtual pixel reads it: cut to its low 16 bits and read as a signed 16-bit number, so that a
    // sum above 32767 wraps to a negative value (the tuned factors and thresholds expect that).
    void updateValues(const RealPixels::Row<int32_t>& pixelValues, VirtualPixels::Row<int32_t>& readings);

    std::vector<int32_t> values;               // summed strength of the members above noise
    std::vector<std::string> groups;           // the letters of each group
    std::vector<int32_t> strongest;            // pixel index of the strongest member; carries over
    std::vector<float> normalizationFactors;   // the "VirtualNormalizationFactors" setting

private:
    // The steps one member at a time, each read with a range test: for lists of any size.
    void updateValuesOneByOne(std::span<const int32_t> pixelValues);
};

}  // namespace TolkaTouch

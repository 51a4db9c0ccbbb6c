#pragma once
// VirtualImage: the 23 overlapping letter groups laid over the 15 pixels, with each group's
// summed strength, strongest member and normalisation factor.

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "algs/Pixel.h"

namespace TolkaTouch {

class VirtualImage {
public:
    VirtualImage();

    // This frame's group sums and strongest members from the real pixels' values.
    void updateValues(std::span<const Pixel> pixels);
    // The same from the real pixels' values alone, in index order.
    void updateValues(std::span<const int32_t> pixelValues);

    std::vector<int32_t> values;               // summed strength of the members above noise
    std::vector<std::string> groups;           // the letters of each group
    std::vector<int32_t> strongest;            // pixel index of the strongest member; carries over
    std::vector<float> normalizationFactors;   // the "VirtualNormalizationFactors" setting
};

}  // namespace TolkaTouch

#pragma once
// VirtualPixel: a Pixel fed with the summed strength of one letter group of the virtual image;
// its index follows the group's strongest member.

#include <string>

#include "algs/Pixel.h"

namespace TolkaTouch {

class VirtualPixel : public Pixel {
public:
    VirtualPixel(int index, float gain, std::string name);

    // The Pixel update on the group's value, then index = the group's strongest member.
    void updatePixelState(int value, float divisor, int index);

    std::string name;  // the group's letters, e.g. "ADEF"
};

inline void VirtualPixel::updatePixelState(int value, float divisor, int index) {
    Pixel::updatePixelState(value, divisor);
    this->index = index;
}

}  // namespace TolkaTouch

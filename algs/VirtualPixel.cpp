#include "algs/VirtualPixel.h"

#include <utility>

namespace TolkaTouch {

VirtualPixel::VirtualPixel(int index, float gain, std::string name) : Pixel(index, gain), name(std::move(name)) {}

void VirtualPixel::updatePixelState(int value, float divisor, int index) {
    Pixel::updatePixelState(value, divisor);
    this->index = index;
}

}  // namespace TolkaTouch

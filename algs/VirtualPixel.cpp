#include "algs/VirtualPixel.h"

#include <utility>

namespace TolkaTouch {

VirtualPixel::VirtualPixel(int index, float gain, std::string name) : Pixel(index, gain), name(std::move(name)) {}

}  // namespace TolkaTouch

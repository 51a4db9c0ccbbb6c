#include "algs/Pixel.h"


namespace TolkaTouch {

PixelRegion pixelRegionOfIndex(int index) {
    if (index >= 0 && index <= 5) return PixelRegion::PlayPause;    // A-F
    if (index >= 6 && index <= 9) return PixelRegion::VolumeUp;     // G-J
    if (index == 10) return PixelRegion::PlayPause;                 // K sits with A-F
    if (index >= 11 && index <= 14) return PixelRegion::VolumeDown; // L-O
    return PixelRegion::None;
}

Pixel::Pixel(int index, float gain) : gain(gain), index(index) {}

PixelRegion Pixel::getPixelRegion() const { return pixelRegionOfIndex(index); }

void Pixel::resetGlobalStats() {
    wasAboveNoise = false;
    wasOn = false;
    maxNormalizedAboveNoise = 0.0f;
}

}  // namespace TolkaTouch

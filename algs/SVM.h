#pragma once
// SVM: the tap classifier. A fixed linear classifier over the rank-ordered values of the 15 real
// and 23 virtual pixels that scores how much one frame looks like a deliberate touch.

#include <array>
#include <cstddef>
#include <span>

#include "algs/Pixel.h"
#include "algs/PixelBank.h"
#include "algs/VirtualPixel.h"

namespace TolkaTouch {

class SVM {
public:
    // One rank per element: 15 real and 23 virtual pixels.
    static constexpr size_t kRankCount = 38;

    SVM();

    // This frame's score; 0 for a quiet frame (nothing above gate and nothing else above noise).
    // Throws std::out_of_range("vector") unless the two lists hold between 2 and 38 elements.
    void updateSVMScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                        float gate);
    // The same over the surface's 15 real and 23 virtual pixels.
    void updateSVMScore(const RealPixels& pixels, const VirtualPixels& virtualPixels, float gate);
    float getSVMScore() const { return score; }

    float score = 0.0f;
    std::array<float, kRankCount> means;    // per rank, subtracted
    std::array<float, kRankCount> scales;   // per rank, divided by
    std::array<float, kRankCount> weights;  // per rank
    float bias = 2.0083f;

private:
    struct ElementLanes;
    // This frame's score from its element values.
    void scoreLanes(const ElementLanes& elements, float gate);
};

}  // namespace TolkaTouch

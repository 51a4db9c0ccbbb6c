#pragma once
// SVM: the tap classifier. A fixed linear classifier over the rank-ordered values of the 15 real
// and 23 virtual pixels that scores how much one frame looks like a deliberate touch.

#include <span>
#include <vector>

#include "algs/Pixel.h"
#include "algs/VirtualPixel.h"

namespace TolkaTouch {

class SVM {
public:
    SVM();

    // This frame's score; 0 for a quiet frame (nothing above gate and nothing else above noise).
    void updateSVMScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                        float gate);
    float getSVMScore() const { return score; }

    float score = 0.0f;
    std::vector<float> means;    // per rank, subtracted
    std::vector<float> scales;   // per rank, divided by
    std::vector<float> weights;  // per rank
    float bias = 2.0083f;
};

}  // namespace TolkaTouch

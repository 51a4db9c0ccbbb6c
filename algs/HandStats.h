#pragma once
// HandStats: the hand state machine. Turns each frame's pixels into whether the surface is
// touched, whether the touch is a hold (or a suppressed one) and whether a touch that just ended
// is a tap; keeps the running touch score, the edge times of the touch and the active region.

#include <cstdint>
#include <span>
#include <utility>
#include <vector>

#include "algs/Pixel.h"
#include "algs/SVM.h"
#include "algs/VirtualPixel.h"
#include "common/Reports.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

// The first two pixels in the region rule's order: largest maxNormalizedAboveNoise first, equal
// keys in ascending index order (a key that is not a number last). Found in one pass, without
// sorting a copy. Throws std::out_of_range("vector") for fewer than two pixels.
std::pair<const Pixel*, const Pixel*> twoFirstByMaxNormalizedAboveNoise(std::span<const Pixel> pixels);

class HandStats {
public:
    HandStats();

    // Puts the touch score's decay parameter back to e^2.
    void SetDecayParameters();
    // Clears the touch score and the strongest-on-pixel record between touches; nothing else.
    void Reset();

    // What the frame just handled did to the touch: the one verdict from which the event, the
    // counters and the description are chosen. Read it after updateHandState.
    FrameVerdict verdict() const;

    // One frame at the firmware time `time` (ms). The pixels are this frame's snapshot; they are
    // only read.
    void updateHandState(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                         unsigned int time);

    void updateTouchScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                          unsigned int time);
    void decayTouchScore(unsigned int time);
    float updateTimeBiasFactor(unsigned int time);
    float fuzzify(float x, float x0, float x1, float y0, float y1);
    float fuzzifyAndClip(float x, float x0, float x1, float y0, float y1);

    // Active region and tap rejection.
    void updateRegionMax(std::span<const Pixel> pixels);
    PixelRegion updateActiveRegion(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                                   unsigned int time);
    PixelRegion changeActiveRegion(std::span<const Pixel> pixels, int index);
    void updateTapRejection(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels);

    SVM svm;
    float touchScore = 0.0f;                 // clamped to +-scoreLimit
    float decayBase = 7.389056f;             // e^2
    float ActivationThreshold = 200.0f;      // normalising divisor and classifier gate
    uint32_t HoldTimeoutMilliseconds = 500;  // a longer touch becomes a hold
    float holdScoreThreshold = 0.0f;         // below it at the timeout the hold is suppressed
    float scoreLimit = 100.0f;
    float peakStrength = 0.0f;               // maxOnStrength x ActivationThreshold
    bool EnableHoldSuppression = true;
    bool EnableTapSuppression = true;
    bool touching = false;
    bool wasTouching = false;
    bool isAboveNoise = false;
    bool wasAboveNoise = false;
    bool holding = false;
    bool wasHolding = false;
    bool isHoldSuppressed = false;
    bool wasHoldSuppressed = false;
    bool tapCandidate = false;   // a touch ended this frame within the hold timeout
    bool tapDetected = false;    // ... and was not rejected
    bool isTapRejected = false;  // the tap rejection's verdict
    bool holdTimeExceeded = false;
    bool wasHoldTimeExceeded = false;
    uint32_t touchStartTime = 0;
    uint32_t touchEndTime = 0;
    uint32_t noiseStartTime = 0;
    uint32_t noiseEndTime = 0;
    uint32_t lastEventTime = 0;  // of the last tap or hold end
    float strengthRate = 0.0f;
    float strengthPerDuration = 0.0f;
    float durationRatio = 0.0f;
    int32_t activePixelCount = 0;
    float tapScore = 0.0f;
    PixelRegion activeRegion = PixelRegion::None;
    PixelRegion previousActiveRegion = PixelRegion::None;  // before the last change during a hold
    PixelRegion eventRegion = PixelRegion::None;           // at the last tap or hold end
    float maxOnStrength = 0.0f;  // strongest on element since the last Reset, floored at 0
    int32_t maxOnIndex = 0;
    std::vector<float> regionMax = std::vector<float>(4, 0.0f);  // per region, largest value - 75
    float regionSwitchFactor = 1.3f;
};

}  // namespace TolkaTouch

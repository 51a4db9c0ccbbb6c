#pragma once
// HandStats: the hand state machine. Turns each frame's pixels into whether the surface is
// touched, whether the touch is a hold (or a suppressed one) and whether a touch that just ended
// is a tap; keeps the running touch score, the edge times of the touch and the active region.

#include <array>
#include <cstdint>
#include <span>
#include <utility>

#include "algs/Pixel.h"
#include "algs/PixelBank.h"
#include "algs/SVM.h"
#include "algs/VirtualPixel.h"
#include "common/Reports.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

// The first two pixels in the region rule's order: largest maxNormalizedAboveNoise first, equal
// keys in ascending index order (a key that is not a number last). Found in one pass, without
// sorting a copy. Throws std::out_of_range("vector") for fewer than two pixels.
std::pair<const Pixel*, const Pixel*> twoFirstByMaxNormalizedAboveNoise(std::span<const Pixel> pixels);
// The same order over a bank's elements, as their positions in it.
std::pair<size_t, size_t> twoFirstByMaxNormalizedAboveNoise(const RealPixels& pixels);

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

    // One frame at the firmware time `time` (ms). The pixels are this frame's; they are only read.
    void updateHandState(const RealPixels& pixels, const VirtualPixels& virtualPixels, unsigned int time);

    void updateTouchScore(const RealPixels& pixels, const VirtualPixels& virtualPixels, unsigned int time);
    void decayTouchScore(unsigned int time);
    float updateTimeBiasFactor(unsigned int time);
    float fuzzify(float x, float x0, float x1, float y0, float y1);
    float fuzzifyAndClip(float x, float x0, float x1, float y0, float y1);

    // Active region and tap rejection.
    void updateRegionMax(const RealPixels& pixels);
    PixelRegion updateActiveRegion(const RealPixels& pixels, const VirtualPixels& virtualPixels, unsigned int time);
    PixelRegion changeActiveRegion(const RealPixels& pixels, int index);
    void updateTapRejection(const RealPixels& pixels, const VirtualPixels& virtualPixels);

    // The same steps on pixels given one by one: the surface's 15 and 23, else they throw
    // std::out_of_range("vector").
    void updateHandState(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                         unsigned int time);
    void updateTouchScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                          unsigned int time);
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
    std::array<float, 4> regionMax{};  // per region, largest value - 75
    float regionSwitchFactor = 1.3f;

    // The state flags, this frame's and the last's. Only the state machine sets them; what a frame
    // did is read from verdict(), and these accessors are for inspection.
    bool touching() const { return _touching; }
    bool wasTouching() const { return _wasTouching; }
    bool isAboveNoise() const { return _isAboveNoise; }
    bool wasAboveNoise() const { return _wasAboveNoise; }
    bool holding() const { return _holding; }
    bool wasHolding() const { return _wasHolding; }
    bool isHoldSuppressed() const { return _isHoldSuppressed; }
    bool wasHoldSuppressed() const { return _wasHoldSuppressed; }
    bool tapCandidate() const { return _tapCandidate; }
    bool tapDetected() const { return _tapDetected; }
    bool isTapRejected() const { return _isTapRejected; }
    bool holdTimeExceeded() const { return _holdTimeExceeded; }
    bool wasHoldTimeExceeded() const { return _wasHoldTimeExceeded; }

private:
    struct RowScan;
    // Tap rejection with the count of elements above noise that were never on during the touch.
    void updateTapRejection(int32_t nonActive);
    // onRecord: the strongest on element's strength so far.
    static RowScan scanRows(const RealPixels& pixels, const VirtualPixels& virtualPixels, float onRecord);

    bool _touching = false;
    bool _wasTouching = false;
    bool _isAboveNoise = false;
    bool _wasAboveNoise = false;
    bool _holding = false;
    bool _wasHolding = false;
    bool _isHoldSuppressed = false;
    bool _wasHoldSuppressed = false;
    bool _tapCandidate = false;   // a touch ended this frame within the hold timeout
    bool _tapDetected = false;    // ... and was not rejected
    bool _isTapRejected = false;  // the tap rejection's verdict
    bool _holdTimeExceeded = false;
    bool _wasHoldTimeExceeded = false;
};

}  // namespace TolkaTouch

#include "algs/HandStats.h"

#include "algs/Lanes.h"
#include "algs/MachineVariants.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <stdexcept>
#include <tuple>
#include <utility>

namespace TolkaTouch {

namespace {

constexpr float kE2 = 7.389056f;

size_t slot(PixelRegion region) { return static_cast<size_t>(region); }

// Order key of the region sort: largest maxNormalizedAboveNoise first. A key that is not a number
// (only with a divisor that is not one) sorts last, so the order stays a strict weak one.
float sortKey(float maxNormalizedAboveNoise) {
    return std::isnan(maxNormalizedAboveNoise) ? -std::numeric_limits<float>::infinity() : maxNormalizedAboveNoise;
}

// The region sort's order: largest key first, equal keys in ascending index order.
bool precedes(float keyA, int32_t indexA, float keyB, int32_t indexB) {
    if (sortKey(keyA) != sortKey(keyB)) return sortKey(keyA) > sortKey(keyB);
    return indexA < indexB;
}

}  // namespace

// The first two in one pass; an element equal to one already found never displaces it.
std::pair<const Pixel*, const Pixel*> twoFirstByMaxNormalizedAboveNoise(std::span<const Pixel> pixels) {
    if (pixels.size() < 2) throw std::out_of_range("vector");
    const auto before = [](const Pixel& a, const Pixel& b) {
        return precedes(a.maxNormalizedAboveNoise, a.index, b.maxNormalizedAboveNoise, b.index);
    };
    const Pixel* first = &pixels[0];
    const Pixel* second = &pixels[1];
    if (before(*second, *first)) std::swap(first, second);
    for (size_t i = 2; i < pixels.size(); ++i) {
        const Pixel* p = &pixels[i];
        if (before(*p, *first)) {
            second = first;
            first = p;
        } else if (before(*p, *second)) {
            second = p;
        }
    }
    return {first, second};
}

// Over whole vectors, in each machine variant: the first is the earliest of the elements with the
// largest key and, among those, the smallest index; the second the same among the others. That is
// what the one pass over the list finds, as equal elements never displace an earlier one.
TOLKA_MACHINE_VARIANTS
std::pair<size_t, size_t> twoFirstByMaxNormalizedAboveNoise(const RealPixels& pixels) {
    using Lanes::Floats;
    using Lanes::Ints;
    using Lanes::Mask;
    constexpr size_t kBlocks = RealPixels::kStored / Lanes::kWidth;
    constexpr float kLast = -std::numeric_limits<float>::infinity();
    const Ints lane{0, 1, 2, 3, 4, 5, 6, 7};

    std::array<Floats, kBlocks> key;
    std::array<Ints, kBlocks> index;
    std::array<Mask, kBlocks> candidate;
    for (size_t b = 0; b < kBlocks; ++b) {
        const Floats m = Lanes::load<Floats>(&pixels.maxNormalizedAboveNoise[b * Lanes::kWidth]);
        key[b] = Lanes::select(m != m, Lanes::broadcast(kLast), m);
        index[b] = Lanes::load<Ints>(&pixels.index[b * Lanes::kWidth]);
        candidate[b] = lane + static_cast<int32_t>(b * Lanes::kWidth) < static_cast<int32_t>(RealPixels::size());
    }
    const auto first = [&] {
        Floats best = Lanes::broadcast(kLast);
        for (size_t b = 0; b < kBlocks; ++b) best = Lanes::maxOf(best, Lanes::select(candidate[b], key[b], best));
        const Floats largest = Lanes::broadcast(Lanes::largest(best));
        Ints smallest = Lanes::broadcast(std::numeric_limits<int32_t>::max());
        std::array<Mask, kBlocks> atLargest;
        for (size_t b = 0; b < kBlocks; ++b) {
            atLargest[b] = candidate[b] & (key[b] == largest);
            smallest = Lanes::select(atLargest[b] & (index[b] < smallest), index[b], smallest);
        }
        const Ints smallestIndex = Lanes::broadcast(Lanes::smallest(smallest));
        for (size_t b = 0; b < kBlocks; ++b) {
            if (const uint32_t bits = Lanes::bits(atLargest[b] & (index[b] == smallestIndex)); bits != 0) {
                const size_t at = static_cast<size_t>(std::countr_zero(bits));
                candidate[b] &= lane != static_cast<int32_t>(at);
                return b * Lanes::kWidth + at;
            }
        }
        return size_t{0};
    };
    const size_t firstAt = first();
    return {firstAt, first()};
}

HandStats::HandStats() = default;

void HandStats::SetDecayParameters() { decayBase = kE2; }

void HandStats::Reset() {
    touchScore = 0.0f;
    peakStrength = 0.0f;
    maxOnStrength = 0.0f;
    maxOnIndex = 0;
}

void HandStats::updateHandState(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                                unsigned int time) {
    updateHandState(RealPixels::of(pixels), VirtualPixels::of(virtualPixels), time);
}

void HandStats::updateTouchScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                                 unsigned int time) {
    updateTouchScore(RealPixels::of(pixels), VirtualPixels::of(virtualPixels), time);
}

void HandStats::updateRegionMax(std::span<const Pixel> pixels) { updateRegionMax(RealPixels::of(pixels)); }

PixelRegion HandStats::updateActiveRegion(std::span<const Pixel> pixels,
                                          std::span<const VirtualPixel> virtualPixels, unsigned int time) {
    return updateActiveRegion(RealPixels::of(pixels), VirtualPixels::of(virtualPixels), time);
}

PixelRegion HandStats::changeActiveRegion(std::span<const Pixel> pixels, int index) {
    return changeActiveRegion(RealPixels::of(pixels), index);
}

void HandStats::updateTapRejection(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels) {
    updateTapRejection(RealPixels::of(pixels), VirtualPixels::of(virtualPixels));
}

// What the hand state reads first from both rows, real pixels then virtual ones.
struct HandStats::RowScan {
    int32_t strongestIndex = 0;  // this frame's strongest element, 0 when none is above 0
    bool newStrongestOn = false;  // an on element is stronger than the record given
    int32_t strongestOnIndex = 0;  // ... the first such, and its strength
    float strongestOnStrength = 0.0f;
    bool someOn = false;
    bool someAboveNoise = false;
    int32_t nonActive = 0;  // elements above noise that were never on during the touch
};

// With s = max(normalized, 0), this frame's strongest element is the first whose s is the largest
// s (when above 0), and the strongest on element the first on one whose s is the largest on s.
// That is what a scan keeping each strictly stronger element finds; not-a-number strengths never
// win either way. Padding lanes are never on and their s is never above 0. Eight lanes at a time,
// in each machine variant.
TOLKA_MACHINE_VARIANTS
HandStats::RowScan HandStats::scanRows(const RealPixels& pixels, const VirtualPixels& virtualPixels,
                                       float onRecord) {
    using Lanes::Floats;
    using Lanes::Ints;
    using Lanes::Mask;
    constexpr size_t kRealBlocks = RealPixels::kStored / Lanes::kWidth;
    constexpr size_t kBlocks = kRealBlocks + VirtualPixels::kStored / Lanes::kWidth;
    constexpr float kNone = -std::numeric_limits<float>::infinity();

    std::array<Floats, kBlocks> strength;
    std::array<Mask, kBlocks> on;
    Floats strongestLanes{};
    Floats strongestOnLanes = Lanes::broadcast(kNone);
    Ints someOn{};
    Ints someAboveNoise{};
    Ints nonActive{};
    const auto scan = [&](const auto& row, size_t first) {
        for (size_t b = 0; b < row.kStored / Lanes::kWidth; ++b) {
            const size_t at = b * Lanes::kWidth;
            const Ints isOn = Lanes::load<Ints>(&row.isOn[at]);
            strength[first + b] = Lanes::maxOf(Lanes::load<Floats>(&row.normalized[at]), Floats{});
            on[first + b] = isOn != 0;
            strongestLanes = Lanes::maxOf(strongestLanes, strength[first + b]);
            strongestOnLanes = Lanes::maxOf(strongestOnLanes, Lanes::select(on[first + b], strength[first + b],
                                                                           Lanes::broadcast(kNone)));
            someOn |= isOn;
            someAboveNoise |= Lanes::load<Ints>(&row.aboveNoise[at]);
            nonActive += Lanes::load<Ints>(&row.wasAboveNoise[at]) & (Lanes::load<Ints>(&row.wasOn[at]) ^ 1);
        }
    };
    scan(pixels, 0);
    scan(virtualPixels, kRealBlocks);

    // No lane holds a not-a-number, so the order in which the lanes are taken does not matter
    // (only a zero's sign might, and the search below finds +0 and -0 alike).
    RowScan found;
    const float strongest = Lanes::largest(strongestLanes);
    const float strongestOn = Lanes::largest(strongestOnLanes);
    found.someOn = Lanes::bits(someOn != 0) != 0;
    found.someAboveNoise = Lanes::bits(someAboveNoise != 0) != 0;
    for (size_t j = 0; j < Lanes::kWidth; ++j) found.nonActive += nonActive[j];

    // The first element whose s equals m (among the on ones only when onOnly): its index and its s.
    const auto firstAt = [&](float m, bool onOnly) -> std::pair<int32_t, float> {
        for (size_t b = 0; b < kBlocks; ++b) {
            const Mask at = (strength[b] == Lanes::broadcast(m)) & (onOnly ? on[b] : Mask{} - 1);
            if (const uint32_t bits = Lanes::bits(at); bits != 0) {
                const size_t lane = static_cast<size_t>(std::countr_zero(bits));
                const float s = strength[b][lane];
                if (b < kRealBlocks) return {pixels.index[b * Lanes::kWidth + lane], s};
                return {virtualPixels.index[(b - kRealBlocks) * Lanes::kWidth + lane], s};
            }
        }
        return {0, 0.0f};
    };
    if (strongest > 0.0f) found.strongestIndex = firstAt(strongest, false).first;
    if (strongestOn > onRecord) {
        found.newStrongestOn = true;
        std::tie(found.strongestOnIndex, found.strongestOnStrength) = firstAt(strongestOn, true);
    }
    return found;
}

void HandStats::updateHandState(const RealPixels& pixels, const VirtualPixels& virtualPixels, unsigned int time) {
    // 1. Scan the real pixels, then the virtual ones: the strongest on element since the last
    // Reset, whether anything is on or above noise, and this frame's strongest element.
    const RowScan scan = scanRows(pixels, virtualPixels, maxOnStrength);
    const int32_t strongestIndex = scan.strongestIndex;
    if (scan.newStrongestOn) {
        maxOnStrength = scan.strongestOnStrength;
        maxOnIndex = scan.strongestOnIndex;
    }
    const bool someOn = scan.someOn;
    const bool someAboveNoise = scan.someAboveNoise;

    // 2.
    _wasTouching = _touching;
    _touching = someOn;
    _wasAboveNoise = _isAboveNoise;
    _isAboveNoise = someAboveNoise;

    // 3. The region: followed by its strength while _holding (last frame's verdict), chosen afresh
    // otherwise.
    if (_touching) {
        activeRegion = _holding ? changeActiveRegion(pixels, strongestIndex)
                               : updateActiveRegion(pixels, virtualPixels, time);
    }

    // 4. Edge times.
    if (_isAboveNoise && !_wasAboveNoise) noiseStartTime = time;
    if (!_isAboveNoise && _wasAboveNoise) noiseEndTime = time;
    if (_touching && !_wasTouching) touchStartTime = time;
    if (!_touching && _wasTouching) touchEndTime = time;

    // 5.
    updateTouchScore(pixels, virtualPixels, time);
    updateTapRejection(scan.nonActive);

    // 6. Last frame's flags; the exceed flag from before this frame's decision decides the tap.
    _wasHolding = _holding;
    const bool holdTimeWasExceeded = _holdTimeExceeded;
    _wasHoldTimeExceeded = _holdTimeExceeded;
    _wasHoldSuppressed = _isHoldSuppressed;

    // 7. Hold decision.
    const uint32_t elapsed = time - touchStartTime;
    if (EnableHoldSuppression) {
        if (_touching && elapsed > HoldTimeoutMilliseconds) {
            _holdTimeExceeded = true;
            _holding = touchScore >= holdScoreThreshold || _wasHolding;
            _isHoldSuppressed = touchScore < holdScoreThreshold && !_wasHolding;
        } else {
            _holding = false;
            _isHoldSuppressed = false;
            _holdTimeExceeded = false;
        }
    } else {
        // The exceed flag is not kept up here, so every touch end counts as a tap, also after a hold.
        _holding = _touching && elapsed > HoldTimeoutMilliseconds;
    }
    const bool holdEnded = _wasHolding && !_holding;

    // 8. Tap decision.
    const bool touchEnded = !_touching && _wasTouching;
    if (EnableTapSuppression) {
        if (touchEnded) {
            if (holdTimeWasExceeded) {
                _tapCandidate = false;
                _tapDetected = false;
                _isTapRejected = false;
            } else {
                _tapCandidate = true;
                _tapDetected = !_isTapRejected;
            }
        } else {
            _tapCandidate = false;
            _tapDetected = false;
            _isTapRejected = false;
        }
    } else if (_touching) {
        _tapCandidate = false;
        _tapDetected = false;
    } else {
        _tapCandidate = _wasTouching && !holdTimeWasExceeded;
        _tapDetected = _tapCandidate;
    }

    // 9. A tap or the end of a hold is the last event, for the region-keeping rule.
    if (_tapDetected || holdEnded) {
        lastEventTime = time;
        eventRegion = activeRegion;
    }
}

FrameVerdict HandStats::verdict() const {
    FrameVerdict verdict;
    verdict.region = activeRegion;
    verdict.holdSuppressed = _isHoldSuppressed;
    if (_holdTimeExceeded) {
        verdict.holdClock = _wasHoldTimeExceeded ? HoldClock::Past : HoldClock::Reached;
    } else {
        verdict.holdClock = _wasHoldTimeExceeded ? HoldClock::Dropped : HoldClock::Before;
    }

    // The first that applies wins; the order is the order in which the event is chosen.
    Transition& t = verdict.transition;
    if (_touching && !_wasTouching) {
        t = Transition::TouchBegan;
    } else if (_holding && !_wasHolding) {
        t = _wasHoldSuppressed ? Transition::HoldRecovered : Transition::HoldBegan;
    } else if (_holding && previousActiveRegion != activeRegion) {
        t = Transition::HoldMoved;
    } else if (!_holding && _wasHolding) {
        t = Transition::HoldEnded;
    } else if (_tapDetected) {
        t = Transition::TapAccepted;
    } else if (!_touching && _wasTouching) {
        t = _tapCandidate ? Transition::TapRejected : Transition::TouchEnded;
    } else if (_holding) {
        t = Transition::Holding;
    } else if (_touching) {
        t = Transition::Touching;
    } else {
        t = Transition::Idle;
    }
    return verdict;
}

void HandStats::updateTouchScore(const RealPixels& pixels, const VirtualPixels& virtualPixels, unsigned int time) {
    // 1.
    svm.updateSVMScore(pixels, virtualPixels, ActivationThreshold);
    // 2. Noise that returns right after ending keeps part of the score.
    if (_isAboveNoise && !_wasAboveNoise && touchScore != 0.0f) decayTouchScore(time);
    // 3.
    touchScore += svm.score;
    // 4.
    if (touchScore > scoreLimit) {
        touchScore = scoreLimit;
    } else if (touchScore < -scoreLimit) {
        touchScore = -scoreLimit;
    }
}

void HandStats::decayTouchScore(unsigned int time) {
    // g is in milliseconds: the score survives only when noise returns within about 2 ms, and
    // time equal to noiseEndTime wraps to the largest g, which clears it.
    const uint32_t gap = time - noiseEndTime - 1u;
    const double g = static_cast<double>(gap);
    const double f = std::max((1.0 - std::exp(g) / (decayBase - 1)) * std::fabs(touchScore), 0.0);
    touchScore = std::copysign(static_cast<float>(f), touchScore);
}

float HandStats::updateTimeBiasFactor(unsigned int time) {
    const float d = static_cast<float>(static_cast<double>(time - lastEventTime) * 0.001);
    return fuzzifyAndClip(d, 0.3f, 1.0f, 0.65f, 1.0f);
}

float HandStats::fuzzify(float x, float x0, float x1, float y0, float y1) {
    const float t = (x - x0) / (x1 - x0);
    return std::fma(1.0f - t, y0, t * y1);
}

float HandStats::fuzzifyAndClip(float x, float x0, float x1, float y0, float y1) {
    if (x <= x0) return y0;
    if (x >= x1) return y1;
    return fuzzify(x, x0, x1, y0, y1);
}

void HandStats::updateRegionMax(const RealPixels& pixels) {
    std::fill(regionMax.begin(), regionMax.end(), 0.0f);
    for (size_t i = 0; i < pixels.size(); ++i) {
        const PixelRegion r = pixelRegionOfIndex(pixels.index[i]);
        const float excess = static_cast<float>(pixels.value[i]) - 75.0f;
        if (excess > 0.0f && r != PixelRegion::None) regionMax[slot(r)] = std::max(regionMax[slot(r)], excess);
    }
}

PixelRegion HandStats::updateActiveRegion(const RealPixels& pixels, const VirtualPixels& virtualPixels,
                                          unsigned int time) {
    // 1. The region of the strongest on element since the last Reset.
    PixelRegion r = pixelRegionOfIndex(maxOnIndex);

    // 2. The two pixels strongest above noise over this touch; equal keys keep index order.
    const auto [firstAt, secondAt] = twoFirstByMaxNormalizedAboveNoise(pixels);
    const Pixel first = pixels.pixel(firstAt);
    const Pixel second = pixels.pixel(secondAt);

    // 3. Soon after a tap or hold end the last event's region is favoured.
    const float b = updateTimeBiasFactor(time);
    const float noiseLevel = 75.0f / ActivationThreshold;

    // 4. Keep the last event's region when the touch straddles it.
    if (r != eventRegion && second.maxNormalizedAboveNoise > noiseLevel && first.getPixelRegion() == r &&
        second.maxNormalizedAboveNoise > first.maxNormalizedAboveNoise * b &&
        second.getPixelRegion() == eventRegion) {
        r = eventRegion;
    }

    // 5. "K" lies between the zones, so a touch centred on it is settled by its neighbours: towards
    // "M" through the group "KLM", towards "I" through the group "IJK".
    constexpr int32_t kPixelK = 10;
    constexpr int32_t kPixelM = 12;
    constexpr int32_t kPixelI = 8;
    constexpr size_t kGroupIJK = 18;
    constexpr size_t kGroupKLM = 19;
    if (maxOnIndex == kPixelK && second.maxNormalizedAboveNoise > noiseLevel && first.index == kPixelK) {
        const float centre = pixels.maxNormalizedAboveNoise[kPixelK];
        if (second.index == kPixelM) {
            const float f = eventRegion == PixelRegion::VolumeDown ? std::min(b, 0.7f) : 0.7f;
            if (virtualPixels.maxNormalizedAboveNoise[kGroupKLM] > f * centre) r = PixelRegion::VolumeDown;
        } else if (second.index == kPixelI) {
            const float f = eventRegion == PixelRegion::VolumeUp ? std::min(b, 0.7f) : 0.7f;
            if (virtualPixels.maxNormalizedAboveNoise[kGroupIJK] > f * centre) r = PixelRegion::VolumeUp;
        }
    }

    // 6.
    updateRegionMax(pixels);
    return r;
}

PixelRegion HandStats::changeActiveRegion(const RealPixels& pixels, int index) {
    // 1.
    previousActiveRegion = activeRegion;
    const PixelRegion c = activeRegion;
    const PixelRegion n = pixelRegionOfIndex(index);

    // 2.
    if (n == c) return c;
    if (c == PixelRegion::None || n == PixelRegion::None) return n;

    // 3. Last frame's maximum of the current region and ratio of the new one to it.
    const float m = regionMax[slot(c)];
    const float q = m > 0.0f ? regionMax[slot(n)] / m : 0.0f;

    // 4.
    updateRegionMax(pixels);
    const float mNow = regionMax[slot(c)];
    if (!(mNow > 0.0f)) return n;

    // 5. The more the current region has fallen, the more the new one must have grown.
    float k = 1.3f;
    if (m > 0.0f) {
        const float drop = std::max(m - mNow, 0.0f) / m;
        k = fuzzifyAndClip(drop, 0.2f, 0.5f, 1.3f, 5.0f);
    }
    regionSwitchFactor = k;

    // 6.
    return regionMax[slot(n)] / mNow >= k * q ? n : c;
}

void HandStats::updateTapRejection(const RealPixels& pixels, const VirtualPixels& virtualPixels) {
    // 4. Elements above noise that were never on during the touch, counted as a frame counts them.
    updateTapRejection(scanRows(pixels, virtualPixels, maxOnStrength).nonActive);
}

void HandStats::updateTapRejection(int32_t nonActive) {
    // 1.
    peakStrength = maxOnStrength * ActivationThreshold;

    // 2.
    const uint32_t span = std::min(touchEndTime - noiseStartTime, touchEndTime - lastEventTime);
    const uint32_t duration = touchEndTime - touchStartTime;

    // 3.
    strengthRate = 0.0f;
    strengthPerDuration = 0.0f;
    durationRatio = 0.0f;
    tapScore = 0.0f;
    activePixelCount = 0;
    if (span != 0) {
        strengthRate = peakStrength / static_cast<float>(span) - 0.51f;
        durationRatio = static_cast<float>(duration) / static_cast<float>(span) - 0.25f;
    }
    if (duration != 0) strengthPerDuration = peakStrength / static_cast<float>(duration) - 0.65f;

    // 5., 6. (4. is the count of elements given.)
    activePixelCount = 21 - nonActive;
    tapScore = 0.1886f * static_cast<float>(activePixelCount) + 0.2772f * strengthRate + 2.7205f * durationRatio -
               2.4116f;

    // 7. Deliberately unequal comparisons: <= for strengthPerDuration, < for the rest.
    _isTapRejected = strengthPerDuration <= 0.0f || strengthRate < 0.0f || nonActive > 21 || durationRatio < 0.0f ||
                    tapScore < 0.0f;
}

}  // namespace TolkaTouch

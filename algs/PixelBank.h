#pragma once
// PixelBank: a fixed row of pixels kept field by field (one array per Pixel field) rather than
// one Pixel after another, so that a frame's update of the whole row runs as a few vector
// operations. Element i is updated by the very steps of Pixel::updatePixelState.

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <stdexcept>

#include "algs/Lanes.h"
#include "algs/Pixel.h"
#include "common/Reports.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

template <size_t N>
class PixelBank {
public:
    // The rows are padded to whole vectors of eight lanes. A lane past the N elements is a pixel
    // with gain 0 that reads 0 every frame: never on, never above noise, and read by no one.
    static constexpr size_t kLanes = 8;
    static constexpr size_t kStored = (N + kLanes - 1) / kLanes * kLanes;
    template <typename T>
    using Row = std::array<T, kStored>;

    // Every element off and clear, with the given gains and indices.
    PixelBank(const std::array<float, N>& gains, const std::array<int32_t, N>& indices) {
        std::copy(gains.begin(), gains.end(), gain.begin());
        std::copy(indices.begin(), indices.end(), index.begin());
    }

    // The same fields as the given pixels; throws std::out_of_range("vector") unless there are N.
    template <typename P>
    static PixelBank of(std::span<const P> pixels);

    static constexpr size_t size() { return N; }

    // One frame for every element: raw[i] as Pixel::updatePixelState(raw[i], divisor) on element i.
    // The padding lanes of raw must read 0.
    void update(const Row<int32_t>& raw, float divisor);
    void update(std::span<const int16_t, N> raw, float divisor);
    // A frame's readings (16-bit readings, or any 32-bit values) as a row, padding lanes 0. Read a
    // whole vector at a time: the row is written as the update reads it, which a copy element by
    // element would hold up.
    template <typename T>
    static Row<int32_t> rowOf(std::span<const T, N> raw);
    // Pixel::resetGlobalStats on every element.
    void resetGlobalStats();

    // Element i as a Pixel value, and a Pixel's fields into element i.
    Pixel pixel(size_t i) const;
    void set(size_t i, const Pixel& pixel);

    // Element i's fields at [i], i below N.
    alignas(32) Row<int32_t> value{};
    alignas(32) Row<float> gain{};
    alignas(32) Row<float> normalized{};
    alignas(32) Row<float> peak{};
    alignas(32) Row<float> valley{};
    // The flags, 0 or 1: 32 bits wide so that they sit in vector lanes beside the floats.
    alignas(32) Row<int32_t> isOn{};
    alignas(32) Row<int32_t> aboveNoise{};
    alignas(32) Row<int32_t> wasAboveNoise{};
    alignas(32) Row<int32_t> wasOn{};
    alignas(32) Row<float> maxNormalizedAboveNoise{};
    alignas(32) Row<int32_t> index{};

private:
    void updateRows(const Row<int32_t>& raw, float divisor);
};

template <size_t N>
template <typename P>
PixelBank<N> PixelBank<N>::of(std::span<const P> pixels) {
    if (pixels.size() != N) throw std::out_of_range("vector");
    PixelBank bank({}, {});
    for (size_t i = 0; i < N; ++i) bank.set(i, pixels[i]);
    return bank;
}

template <size_t N>
template <typename T>
typename PixelBank<N>::template Row<int32_t> PixelBank<N>::rowOf(std::span<const T, N> raw) {
    static_assert(N >= Lanes::kWidth && kLanes == Lanes::kWidth);
    Row<int32_t> row;
    size_t b = 0;
    for (; b + kLanes <= N; b += kLanes) Lanes::store(&row[b], Lanes::widen(&raw[b]));
    if (b < N) {
        // The last eight readings, moved down to their lanes, with zeros after them.
        Lanes::store(&row[b], Lanes::shiftDown<kStored - N>(Lanes::widen(&raw[N - kLanes])));
    }
    return row;
}

template <size_t N>
void PixelBank<N>::resetGlobalStats() {
    wasAboveNoise.fill(0);
    wasOn.fill(0);
    maxNormalizedAboveNoise.fill(0.0f);
}

template <size_t N>
Pixel PixelBank<N>::pixel(size_t i) const {
    Pixel p(index[i], gain[i]);
    p.value = value[i];
    p.normalized = normalized[i];
    p.peak = peak[i];
    p.valley = valley[i];
    p.isOn = isOn[i] != 0;
    p.aboveNoise = aboveNoise[i] != 0;
    p.wasAboveNoise = wasAboveNoise[i] != 0;
    p.wasOn = wasOn[i] != 0;
    p.maxNormalizedAboveNoise = maxNormalizedAboveNoise[i];
    return p;
}

template <size_t N>
void PixelBank<N>::set(size_t i, const Pixel& p) {
    value[i] = p.value;
    gain[i] = p.gain;
    normalized[i] = p.normalized;
    peak[i] = p.peak;
    valley[i] = p.valley;
    isOn[i] = p.isOn;
    aboveNoise[i] = p.aboveNoise;
    wasAboveNoise[i] = p.wasAboveNoise;
    wasOn[i] = p.wasOn;
    maxNormalizedAboveNoise[i] = p.maxNormalizedAboveNoise;
    index[i] = p.index;
}

// The 15 real pixels A..O, and the 23 virtual pixels in group order. Their update is compiled
// once, in the library, in each machine variant.
using RealPixels = PixelBank<kPixelCount>;
using VirtualPixels = PixelBank<kVirtualPixelCount>;

}  // namespace TolkaTouch

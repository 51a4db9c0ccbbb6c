#include "algs/PixelBank.h"

#include "algs/MachineVariants.h"

namespace TolkaTouch {

template <size_t N>
[[gnu::always_inline]] inline void PixelBank<N>::updateRows(const Row<int32_t>& raw, float divisor) {
    using Lanes::Floats;
    using Lanes::Ints;
    using Lanes::load;
    using Lanes::store;
    const Floats d = Lanes::broadcast(divisor);
    for (size_t b = 0; b < kStored; b += kLanes) {
        Ints v = load<Ints>(&value[b]);
        Floats n = load<Floats>(&normalized[b]);
        Floats p = load<Floats>(&peak[b]);
        Floats lo = load<Floats>(&valley[b]);
        Ints on = load<Ints>(&isOn[b]);
        Ints above = load<Ints>(&aboveNoise[b]);
        Ints wasAbove = load<Ints>(&wasAboveNoise[b]);
        Ints wasOnNow = load<Ints>(&wasOn[b]);
        Floats maxAbove = load<Floats>(&maxNormalizedAboveNoise[b]);
        PixelDetail::updateElement<Floats, Ints, Ints>(load<Ints>(&raw[b]), d, load<Floats>(&gain[b]), v, n, p, lo,
                                                       on, above, wasAbove, wasOnNow, maxAbove);
        store(&value[b], v);
        store(&normalized[b], n);
        store(&peak[b], p);
        store(&valley[b], lo);
        store(&isOn[b], on);
        store(&aboveNoise[b], above);
        store(&wasAboveNoise[b], wasAbove);
        store(&wasOn[b], wasOnNow);
        store(&maxNormalizedAboveNoise[b], maxAbove);
    }
}

// In each machine variant: the wider ones do eight lanes per instruction. The readings' row is
// built in the same variant as the update that reads it, so that it is written and read a whole
// vector at a time.
template <size_t N>
TOLKA_MACHINE_VARIANTS void PixelBank<N>::update(std::span<const int16_t, N> raw, float divisor) {
    updateRows(rowOf(raw), divisor);
}

template <size_t N>
TOLKA_MACHINE_VARIANTS void PixelBank<N>::update(const Row<int32_t>& raw, float divisor) {
    updateRows(raw, divisor);
}

template class PixelBank<kPixelCount>;
template class PixelBank<kVirtualPixelCount>;

}  // namespace TolkaTouch

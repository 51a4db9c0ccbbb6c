#include "algs/PixelBank.h"

#include "algs/MachineVariants.h"

namespace TolkaTouch {

// In two machine variants: the wide one does eight lanes per instruction.
template <size_t N>
TOLKA_MACHINE_VARIANTS void PixelBank<N>::update(std::span<const int16_t, N> raw, float divisor) {
    // The padding lanes read 0, so that the loop runs over whole vectors.
    Row<int16_t> padded{};
    std::copy(raw.begin(), raw.end(), padded.begin());
    for (size_t i = 0; i < kStored; ++i) {
        PixelDetail::updateElement(padded[i], divisor, gain[i], value[i], normalized[i], peak[i], valley[i], isOn[i],
                                   aboveNoise[i], wasAboveNoise[i], wasOn[i], maxNormalizedAboveNoise[i]);
    }
}

template class PixelBank<kPixelCount>;
template class PixelBank<kVirtualPixelCount>;

}  // namespace TolkaTouch

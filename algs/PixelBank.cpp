#include "algs/PixelBank.h"

namespace TolkaTouch {

// The update in two machine variants picked once at load time: one for processors with wide
// vectors, one for the rest. Both give the same bits: every step is a single correctly rounded IEEE
// operation or a select, whichever instructions carry it out. The thread sanitizer's runtime is not
// up yet when the loader picks a variant, and its instrumented picker crashes there, so that build
// has only the default variant.
#if defined(__x86_64__) && defined(__GNUC__) && !defined(__clang__) && !defined(__SANITIZE_THREAD__)
#define TOLKA_UPDATE_VARIANTS __attribute__((target_clones("arch=x86-64-v3", "default")))
#else
#define TOLKA_UPDATE_VARIANTS
#endif

template <size_t N>
TOLKA_UPDATE_VARIANTS void PixelBank<N>::update(const std::array<int16_t, N>& raw, float divisor) {
    // The padding lanes read 0, so that the loop runs over whole vectors.
    Row<int16_t> padded{};
    std::copy(raw.begin(), raw.end(), padded.begin());
    for (size_t i = 0; i < kStored; ++i) {
        PixelDetail::updateElement(padded[i], divisor, gain[i], value[i], normalized[i], peak[i], valley[i], isOn[i],
                                   aboveNoise[i], wasAboveNoise[i], wasOn[i], maxNormalizedAboveNoise[i]);
    }
}

#undef TOLKA_UPDATE_VARIANTS

template class PixelBank<kPixelCount>;
template class PixelBank<kVirtualPixelCount>;

}  // namespace TolkaTouch

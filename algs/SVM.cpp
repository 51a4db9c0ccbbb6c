#include "algs/SVM.h"

#include "algs/MachineVariants.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <stdexcept>

namespace TolkaTouch {

namespace {

struct Rank {
    float mean;
    float scale;
    float weight;
};

// Rank 0 is the strongest element. The weights change sign irregularly; they are trained values.
constexpr std::array<Rank, SVM::kRankCount> kRanks{{
    {559.2485f, 319.631f, 2.0791f},  {458.1396f, 264.2479f, 0.577f},   {409.6764f, 238.355f, -0.0003f},
    {376.5288f, 222.3886f, 1.7971f}, {339.7854f, 211.1872f, 0.8896f},  {302.5308f, 206.0873f, -0.194f},
    {281.1469f, 198.0056f, -1.7877f}, {258.9062f, 189.2092f, 1.9933f}, {234.2004f, 182.5528f, 0.5968f},
    {215.7817f, 177.034f, -0.6801f}, {199.7768f, 170.0103f, -0.1372f}, {184.8617f, 163.5788f, -0.4558f},
    {172.0251f, 157.3571f, 0.3444f}, {160.0365f, 151.1289f, 0.1195f},  {148.0888f, 144.6578f, 0.2427f},
    {135.208f, 138.2757f, 0.2738f},  {124.4527f, 131.4855f, -0.7458f}, {114.4343f, 124.7151f, -0.2226f},
    {104.0568f, 116.673f, -0.95f},   {93.4508f, 107.0524f, -0.238f},   {83.6343f, 98.8414f, 0.0785f},
    {74.3161f, 91.5114f, -1.6108f},  {65.3713f, 84.5376f, -0.4774f},   {57.6177f, 78.8144f, 0.3914f},
    {50.8842f, 72.6408f, -0.0379f},  {43.4918f, 64.3881f, -0.5014f},   {37.2454f, 58.6809f, 0.2391f},
    {31.5491f, 51.8691f, 0.5287f},   {26.5578f, 45.1187f, -0.3405f},   {22.2556f, 39.4927f, 0.2821f},
    {18.6728f, 35.9957f, 0.8225f},   {15.4697f, 32.8257f, -0.5142f},   {12.7815f, 29.4461f, -1.1009f},
    {10.1925f, 25.6704f, 0.3262f},   {7.6475f, 20.1275f, -1.7422f},    {5.3422f, 15.8161f, 0.4487f},
    {3.7211f, 11.7617f, 0.0877f},    {2.1581f, 10.0508f, -0.2101f},
}};

constexpr size_t kRankCount = SVM::kRankCount;

// The score's arithmetic in two machine variants: every step is a single correctly rounded IEEE
// operation (subtract, divide, fused multiply-add), whichever instructions carry it out.
// One fused multiply-add per rank, strongest first, onto the bias-free score.
TOLKA_MACHINE_VARIANTS
float scoreOfRanked(const int32_t* ranked, const float* means, const float* scales, const float* weights) {
    std::array<float, kRankCount> standardized;
    for (size_t i = 0; i < kRankCount; ++i) standardized[i] = (static_cast<float>(ranked[i]) - means[i]) / scales[i];
    float score = 0.0f;
    for (size_t i = 0; i < kRankCount; ++i) score = std::fma(standardized[i], weights[i], score);
    return score;
}

// Largest first; equal values are interchangeable, so any correct sort gives the same list. In a
// touch most elements read 0: the values above 0 go to the front and those below 0 to the back
// without branches, the zeros fill the middle, and only the few on either side are sorted. No
// allocation: std::sort works in place.
void sortDescending(std::array<int32_t, kRankCount>& values, size_t count) {
    std::array<int32_t, kRankCount> split{};
    size_t positive = 0;
    size_t negative = 0;
    for (size_t i = 0; i < count; ++i) {
        const int32_t v = values[i];
        split[positive] = v;
        positive += v > 0;
    }
    for (size_t i = 0; i < count; ++i) {
        const int32_t v = values[i];
        split[count - 1 - negative] = v;
        negative += v < 0;
    }
    // The slots between hold 0 or a stale copy; they are all zeros.
    std::fill(split.begin() + static_cast<std::ptrdiff_t>(positive),
              split.begin() + static_cast<std::ptrdiff_t>(count - negative), 0);
    std::copy_n(split.begin(), count, values.begin());
    std::sort(values.begin(), values.begin() + static_cast<std::ptrdiff_t>(positive), std::greater<int32_t>());
    std::sort(values.begin() + static_cast<std::ptrdiff_t>(count - negative),
              values.begin() + static_cast<std::ptrdiff_t>(count), std::greater<int32_t>());
}

// Whether a frame is scored: something converts above the gate, or two values are at noise or
// above. Counted, not branched on, so that the loop becomes vector code.
bool worthScoring(const int32_t* values, size_t count, float gate) {
    int32_t aboveGate = 0;
    int32_t aboveNoise = 0;
    for (size_t i = 0; i < count; ++i) {
        aboveGate |= static_cast<int32_t>(static_cast<float>(values[i]) > gate);
        aboveNoise += static_cast<int32_t>(values[i] >= Pixel::kNoiseLevel + 1);
    }
    return aboveGate != 0 || aboveNoise >= 2;
}

}  // namespace

SVM::SVM() {
    for (size_t i = 0; i < kRankCount; ++i) {
        means[i] = kRanks[i].mean;
        scales[i] = kRanks[i].scale;
        weights[i] = kRanks[i].weight;
    }
}

void SVM::updateSVMScore(std::span<const Pixel> pixels, std::span<const VirtualPixel> virtualPixels,
                         float gate) {
    // 1.
    score = 0.0f;

    // 2. One list of every element's value: real pixels, then virtual ones. Only the values enter
    // the score, so the list holds just those.
    const size_t count = pixels.size() + virtualPixels.size();
    if (count < 2 || count > kRankCount) throw std::out_of_range("vector");
    std::array<int32_t, kRankCount> values;
    size_t n = 0;
    for (const Pixel& p : pixels) values[n++] = p.value;
    for (const VirtualPixel& p : virtualPixels) values[n++] = p.value;
    scoreValues(values, count, gate);
}

void SVM::updateSVMScore(const RealPixels& pixels, const VirtualPixels& virtualPixels, float gate) {
    static_assert(RealPixels::size() + VirtualPixels::size() == kRankCount);
    score = 0.0f;
    std::array<int32_t, kRankCount> values;
    std::copy_n(pixels.value.begin(), RealPixels::size(), values.begin());
    std::copy_n(virtualPixels.value.begin(), VirtualPixels::size(), values.begin() + RealPixels::size());
    scoreValues(values, kRankCount, gate);
}

void SVM::scoreValues(std::array<int32_t, kRankCount>& values, size_t count, float gate) {
    // 4. Gate first, so a quiet frame is not scored (the bias is not added either) and skips the
    // sort. Rank 0 above the gate means some value converts above it (the conversion keeps
    // order); rank 1 at noise or above means two values are.
    if (!worthScoring(values.data(), count, gate)) return;

    if (count == kRankCount) {
        // 3., 5. The surface's 38 elements.
        // 3. Largest first.
        sortDescending(values, kRankCount);
        score = scoreOfRanked(values.data(), means.data(), scales.data(), weights.data());
    } else {
        // Fewer elements than ranks: the first `count` ranks, in the same order of operations.
        sortDescending(values, count);
        for (size_t i = 0; i < count; ++i) {
            score = std::fma((static_cast<float>(values[i]) - means[i]) / scales[i], weights[i], score);
        }
    }

    // 6.
    score += bias;
}

}  // namespace TolkaTouch

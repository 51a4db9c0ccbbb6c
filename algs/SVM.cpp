#include "algs/SVM.h"

#include "algs/Lanes.h"
#include "algs/MachineVariants.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
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

}  // namespace

// The elements of one frame as five vectors of eight lanes: two from `first`, three from `rest`.
// `valid` marks the lanes that hold an element, `count` of them; every other lane reads 0.
struct SVM::ElementLanes {
    static constexpr size_t kFirst = 16;
    static constexpr size_t kLanes = 40;
    const int32_t* first;
    const int32_t* rest;
    uint64_t valid = 0;
    size_t count = 0;
};

namespace {

uint64_t laneBits(const Lanes::Mask& m, size_t block) { return uint64_t{Lanes::bits(m)} << (block * Lanes::kWidth); }

// Largest first, in place; few values, so an insertion sort.
void sortDescending(int32_t* values, size_t count) {
    for (size_t i = 1; i < count; ++i) {
        const int32_t v = values[i];
        size_t j = i;
        for (; j > 0 && values[j - 1] < v; --j) values[j] = values[j - 1];
        values[j] = v;
    }
}

}  // namespace

// In each machine variant: every step of the score is a single correctly rounded IEEE operation
// (convert, subtract, divide, fused multiply-add), whichever instructions carry it out.
TOLKA_MACHINE_VARIANTS
void SVM::scoreLanes(const ElementLanes& elements, float gate) {
    using Lanes::Floats;
    using Lanes::Ints;
    using Lanes::Mask;
    constexpr size_t kBlocks = ElementLanes::kLanes / Lanes::kWidth;

    // 4. Gate first, so a quiet frame is not scored (the bias is not added either) and skips the
    // sort: something converts above the gate, or two values are at noise or above.
    const Floats gates = Lanes::broadcast(gate);
    const Ints laneBit{1, 2, 4, 8, 16, 32, 64, 128};
    alignas(32) std::array<int32_t, ElementLanes::kLanes> value;
    std::array<Ints, kBlocks> blocks;
    std::array<Mask, kBlocks> valid;
    Mask aboveGate{};
    Ints aboveNoise{};
    for (size_t b = 0; b < kBlocks; ++b) {
        const size_t at = b * Lanes::kWidth;
        blocks[b] = Lanes::load<Ints>(at < ElementLanes::kFirst ? elements.first + at
                                                                : elements.rest + (at - ElementLanes::kFirst));
        Lanes::store(&value[at], blocks[b]);
        valid[b] = (laneBit & static_cast<int32_t>((elements.valid >> at) & 0xff)) != 0;
        aboveGate |= valid[b] & (Lanes::toFloats(blocks[b]) > gates);
        aboveNoise -= valid[b] & (blocks[b] > Lanes::broadcast(Pixel::kNoiseLevel));  // a mask lane is -1
    }
    int32_t aboveNoiseCount = 0;
    for (size_t j = 0; j < Lanes::kWidth; ++j) aboveNoiseCount += aboveNoise[j];
    if (Lanes::bits(aboveGate) == 0 && aboveNoiseCount < 2) return;

    // Which lanes are above 0 and which below: in a touch most elements read 0, and only the
    // values either side of it need sorting.
    uint64_t positive = 0;
    uint64_t negative = 0;
    for (size_t b = 0; b < kBlocks; ++b) {
        positive |= laneBits(valid[b] & (blocks[b] > 0), b);
        negative |= laneBits(valid[b] & (blocks[b] < 0), b);
    }

    // 3. Largest first: the values above 0, the zeros, the values below 0.
    const size_t count = elements.count;
    std::array<int32_t, ElementLanes::kLanes> above;
    std::array<int32_t, ElementLanes::kLanes> below;
    size_t aboveCount = 0;
    size_t belowCount = 0;
    for (uint64_t m = positive; m != 0; m &= m - 1) above[aboveCount++] = value[std::countr_zero(m)];
    for (uint64_t m = negative; m != 0; m &= m - 1) below[belowCount++] = value[std::countr_zero(m)];
    sortDescending(above.data(), aboveCount);
    sortDescending(below.data(), belowCount);

    // 5. Each rank standardised: a zero's rank all at once, then the ranks of the values either
    // side of 0.
    alignas(32) std::array<float, ElementLanes::kLanes> standardized;
    size_t r = 0;
    for (; r + Lanes::kWidth <= count; r += Lanes::kWidth) {
        Lanes::store(&standardized[r], (Floats{} - Lanes::load<Floats>(&means[r])) / Lanes::load<Floats>(&scales[r]));
    }
    for (; r < count; ++r) standardized[r] = (0.0f - means[r]) / scales[r];
    const auto standardize = [&](size_t rank, int32_t v) {
        standardized[rank] = (static_cast<float>(v) - means[rank]) / scales[rank];
    };
    for (size_t i = 0; i < aboveCount; ++i) standardize(i, above[i]);
    for (size_t i = 0; i < belowCount; ++i) standardize(count - belowCount + i, below[i]);

    // One fused multiply-add per rank, strongest first, onto the bias-free score; 6. the bias.
    float sum = 0.0f;
    for (size_t i = 0; i < count; ++i) sum = std::fma(standardized[i], weights[i], sum);
    score = sum + bias;
}

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
    alignas(32) std::array<int32_t, ElementLanes::kLanes> values{};
    size_t n = 0;
    for (const Pixel& p : pixels) values[n++] = p.value;
    for (const VirtualPixel& p : virtualPixels) values[n++] = p.value;
    scoreLanes({values.data(), values.data() + ElementLanes::kFirst, (uint64_t{1} << count) - 1, count}, gate);
}

void SVM::updateSVMScore(const RealPixels& pixels, const VirtualPixels& virtualPixels, float gate) {
    // The two rows side by side, each with its padding lanes, which read 0 and are no element.
    static_assert(RealPixels::kStored == ElementLanes::kFirst &&
                  RealPixels::kStored + VirtualPixels::kStored == ElementLanes::kLanes);
    score = 0.0f;
    constexpr uint64_t kReal = (uint64_t{1} << RealPixels::size()) - 1;
    constexpr uint64_t kVirtual = ((uint64_t{1} << VirtualPixels::size()) - 1) << RealPixels::kStored;
    scoreLanes({pixels.value.data(), virtualPixels.value.data(), kReal | kVirtual, kRankCount}, gate);
}

}  // namespace TolkaTouch

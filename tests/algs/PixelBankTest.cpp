#include "algs/PixelBank.h"

#include <gtest/gtest.h>

#include <bit>
#include <cstdint>
#include <limits>
#include <vector>

namespace TolkaTouch {
namespace {

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInf = std::numeric_limits<float>::infinity();

// Floats compared by their bits: a not-a-number must come out as the very same one.
uint32_t bits(float x) { return std::bit_cast<uint32_t>(x); }

void expectSameElement(const Pixel& expected, const Pixel& actual, size_t i, size_t frame) {
    EXPECT_EQ(actual.value, expected.value) << "element " << i << ", frame " << frame;
    EXPECT_EQ(bits(actual.normalized), bits(expected.normalized)) << "element " << i << ", frame " << frame;
    EXPECT_EQ(bits(actual.peak), bits(expected.peak)) << "element " << i << ", frame " << frame;
    EXPECT_EQ(bits(actual.valley), bits(expected.valley)) << "element " << i << ", frame " << frame;
    EXPECT_EQ(actual.isOn, expected.isOn) << "element " << i << ", frame " << frame;
    EXPECT_EQ(actual.aboveNoise, expected.aboveNoise) << "element " << i << ", frame " << frame;
    EXPECT_EQ(actual.wasAboveNoise, expected.wasAboveNoise) << "element " << i << ", frame " << frame;
    EXPECT_EQ(actual.wasOn, expected.wasOn) << "element " << i << ", frame " << frame;
    EXPECT_EQ(bits(actual.maxNormalizedAboveNoise), bits(expected.maxNormalizedAboveNoise))
        << "element " << i << ", frame " << frame;
    EXPECT_EQ(actual.index, expected.index) << "element " << i << ", frame " << frame;
}

// Runs the frames through a bank and through one Pixel per element, and compares every field
// after every frame.
template <size_t N>
void expectBankFollowsPixels(const std::array<float, N>& gains, const std::vector<std::array<int16_t, N>>& frames,
                             const std::vector<float>& divisors) {
    std::array<int32_t, N> indices;
    std::vector<Pixel> pixels;
    for (size_t i = 0; i < N; ++i) {
        indices[i] = static_cast<int32_t>(i);
        pixels.emplace_back(static_cast<int>(i), gains[i]);
    }
    PixelBank<N> bank(gains, indices);
    for (size_t f = 0; f < frames.size(); ++f) {
        const float divisor = divisors[f % divisors.size()];
        bank.update(frames[f], divisor);
        for (size_t i = 0; i < N; ++i) {
            pixels[i].updatePixelState(frames[f][i], divisor);
            expectSameElement(pixels[i], bank.pixel(i), i, f);
        }
    }
}

// Readings that walk every element through off, on, peak, valley and noise, with extremes.
template <size_t N>
std::vector<std::array<int16_t, N>> trickyFrames() {
    const int16_t pattern[] = {0,   76,    75,    -50,  600, 600,  359, 361,   1200, 100,
                               -76, 32767, -32768, 200, 201, 2000, 0,   -1000, 120,  600};
    std::vector<std::array<int16_t, N>> frames;
    for (size_t f = 0; f < 40; ++f) {
        std::array<int16_t, N> frame;
        for (size_t i = 0; i < N; ++i) frame[i] = pattern[(f + 3 * i) % std::size(pattern)];
        frames.push_back(frame);
    }
    return frames;
}

TEST(PixelBankTest, RealRowFollowsFifteenPixelsUpdatedOneByOneOnTrickyReadings) {
    std::array<float, kPixelCount> gains;
    for (size_t i = 0; i < kPixelCount; ++i) gains[i] = 1.0f + 0.0937f * static_cast<float>(i);
    expectBankFollowsPixels<kPixelCount>(gains, trickyFrames<kPixelCount>(), {200.0f, 200.0f, 37.5f, 1e-3f, 9000.0f});
}

TEST(PixelBankTest, RowFollowsPixelsWithADivisorThatIsNotANumberZeroOrNegative) {
    std::array<float, kPixelCount> gains;
    gains.fill(1.9219f);
    expectBankFollowsPixels<kPixelCount>(gains, trickyFrames<kPixelCount>(),
                                         {200.0f, kNaN, 200.0f, 0.0f, 200.0f, -0.0f, -200.0f, kInf, 200.0f});
}

TEST(PixelBankTest, RowFollowsPixelsWithGainsThatSaturateTheScaledValue) {
    // Not-a-number, infinite, huge and negative gains: the truncation saturates or gives 0.
    std::array<float, kVirtualPixelCount> gains{kNaN, kInf, -kInf, 1e30f, -1e30f, 65537.0f, 65536.0f, -65536.0f,
                                                0.0f, -0.0f, -1.0f, 0.4f, 0.6667f, 0.4444f, 1e-30f};
    for (size_t i = 15; i < kVirtualPixelCount; ++i) gains[i] = 0.5714f;
    expectBankFollowsPixels<kVirtualPixelCount>(gains, trickyFrames<kVirtualPixelCount>(), {200.0f});
}

TEST(PixelBankTest, VirtualRowFollowsPixelsOnGroupSumsWrappedToSixteenBits) {
    // Sums past 32767 arrive cut to 16 bits: large negative readings next to large positive ones.
    std::array<float, kVirtualPixelCount> gains;
    gains.fill(0.6667f);
    std::vector<std::array<int16_t, kVirtualPixelCount>> frames;
    for (int32_t sum : {45741, 32767, 32768, 65535, 65536, 98000, 0, 45741, 40000, 300}) {
        std::array<int16_t, kVirtualPixelCount> frame;
        for (size_t i = 0; i < kVirtualPixelCount; ++i) {
            frame[i] = static_cast<int16_t>(sum + static_cast<int32_t>(i) * 1000);
        }
        frames.push_back(frame);
    }
    expectBankFollowsPixels<kVirtualPixelCount>(gains, frames, {200.0f});
}

TEST(PixelBankTest, EqualReadingsGiveEqualElements) {
    std::array<float, kPixelCount> gains;
    gains.fill(1.5f);
    std::vector<std::array<int16_t, kPixelCount>> frames(3);
    frames[0].fill(400);
    frames[1].fill(241);  // exactly 60 % of the peak after scaling: turns off
    frames[2].fill(400);
    expectBankFollowsPixels<kPixelCount>(gains, frames, {200.0f});
}

TEST(PixelBankTest, PixelsGoInAndComeOutFieldByField) {
    std::vector<Pixel> pixels;
    for (int i = 0; i < 15; ++i) pixels.emplace_back(14 - i, 0.5f * static_cast<float>(i));
    pixels[3].updatePixelState(900, 200.0f);
    pixels[7].updatePixelState(100, kNaN);
    const RealPixels bank = RealPixels::of(std::span<const Pixel>(pixels));
    for (size_t i = 0; i < 15; ++i) expectSameElement(pixels[i], bank.pixel(i), i, 0);
}

TEST(PixelBankTest, OtherThanFifteenPixelsFailWithTheMessageVector) {
    const std::vector<Pixel> pixels(14, Pixel(0, 1.0f));
    try {
        RealPixels::of(std::span<const Pixel>(pixels));
        FAIL() << "no failure";
    } catch (const std::out_of_range& e) {
        EXPECT_STREQ(e.what(), "vector");
    }
}

TEST(PixelBankTest, ResetGlobalStatsClearsOnlyThePerTouchFieldsOfEveryElement) {
    std::array<float, kPixelCount> gains;
    gains.fill(1.0f);
    RealPixels bank(gains, {});
    std::array<int16_t, kPixelCount> raw;
    raw.fill(900);
    bank.update(raw, 200.0f);
    bank.resetGlobalStats();
    for (size_t i = 0; i < kPixelCount; ++i) {
        const Pixel p = bank.pixel(i);
        EXPECT_FALSE(p.wasOn);
        EXPECT_FALSE(p.wasAboveNoise);
        EXPECT_EQ(p.maxNormalizedAboveNoise, 0.0f);
        EXPECT_TRUE(p.isOn);
        EXPECT_EQ(p.peak, 4.5f);
    }
}

}  // namespace
}  // namespace TolkaTouch

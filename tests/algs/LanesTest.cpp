#include "algs/Lanes.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <limits>

namespace TolkaTouch {
namespace {

using Lanes::Floats;
using Lanes::Ints;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

std::array<float, 8> lanesOf(Floats v) {
    std::array<float, 8> out;
    Lanes::store(out.data(), v);
    return out;
}

std::array<int32_t, 8> lanesOf(Ints v) {
    std::array<int32_t, 8> out;
    Lanes::store(out.data(), v);
    return out;
}

TEST(LanesTest, ABroadcastNegativeZeroKeepsItsSignInEveryLane) {
    for (const float lane : lanesOf(Lanes::broadcast(-0.0f))) EXPECT_EQ(std::bit_cast<uint32_t>(lane), 0x80000000u);
}

TEST(LanesTest, MaxOfAndMinOfPutNotANumberWhereStdMaxAndStdMinPutIt) {
    const std::array<float, 8> a{kNaN, 1.0f, kNaN, -0.0f, 0.0f, 2.0f, -3.0f, 5.0f};
    const std::array<float, 8> b{1.0f, kNaN, kNaN, 0.0f, -0.0f, 2.0f, -4.0f, 6.0f};
    const auto largest = lanesOf(Lanes::maxOf(Lanes::load<Floats>(a.data()), Lanes::load<Floats>(b.data())));
    const auto smallest = lanesOf(Lanes::minOf(Lanes::load<Floats>(a.data()), Lanes::load<Floats>(b.data())));
    for (size_t j = 0; j < 8; ++j) {
        EXPECT_EQ(std::bit_cast<uint32_t>(largest[j]), std::bit_cast<uint32_t>(std::max(a[j], b[j]))) << j;
        EXPECT_EQ(std::bit_cast<uint32_t>(smallest[j]), std::bit_cast<uint32_t>(std::min(a[j], b[j]))) << j;
    }
}

TEST(LanesTest, ALookUpTakesEachLaneFromTheSixteenOfBothValues) {
    const Ints low{0, 10, 20, 30, 40, 50, 60, 70};
    const Ints high{80, 90, 100, 110, 120, 130, 140, 150};
    EXPECT_EQ(lanesOf(Lanes::lookUp(low, high, Ints{15, 0, 7, 8, 3, 3, 12, 1})),
              (std::array<int32_t, 8>{150, 0, 70, 80, 30, 30, 120, 10}));
}

TEST(LanesTest, WideningFifteenReadingsLeavesTheSixteenthLaneZero) {
    const std::array<int16_t, 15> readings{-1, 2, -32768, 32767, 5, 6, 7, 8, 9, -10, 11, 12, 13, 14, -15};
    const Ints last = Lanes::shiftDown<1>(Lanes::widen(&readings[7]));
    EXPECT_EQ(lanesOf(Lanes::widen(&readings[0])), (std::array<int32_t, 8>{-1, 2, -32768, 32767, 5, 6, 7, 8}));
    EXPECT_EQ(lanesOf(last), (std::array<int32_t, 8>{9, -10, 11, 12, 13, 14, -15, 0}));
}

TEST(LanesTest, BitsNumberTheLanesFromTheFirst) {
    const Ints v{5, -1, 0, 7, -8, 0, 0, 9};
    EXPECT_EQ(Lanes::bits(v < 0), 0b00010010u);
    EXPECT_EQ(Lanes::bits(v > 0), 0b10001001u);
    EXPECT_EQ(Lanes::bits(v == 100), 0u);
}

TEST(LanesTest, LargestAndSmallestFindTheExtremeLaneWhereverItIs) {
    for (size_t at = 0; at < 8; ++at) {
        std::array<float, 8> f{1, 2, 3, 4, 5, 6, 7, 8};
        std::array<int32_t, 8> i{10, 20, 30, 40, 50, 60, 70, 80};
        f[at] = 100.0f;
        i[at] = -5;
        EXPECT_EQ(Lanes::largest(Lanes::load<Floats>(f.data())), 100.0f) << at;
        EXPECT_EQ(Lanes::smallest(Lanes::load<Ints>(i.data())), -5) << at;
    }
}

TEST(LanesTest, FlagsAreOneWhereTheMaskHoldsAndConversionsTruncateTowardZero) {
    EXPECT_EQ(lanesOf(Lanes::flag(Ints{1, 2, 3, 4, 5, 6, 7, 8} > 4)), (std::array<int32_t, 8>{0, 0, 0, 0, 1, 1, 1, 1}));
    EXPECT_EQ(lanesOf(Lanes::toInts(Floats{1.9f, -1.9f, 0.5f, -0.5f, 2147483520.0f, -2147483648.0f, 3.0f, -3.0f})),
              (std::array<int32_t, 8>{1, -1, 0, 0, 2147483520, INT32_MIN, 3, -3}));
}

}  // namespace
}  // namespace TolkaTouch

#include "algs/VirtualImage.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <stdexcept>
#include <vector>
#include <string>

namespace TolkaTouch {
namespace {

std::vector<Pixel> realPixels() {
    std::vector<Pixel> pixels;
    for (int i = 0; i < 15; ++i) pixels.emplace_back(i, 1.0f);
    return pixels;
}

// Sets the scaled values of the pixels named by letters (gain 1, so value = raw).
void setValues(std::vector<Pixel>& pixels, std::initializer_list<std::pair<char, int>> values) {
    for (Pixel& pixel : pixels) pixel.updatePixelState(0, 200.0f);
    for (auto [letter, value] : values) pixels[static_cast<size_t>(letter - 'A')].updatePixelState(value, 200.0f);
}

TEST(VirtualImageTest, HasTheTwentyThreeGroupsInOrderWithTheirFactors) {
    const VirtualImage image;
    const std::vector<std::string> groups = {"ABE", "ABF", "ADEF", "AEGJ", "BCEF", "BFHJ", "CDE", "CDF",
                                             "CELN", "DFLO", "EFK", "EJK", "EKL", "FJK", "FKL", "GHI",
                                             "GIJ", "HIJ", "IJK", "KLM", "LMN", "LMO", "MNO"};
    const std::vector<float> factors = {0.6667f, 0.4444f, 0.6667f, 0.5714f, 0.6667f, 0.5714f, 0.6667f, 0.4651f,
                                        0.6667f, 0.6667f, 0.4f,    0.4f,    0.4f,    0.4f,    0.4f,    0.5714f,
                                        0.4f,    0.4f,    0.4f,    0.4f,    0.4444f, 0.5714f, 0.6667f};
    EXPECT_EQ(image.groups, groups);
    EXPECT_EQ(image.normalizationFactors, factors);
    EXPECT_EQ(image.values, std::vector<int32_t>(23, 0));
}

TEST(VirtualImageTest, StrongestStartsAsTheIndexOfEachGroupsFirstLetter) {
    const VirtualImage image;
    const std::vector<int32_t> expected = {0, 0, 0, 0, 1, 1, 2, 2, 2, 3, 4, 4, 4, 5, 5, 6, 6, 7, 8, 10, 11, 11, 12};
    EXPECT_EQ(image.strongest, expected);
}

TEST(VirtualImageTest, GroupSumsAddOnlyMembersAboveNoise) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'A', 100}, {'B', 75}, {'E', 76}});
    image.updateValues(pixels);
    EXPECT_EQ(image.values[0], 176);  // ABE: B at 75 adds nothing
    EXPECT_EQ(image.values[1], 100);  // ABF
    EXPECT_EQ(image.values[2], 176);  // ADEF
    EXPECT_EQ(image.values[10], 76);  // EFK
    EXPECT_EQ(image.values[22], 0);   // MNO
}

TEST(VirtualImageTest, GroupWithAllMembersAtOrBelowNoiseYieldsZeroAndKeepsItsStrongestIndex) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'L', 100}, {'M', 300}});
    image.updateValues(pixels);
    ASSERT_EQ(image.strongest[19], 12);  // KLM: M

    setValues(pixels, {{'K', 75}, {'L', 75}, {'M', 10}});
    image.updateValues(pixels);
    EXPECT_EQ(image.values[19], 0);
    EXPECT_EQ(image.strongest[19], 12);
}

TEST(VirtualImageTest, ValuesAreRecomputedEachFrame) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'G', 500}});
    image.updateValues(pixels);
    ASSERT_EQ(image.values[15], 500);
    setValues(pixels, {});
    image.updateValues(pixels);
    EXPECT_EQ(image.values[15], 0);
}

TEST(VirtualImageTest, OnEqualValuesThePixelAlreadyRecordedWins) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'H', 200}, {'I', 300}});
    image.updateValues(pixels);
    ASSERT_EQ(image.strongest[15], 8);  // GHI: I

    setValues(pixels, {{'G', 300}, {'H', 300}, {'I', 300}});
    image.updateValues(pixels);
    EXPECT_EQ(image.strongest[15], 8);
}

TEST(VirtualImageTest, AmongNewcomersWithEqualValuesTheEarlierLetterWins) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'H', 300}, {'I', 300}});
    image.updateValues(pixels);
    EXPECT_EQ(image.strongest[15], 7);  // GHI: G reads 0, H beats it first, I only equals H
}

TEST(VirtualImageTest, StrongestComparesAgainstThisFramesValueOfTheRecordedPixel) {
    VirtualImage image;
    auto pixels = realPixels();
    setValues(pixels, {{'C', 900}});
    image.updateValues(pixels);
    ASSERT_EQ(image.strongest[6], 2);  // CDE: C

    setValues(pixels, {{'C', 100}, {'D', 200}});
    image.updateValues(pixels);
    EXPECT_EQ(image.strongest[6], 3);
}

// The group rule step by step, as a plain loop over the letters.
void updateByTheLetters(std::vector<int32_t>& values, std::vector<int32_t>& strongest,
                        const std::vector<std::string>& groups, const std::vector<int32_t>& pixels) {
    std::fill(values.begin(), values.end(), 0);
    for (size_t g = 0; g < groups.size(); ++g) {
        for (const char letter : groups[g]) {
            const size_t i = static_cast<size_t>(letter - 'A');
            if (pixels[i] >= 76) {
                values[g] += pixels[i];
                if (pixels[i] > pixels[static_cast<size_t>(strongest[g])]) strongest[g] = static_cast<int32_t>(i);
            }
        }
    }
}

TEST(VirtualImageTest, AllGroupsAtOnceGiveTheSumsStrongestMembersAndNarrowedReadingsOfTheLetterByLetterRule) {
    const int32_t readings[] = {0, 75, 76, 77, 300, 300, 32767, 40000, -5, 1000, 76, 200, 200, 90};
    std::mt19937 random(11);
    VirtualImage image;
    std::vector<int32_t> values(23, 0);
    std::vector<int32_t> strongest = image.strongest;
    for (int frame = 0; frame < 3000; ++frame) {
        RealPixels::Row<int32_t> row{};
        std::vector<int32_t> pixels(15);
        for (size_t i = 0; i < 15; ++i) row[i] = pixels[i] = readings[random() % std::size(readings)];
        VirtualPixels::Row<int32_t> narrowed;
        image.updateValues(row, narrowed);
        updateByTheLetters(values, strongest, image.groups, pixels);
        ASSERT_EQ(image.values, values) << "frame " << frame;
        ASSERT_EQ(image.strongest, strongest) << "frame " << frame;
        for (size_t g = 0; g < 23; ++g) ASSERT_EQ(narrowed[g], static_cast<int16_t>(values[g])) << "frame " << frame;
        ASSERT_EQ(narrowed[23], 0);
    }
}

TEST(VirtualImageTest, AGroupSumAbove32767ReachesItsVirtualPixelWrappedToSixteenBits) {
    VirtualImage image;
    RealPixels::Row<int32_t> row{};
    row[6] = 20000;  // G
    row[7] = 20000;  // H
    VirtualPixels::Row<int32_t> narrowed;
    image.updateValues(row, narrowed);
    EXPECT_EQ(image.values[15], 40000);           // GHI
    EXPECT_EQ(narrowed[15], 40000 - 65536);       // read as a signed 16-bit number
}

TEST(VirtualImageTest, TooFewPixelsRaiseTheStandardOutOfRangeFailure) {
    VirtualImage image;
    std::vector<Pixel> pixels;
    for (int i = 0; i < 3; ++i) pixels.emplace_back(i, 1.0f);
    EXPECT_THROW(image.updateValues(pixels), std::out_of_range);
}

// The message a failed range test carries, or "" when nothing was thrown.
std::string outOfRangeMessage(VirtualImage& image, const std::vector<Pixel>& pixels) {
    try {
        image.updateValues(pixels);
    } catch (const std::out_of_range& failure) {
        return failure.what();
    }
    return "";
}

TEST(VirtualImageTest, ALetterOutsideThePixelsFailsWithTheMessageVector) {
    VirtualImage image;
    std::vector<Pixel> pixels;
    for (int i = 0; i < 3; ++i) pixels.emplace_back(i, 1.0f);
    EXPECT_EQ(outOfRangeMessage(image, pixels), "vector");
}

TEST(VirtualImageTest, AGroupIndexOutsideTheValuesFailsWithTheMessageVector) {
    VirtualImage image;
    std::vector<Pixel> pixels = realPixels();
    setValues(pixels, {{'M', 300}, {'N', 300}, {'O', 300}});
    image.values.pop_back();  // no room for "MNO"
    EXPECT_EQ(outOfRangeMessage(image, pixels), "vector");
}

TEST(VirtualImageTest, AStrongestIndexOutsideThePixelsFailsWithTheMessageVector) {
    VirtualImage image;
    std::vector<Pixel> pixels = realPixels();
    setValues(pixels, {{'A', 300}});
    image.strongest[0] = 40;
    EXPECT_EQ(outOfRangeMessage(image, pixels), "vector");
}

}  // namespace
}  // namespace TolkaTouch

#include "algs/SVM.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>

namespace TolkaTouch {
namespace {

struct Frame {
    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
};

// 15 real and 23 virtual elements, all at value 0.
Frame quietFrame() {
    Frame frame;
    for (int i = 0; i < 15; ++i) {
        frame.pixels.emplace_back(i, 1.0f);
        frame.pixels.back().value = 0;
    }
    for (int i = 0; i < 23; ++i) {
        frame.virtualPixels.emplace_back(65, 1.0f, "X");
        frame.virtualPixels.back().value = 0;
    }
    return frame;
}

TEST(SVMTest, ConstructorFillsTheThirtyEightRankTable) {
    const SVM svm;
    ASSERT_EQ(svm.means.size(), 38u);
    ASSERT_EQ(svm.scales.size(), 38u);
    ASSERT_EQ(svm.weights.size(), 38u);
    EXPECT_EQ(svm.score, 0.0f);
    EXPECT_EQ(svm.bias, 2.0083f);
    EXPECT_EQ(svm.means[0], 559.2485f);
    EXPECT_EQ(svm.scales[0], 319.631f);
    EXPECT_EQ(svm.weights[0], 2.0791f);
    EXPECT_EQ(svm.weights[2], -0.0003f);
    EXPECT_EQ(svm.means[21], 74.3161f);
    EXPECT_EQ(svm.scales[21], 91.5114f);
    EXPECT_EQ(svm.weights[21], -1.6108f);
    EXPECT_EQ(svm.means[37], 2.1581f);
    EXPECT_EQ(svm.scales[37], 10.0508f);
    EXPECT_EQ(svm.weights[37], -0.2101f);
}

TEST(SVMTest, QuietFrameScoresExactlyZeroNotTheBias) {
    SVM svm;
    Frame frame = quietFrame();
    frame.pixels[3].value = 200;
    frame.virtualPixels[5].value = 75;
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);
    EXPECT_EQ(svm.getSVMScore(), 0.0f);
}

TEST(SVMTest, FrameWithStrongestValueTwoHundredAndOneIsScoredEvenIfAllElseIsNoise) {
    SVM svm;
    Frame frame = quietFrame();
    frame.pixels[3].value = 201;
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);

    float expected = 0.0f;
    for (size_t i = 0; i < 38; ++i) {
        const float v = i == 0 ? 201.0f : 0.0f;
        expected = std::fma((v - svm.means[i]) / svm.scales[i], svm.weights[i], expected);
    }
    expected += 2.0083f;
    EXPECT_EQ(svm.getSVMScore(), expected);
    EXPECT_NE(svm.getSVMScore(), 0.0f);
}

TEST(SVMTest, SecondValueAboveNoiseAloneAlsoPassesTheGate) {
    SVM svm;
    Frame frame = quietFrame();
    frame.pixels[0].value = 150;
    frame.virtualPixels[0].value = 76;
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);
    EXPECT_NE(svm.getSVMScore(), 0.0f);
}

TEST(SVMTest, FrameWithAllThirtyEightValuesEqualToTheirMeansScoresTheBias) {
    SVM svm;
    Frame frame = quietFrame();
    // Integer means (the trained ones are fractional) so that every value can equal its rank's mean.
    for (size_t i = 0; i < 38; ++i) svm.means[i] = static_cast<float>(1000 - 10 * static_cast<int>(i));
    for (size_t i = 0; i < 15; ++i) frame.pixels[i].value = 1000 - 10 * static_cast<int>(i);
    for (size_t i = 0; i < 23; ++i) frame.virtualPixels[i].value = 1000 - 10 * static_cast<int>(15 + i);
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);
    EXPECT_EQ(svm.getSVMScore(), 2.0083f);
}

TEST(SVMTest, ValuesAreRankedLargestFirstWhateverTheirOrderInTheLists) {
    SVM inOrder;
    SVM shuffled;
    Frame a = quietFrame();
    Frame b = quietFrame();
    a.pixels[0].value = 900;
    a.pixels[1].value = 500;
    a.virtualPixels[0].value = 300;
    b.virtualPixels[22].value = 900;
    b.pixels[14].value = 300;
    b.virtualPixels[7].value = 500;
    inOrder.updateSVMScore(a.pixels, a.virtualPixels, 200.0f);
    shuffled.updateSVMScore(b.pixels, b.virtualPixels, 200.0f);
    EXPECT_EQ(inOrder.getSVMScore(), shuffled.getSVMScore());
}

TEST(SVMTest, EachRankIsOneFusedMultiplyAdd) {
    SVM svm;
    Frame frame = quietFrame();
    for (size_t i = 0; i < 15; ++i) frame.pixels[i].value = 700 - 13 * static_cast<int>(i);
    for (size_t i = 0; i < 23; ++i) frame.virtualPixels[i].value = 480 - 17 * static_cast<int>(i);
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);

    std::vector<int> values;
    for (const auto& p : frame.pixels) values.push_back(p.value);
    for (const auto& p : frame.virtualPixels) values.push_back(p.value);
    std::sort(values.begin(), values.end(), std::greater<>());
    float expected = 0.0f;
    for (size_t i = 0; i < 38; ++i) {
        expected = std::fma((static_cast<float>(values[i]) - svm.means[i]) / svm.scales[i], svm.weights[i], expected);
    }
    EXPECT_EQ(svm.getSVMScore(), expected + 2.0083f);
}

// The score a full sort of the values gives, step by step as the classifier defines it.
float scoreBySortingEverything(const SVM& svm, std::vector<int> values) {
    std::sort(values.begin(), values.end(), std::greater<>());
    float expected = 0.0f;
    for (size_t i = 0; i < values.size(); ++i) {
        expected = std::fma((static_cast<float>(values[i]) - svm.means[i]) / svm.scales[i], svm.weights[i], expected);
    }
    return expected + svm.bias;
}

TEST(SVMTest, RealAndVirtualRowsScoreAsTheListsOfPixelsDoWithNegativeZeroAndTiedValues) {
    // Negative, zero, tied and large values mixed, in several arrangements.
    const int pattern[] = {0, -96, 700, 0, 76, 75, 700, -32768, 32767, 0, 1, -1, 76, 400, 0, 0, 2147483647, -5};
    for (size_t shift = 0; shift < 6; ++shift) {
        SVM byLists;
        SVM byRows;
        Frame frame = quietFrame();
        std::array<float, kPixelCount> gains{};
        std::array<float, kVirtualPixelCount> virtualGains{};
        RealPixels rows(gains, {});
        VirtualPixels virtualRows(virtualGains, {});
        std::vector<int> values;
        for (size_t i = 0; i < 38; ++i) {
            const int v = pattern[(i * 5 + shift) % std::size(pattern)];
            values.push_back(v);
            if (i < 15) {
                frame.pixels[i].value = v;
                rows.value[i] = v;
            } else {
                frame.virtualPixels[i - 15].value = v;
                virtualRows.value[i - 15] = v;
            }
        }
        byLists.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);
        byRows.updateSVMScore(rows, virtualRows, 200.0f);
        EXPECT_EQ(byLists.getSVMScore(), scoreBySortingEverything(byLists, values)) << shift;
        EXPECT_EQ(byRows.getSVMScore(), byLists.getSVMScore()) << shift;
    }
}

TEST(SVMTest, FewerElementsThanRanksScoreTheirOwnRanksOnly) {
    SVM svm;
    Frame frame = quietFrame();
    frame.pixels.erase(frame.pixels.begin() + 4, frame.pixels.end());
    frame.virtualPixels.erase(frame.virtualPixels.begin() + 3, frame.virtualPixels.end());
    const std::vector<int> values = {0, 300, -20, 300, 90, 0, 1200};
    for (size_t i = 0; i < 4; ++i) frame.pixels[i].value = values[i];
    for (size_t i = 0; i < 3; ++i) frame.virtualPixels[i].value = values[4 + i];
    svm.updateSVMScore(frame.pixels, frame.virtualPixels, 200.0f);
    EXPECT_EQ(svm.getSVMScore(), scoreBySortingEverything(svm, values));
}

}  // namespace
}  // namespace TolkaTouch

#include "algs/VirtualImage.h"

#include "algs/MachineVariants.h"
#include "tolkatouch/FrameSnapshot.h"

#include <algorithm>
#include <array>
#include <stdexcept>

namespace TolkaTouch {

namespace {

struct GroupDefinition {
    const char* letters;
    float factor;
};

// The factors are deliberately uneven ("CDF" beside "ABF"); they are tuned values.
constexpr std::array<GroupDefinition, 23> kGroups{{
    {"ABE", 0.6667f},  {"ABF", 0.4444f},  {"ADEF", 0.6667f}, {"AEGJ", 0.5714f}, {"BCEF", 0.6667f},
    {"BFHJ", 0.5714f}, {"CDE", 0.6667f},  {"CDF", 0.4651f},  {"CELN", 0.6667f}, {"DFLO", 0.6667f},
    {"EFK", 0.4f},     {"EJK", 0.4f},     {"EKL", 0.4f},     {"FJK", 0.4f},     {"FKL", 0.4f},
    {"GHI", 0.5714f},  {"GIJ", 0.4f},     {"HIJ", 0.4f},     {"IJK", 0.4f},     {"KLM", 0.4f},
    {"LMN", 0.4444f},  {"LMO", 0.5714f},  {"MNO", 0.6667f},
}};

// Each group's member pixels as indices, looked up once from its letters. A group of three has
// a fourth member kNoMember, whose value always reads 0: below noise, it never counts.
constexpr uint8_t kNoMember = kPixelCount;

struct GroupMembers {
    std::array<uint8_t, 4> index{kNoMember, kNoMember, kNoMember, kNoMember};
    size_t count = 0;
};

constexpr std::array<GroupMembers, kGroups.size()> membersOf() {
    std::array<GroupMembers, kGroups.size()> all{};
    for (size_t g = 0; g < kGroups.size(); ++g) {
        for (const char* letter = kGroups[g].letters; *letter != '\0'; ++letter) {
            all[g].index[all[g].count++] = static_cast<uint8_t>(*letter - 'A');
        }
    }
    return all;
}

constexpr auto kMembers = membersOf();

// Slot k of every group as one row, eight groups to a vector; the row's padding group has no
// members.
constexpr size_t kGroupLanes = VirtualPixels::kStored;
constexpr std::array<std::array<int32_t, kGroupLanes>, 4> memberLanesOf() {
    std::array<std::array<int32_t, kGroupLanes>, 4> lanes{};
    for (size_t k = 0; k < 4; ++k) {
        for (size_t g = 0; g < kGroupLanes; ++g) lanes[k][g] = g < kGroups.size() ? kMembers[g].index[k] : kNoMember;
    }
    return lanes;
}

alignas(32) constexpr auto kMemberLanes = memberLanesOf();

// Element i with a range test: an index outside the vector raises the standard out-of-range
// failure with the message "vector".
template <typename T>
T& checkedAt(std::vector<T>& vector, size_t i) {
    if (i >= vector.size()) throw std::out_of_range("vector");
    return vector[i];
}

template <typename T>
const T& checkedAt(std::span<const T> vector, size_t i) {
    if (i >= vector.size()) throw std::out_of_range("vector");
    return vector[i];
}

}  // namespace

const char* virtualPixelName(size_t i) { return kGroups.at(i).letters; }

VirtualImage::VirtualImage() {
    values.assign(kGroups.size(), 0);
    groups.reserve(kGroups.size());
    strongest.reserve(kGroups.size());
    normalizationFactors.reserve(kGroups.size());
    for (const auto& group : kGroups) {
        groups.emplace_back(group.letters);
        strongest.push_back(group.letters[0] - 'A');
        normalizationFactors.push_back(group.factor);
    }
}

void VirtualImage::updateValues(std::span<const Pixel> pixels) {
    // Only the values are read.
    std::vector<int32_t> pixelValues(pixels.size());
    for (size_t i = 0; i < pixels.size(); ++i) pixelValues[i] = pixels[i].value;
    updateValues(pixelValues);
}

void VirtualImage::updateValues(std::span<const int32_t> pixels) {
    if (pixels.size() == kPixelCount) {
        VirtualPixels::Row<int32_t> readings;
        updateValues(RealPixels::rowOf(pixels.first<kPixelCount>()), readings);
        return;
    }
    updateValuesOneByOne(pixels);
}

void VirtualImage::updateValuesOneByOne(std::span<const int32_t> pixels) {
    // 1. Sums start afresh; the strongest members carry over from the last frame.
    std::fill(values.begin(), values.end(), 0);

    // 2. Members above noise add their value; a member takes over as strongest only when strictly
    // stronger than this frame's value of the one recorded, so ties keep the old one and, among
    // newcomers, the earlier letter.
    for (size_t g = 0; g < groups.size(); ++g) {
        for (const char letter : groups[g]) {
            const size_t i = static_cast<size_t>(letter - 'A');
            const int32_t v = checkedAt(pixels, i);
            if (v >= Pixel::kNoiseLevel + 1) {
                checkedAt(values, g) += v;
                int32_t& strongestIndex = checkedAt(strongest, g);
                if (v > checkedAt(pixels, static_cast<size_t>(strongestIndex))) {
                    strongestIndex = static_cast<int32_t>(i);
                }
            }
        }
    }
}

TOLKA_MACHINE_VARIANTS
void VirtualImage::updateValues(const RealPixels::Row<int32_t>& pixels, VirtualPixels::Row<int32_t>& readings) {
    using Lanes::Ints;
    using Lanes::Mask;
    constexpr size_t kBlocks = VirtualPixels::kStored / Lanes::kWidth;
    static_assert(RealPixels::kStored == 2 * Lanes::kWidth && VirtualPixels::size() == kGroups.size());

    // The surface's own groups, each strongest member recorded a pixel of the surface: all 23
    // groups at once, eight to a vector.
    std::array<Ints, kBlocks> recorded{};
    bool fast =
        groups.size() == kGroups.size() && values.size() == kGroups.size() && strongest.size() == kGroups.size();
    if (fast) {
        const auto row =
            VirtualPixels::rowOf(std::span<const int32_t, kVirtualPixelCount>(strongest.data(), kVirtualPixelCount));
        Mask outside{};
        for (size_t b = 0; b < kBlocks; ++b) {
            recorded[b] = Lanes::load<Ints>(&row[b * Lanes::kWidth]);
            outside |= (recorded[b] < 0) | (recorded[b] >= static_cast<int32_t>(kPixelCount));
        }
        fast = Lanes::bits(outside) == 0;
    }
    if (!fast) {
        // Anything else takes the steps one member at a time, with their range tests.
        updateValuesOneByOne(std::span(pixels).first<kPixelCount>());
        readings.fill(0);
        for (size_t g = 0; g < std::min(values.size(), kGroups.size()); ++g) {
            readings[g] = static_cast<int16_t>(values[g]);
        }
        return;
    }

    // The pixel values as a table of 16: slot 15 is "no member", a padding lane that reads 0.
    const Ints low = Lanes::load<Ints>(&pixels[0]);
    const Ints high = Lanes::load<Ints>(&pixels[Lanes::kWidth]);
    const auto valueAt = [&](Ints index) { return Lanes::lookUp(low, high, index); };
    const Ints noise = Lanes::broadcast(Pixel::kNoiseLevel);

    std::array<Ints, kBlocks> sum{};
    for (size_t b = 0; b < kBlocks; ++b) {
        Ints strongestIndex = recorded[b];
        Ints strongestValue = valueAt(strongestIndex);
        // Each group's four slots in letter order, the same steps for each.
        for (size_t slot = 0; slot < 4; ++slot) {
            const Ints member = Lanes::load<Ints>(&kMemberLanes[slot][b * Lanes::kWidth]);
            const Ints v = valueAt(member);
            const Mask aboveNoise = v > noise;
            const Mask takesOver = aboveNoise & (v > strongestValue);
            sum[b] += v & aboveNoise;
            strongestIndex = Lanes::select(takesOver, member, strongestIndex);
            strongestValue = Lanes::select(takesOver, v, strongestValue);
        }
        recorded[b] = strongestIndex;
        Lanes::store(&readings[b * Lanes::kWidth], (sum[b] << 16) >> 16);
    }

    // Back into the lists of 23: the last block's seven groups go in with the one before them.
    static_assert(kBlocks == 3 && kVirtualPixelCount == 23);
    constexpr Ints kLastSeven{7, 8, 9, 10, 11, 12, 13, 14};
    Lanes::store(&values[0], sum[0]);
    Lanes::store(&values[8], sum[1]);
    Lanes::store(&values[15], Lanes::lookUp(sum[1], sum[2], kLastSeven));
    Lanes::store(&strongest[0], recorded[0]);
    Lanes::store(&strongest[8], recorded[1]);
    Lanes::store(&strongest[15], Lanes::lookUp(recorded[1], recorded[2], kLastSeven));
}

}  // namespace TolkaTouch

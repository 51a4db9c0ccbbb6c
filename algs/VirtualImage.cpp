#include "algs/VirtualImage.h"

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
    // 1. Sums start afresh; the strongest members carry over from the last frame.
    std::fill(values.begin(), values.end(), 0);

    // The surface's own 15 pixels and the fixed groups: the members were looked up once, and the
    // pixels' values are read into one row with a slot for "no member" first.
    if (pixels.size() == kPixelCount && groups.size() == kGroups.size() && values.size() == kGroups.size() &&
        strongest.size() == kGroups.size()) {
        std::array<int32_t, kPixelCount + 1> pixelValue;
        std::copy(pixels.begin(), pixels.end(), pixelValue.begin());
        pixelValue[kNoMember] = 0;
        for (size_t g = 0; g < kGroups.size(); ++g) {
            const GroupMembers& members = kMembers[g];
            uint32_t strongestIndex = static_cast<uint32_t>(strongest[g]);
            if (strongestIndex >= kPixelCount) {
                // Only a member above noise compares against the recorded strongest.
                for (const uint8_t i : members.index) {
                    if (pixelValue[i] >= Pixel::kNoiseLevel + 1) throw std::out_of_range("vector");
                }
                values[g] = 0;
                continue;
            }
            // Every group has four slots: the same steps for each, choosing instead of branching.
            int32_t sum = 0;
            for (const uint8_t i : members.index) {
                const int32_t v = pixelValue[i];
                const bool aboveNoise = v >= Pixel::kNoiseLevel + 1;
                sum += aboveNoise ? v : 0;
                strongestIndex = aboveNoise && v > pixelValue[strongestIndex] ? i : strongestIndex;
            }
            values[g] = sum;
            strongest[g] = static_cast<int32_t>(strongestIndex);
        }
        return;
    }

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

}  // namespace TolkaTouch

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

// Element i with a range test: an index outside the vector raises the standard out-of-range
// failure with the message "vector".
template <typename T>
T& checkedAt(std::vector<T>& vector, size_t i) {
    if (i >= vector.size()) throw std::out_of_range("vector");
    return vector[i];
}

template <typename T>
const T& checkedAt(const std::vector<T>& vector, size_t i) {
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

void VirtualImage::updateValues(const std::vector<Pixel>& pixels) {
    // 1. Sums start afresh; the strongest members carry over from the last frame.
    std::fill(values.begin(), values.end(), 0);

    // 2. Members above noise add their value; a member takes over as strongest only when strictly
    // stronger than this frame's value of the one recorded, so ties keep the old one and, among
    // newcomers, the earlier letter.
    for (size_t g = 0; g < groups.size(); ++g) {
        for (const char letter : groups[g]) {
            const size_t i = static_cast<size_t>(letter - 'A');
            const int32_t v = checkedAt(pixels, i).value;
            if (v >= Pixel::kNoiseLevel + 1) {
                checkedAt(values, g) += v;
                int32_t& strongestIndex = checkedAt(strongest, g);
                if (v > checkedAt(pixels, static_cast<size_t>(strongestIndex)).value) {
                    strongestIndex = static_cast<int32_t>(i);
                }
            }
        }
    }
}

}  // namespace TolkaTouch

#include "tools/workbench/Counts.h"

#include <algorithm>

namespace TolkaTouch::Workbench {

void Counts::add(const Counts& other) {
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        for (size_t z = 0; z < kZoneCount; ++z) {
            classes[k][z].truePositives += other.classes[k][z].truePositives;
            classes[k][z].falsePositives += other.classes[k][z].falsePositives;
            classes[k][z].falseNegatives += other.classes[k][z].falseNegatives;
        }
        // Kept sorted, so that a sum is the same whatever order its parts were added in.
        const auto middle = static_cast<std::ptrdiff_t>(latencyUs[k].size());
        latencyUs[k].insert(latencyUs[k].end(), other.latencyUs[k].begin(), other.latencyUs[k].end());
        std::inplace_merge(latencyUs[k].begin(), latencyUs[k].begin() + middle, latencyUs[k].end());
    }
    for (size_t i = 0; i < kIntendedCount; ++i) {
        for (size_t r = 0; r < kRecognisedCount; ++r) confusion[i][r] += other.confusion[i][r];
    }
    split += other.split;
    merged += other.merged;
    wrongPlace += other.wrongPlace;
    intendedGestures += other.intendedGestures;
    falseRejects += other.falseRejects;
    noiseOnlyUs += other.noiseOnlyUs;
    falseActivations += other.falseActivations;
    recordings += other.recordings;
    frames += other.frames;
    durationUs += other.durationUs;
}

}  // namespace TolkaTouch::Workbench

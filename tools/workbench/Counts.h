#pragma once
// Counts: the raw tallies of an evaluation, kept so that any two add up exactly. Evaluations of
// single recordings, of threads' shares and of whole shards on other machines are summed with
// add(); every ratio (precision, recall, F1, rates, latency percentiles) is derived from the sum
// by Metrics, never stored.

#include <array>
#include <cstdint>
#include <vector>

#include "tools/workbench/Labels.h"
#include "tools/workbench/RecognisedGestures.h"

namespace TolkaTouch::Workbench {

// The gestures scored per zone: tap, hold, slide (a slide by the zone it starts in).
inline constexpr size_t kScoredKindCount = 3;
inline constexpr size_t kZoneCount = 3;  // play-pause, volume-down, volume-up (region 1, 2, 3)

struct ClassCounts {
    uint64_t truePositives = 0;
    uint64_t falsePositives = 0;
    uint64_t falseNegatives = 0;
    bool operator==(const ClassCounts&) const = default;
};

struct Counts {
    // [kind][zone]: kind 0 tap, 1 hold, 2 slide; zone = region - 1.
    std::array<std::array<ClassCounts, kZoneCount>, kScoredKindCount> classes{};
    // [intended][recognised]: intended tap, hold, slide, brush, none (none also takes every
    // recognised gesture that falls on no label); recognised tap, hold, slide, nothing.
    std::array<std::array<uint64_t, kRecognisedCount>, kIntendedCount> confusion{};
    // Labelled start to the deciding event of each correctly recognised gesture, per kind, in
    // microseconds, sorted; kept whole so that percentiles of a sum are exact.
    std::array<std::vector<int64_t>, kScoredKindCount> latencyUs{};
    uint64_t split = 0;       // labels that two or more recognised gestures fell on
    uint64_t merged = 0;      // recognised gestures that ran on over a later label left empty
    uint64_t wrongPlace = 0;  // the intended kind, recognised in another zone
    uint64_t intendedGestures = 0;  // tap, hold and slide labels
    uint64_t falseRejects = 0;      // of those, recognised as nothing
    uint64_t noiseOnlyUs = 0;       // length of the recordings labelled with nothing at all
    uint64_t falseActivations = 0;  // recognised gestures in those recordings
    uint64_t recordings = 0;        // recordings evaluated
    uint64_t frames = 0;            // their frames
    uint64_t durationUs = 0;        // their length, first frame to last

    void add(const Counts& other);
    bool operator==(const Counts&) const = default;
};

inline size_t zoneIndex(PixelRegion zone) { return static_cast<size_t>(zone) - 1; }
inline PixelRegion zoneAt(size_t index) { return static_cast<PixelRegion>(index + 1); }

}  // namespace TolkaTouch::Workbench

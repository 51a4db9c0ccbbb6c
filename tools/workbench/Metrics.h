#pragma once
// Metrics: the ratios derived from Counts. A ratio whose denominator is zero has no value.
// Percentiles are nearest-rank: the p-th percentile of n sorted samples is the sample at rank
// ceil(p / 100 * n), the median the 50th.

#include <optional>
#include <vector>

#include "tools/workbench/Counts.h"

namespace TolkaTouch::Workbench {

struct Rates {
    std::optional<double> precision;  // TP / (TP + FP)
    std::optional<double> recall;     // TP / (TP + FN)
    std::optional<double> f1;         // 2 P R / (P + R)
};

struct LatencySummary {
    size_t samples = 0;
    std::optional<double> medianMs;
    std::optional<double> p90Ms;
    std::optional<double> p99Ms;
};

Rates ratesOf(const ClassCounts& counts);
// The counts of one kind over its three zones (kind 0 tap, 1 hold, 2 slide), or of everything.
ClassCounts kindTotal(const Counts& counts, size_t kind);
ClassCounts overallTotal(const Counts& counts);

// sortedUs must be sorted, as Counts keeps it.
std::optional<double> percentileMs(const std::vector<int64_t>& sortedUs, double percent);
LatencySummary latencyOf(const std::vector<int64_t>& sortedUs);

// The mean F1 of the tap, hold and slide classes of each zone that saw any gesture or label: every
// kind and zone weighs the same, however many gestures it has.
std::optional<double> macroF1(const Counts& counts);

// Recognised gestures per hour of noise-only recording.
std::optional<double> falseActivationsPerHour(const Counts& counts);
// Tap, hold and slide labels recognised as nothing, of all of them.
std::optional<double> falseRejectRate(const Counts& counts);

std::string_view scoredKindName(size_t kind);  // "tap", "hold", "slide"

}  // namespace TolkaTouch::Workbench

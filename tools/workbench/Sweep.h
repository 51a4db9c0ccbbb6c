#pragma once
// Sweep: a grid of settings evaluated on one corpus, read once. An axis is written
// KEY=LO:HI:STEP (LO, LO+STEP, ... up to HI) or KEY=A,B,C; the grid is every combination, the
// first axis changing slowest. Points are ranked by a named metric, best first; points the metric
// has no value for come last, and ties keep grid order, so the ranking is deterministic.

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/workbench/Evaluation.h"

namespace TolkaTouch::Workbench {

struct SweepAxis {
    std::string key;                  // "Algs." form
    std::vector<PropertyValue> values;
    std::vector<std::string> texts;   // the values as written in a table
};

// Throws SettingError for an unknown key or a value out of range, std::invalid_argument for a
// grid that does not read (or has more than 10000 values).
SweepAxis parseSweepAxis(std::string_view text);

// Every combination; each point's settings are `base` followed by one value per axis.
std::vector<Settings> sweepPoints(const std::vector<SweepAxis>& axes, const Settings& base = {});

struct SweepResult {
    Settings settings;
    Evaluation evaluation;
};

// progress(done, total) counts points.
std::vector<SweepResult> runSweep(const LoadedCorpus& corpus, const std::vector<Settings>& points, int64_t toleranceUs, unsigned jobs,
                                  const std::function<void(size_t done, size_t total)>& progress = {});

// Metrics a sweep ranks by: f1, macro-f1 (mean F1 over kinds and zones), precision, recall, tap-f1, hold-f1, slide-f1,
// false-activations-per-hour, false-reject-rate, tap-latency-median, hold-latency-median.
const std::vector<std::string>& sweepMetricNames();
bool isSweepMetric(std::string_view name);
std::optional<double> metricValue(const Counts& counts, std::string_view name);
bool higherIsBetter(std::string_view name);

// Indices of results, best first by the metric.
std::vector<size_t> rankSweep(const std::vector<SweepResult>& results, std::string_view metric);

}  // namespace TolkaTouch::Workbench

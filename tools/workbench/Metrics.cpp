#include "tools/workbench/Metrics.h"

#include <cmath>

namespace TolkaTouch::Workbench {

namespace {

std::optional<double> ratio(uint64_t numerator, uint64_t denominator) {
    if (denominator == 0) return std::nullopt;
    return static_cast<double>(numerator) / static_cast<double>(denominator);
}

void addTo(ClassCounts& total, const ClassCounts& part) {
    total.truePositives += part.truePositives;
    total.falsePositives += part.falsePositives;
    total.falseNegatives += part.falseNegatives;
}

}  // namespace

Rates ratesOf(const ClassCounts& counts) {
    Rates rates;
    rates.precision = ratio(counts.truePositives, counts.truePositives + counts.falsePositives);
    rates.recall = ratio(counts.truePositives, counts.truePositives + counts.falseNegatives);
    if (rates.precision && rates.recall && *rates.precision + *rates.recall > 0.0) {
        rates.f1 = 2.0 * *rates.precision * *rates.recall / (*rates.precision + *rates.recall);
    } else if (rates.precision && rates.recall) {
        rates.f1 = 0.0;
    }
    return rates;
}

ClassCounts kindTotal(const Counts& counts, size_t kind) {
    ClassCounts total;
    for (const ClassCounts& zone : counts.classes.at(kind)) addTo(total, zone);
    return total;
}

ClassCounts overallTotal(const Counts& counts) {
    ClassCounts total;
    for (size_t kind = 0; kind < kScoredKindCount; ++kind) addTo(total, kindTotal(counts, kind));
    return total;
}

std::optional<double> percentileMs(const std::vector<int64_t>& sortedUs, double percent) {
    if (sortedUs.empty()) return std::nullopt;
    const double rank = std::ceil(percent / 100.0 * static_cast<double>(sortedUs.size()));
    const size_t index = rank < 1.0 ? 0 : std::min(sortedUs.size(), static_cast<size_t>(rank)) - 1;
    return static_cast<double>(sortedUs[index]) / 1000.0;
}

LatencySummary latencyOf(const std::vector<int64_t>& sortedUs) {
    return LatencySummary{sortedUs.size(), percentileMs(sortedUs, 50.0), percentileMs(sortedUs, 90.0), percentileMs(sortedUs, 99.0)};
}

std::optional<double> falseActivationsPerHour(const Counts& counts) {
    if (counts.noiseOnlyUs == 0) return std::nullopt;
    return static_cast<double>(counts.falseActivations) * 3600e6 / static_cast<double>(counts.noiseOnlyUs);
}

std::optional<double> falseRejectRate(const Counts& counts) { return ratio(counts.falseRejects, counts.intendedGestures); }

std::optional<double> macroF1(const Counts& counts) {
    double sum = 0.0;
    size_t classes = 0;
    for (const auto& zones : counts.classes) {
        for (const ClassCounts& cell : zones) {
            const std::optional<double> f1 = ratesOf(cell).f1;
            if (cell.truePositives + cell.falsePositives + cell.falseNegatives == 0) continue;
            sum += f1.value_or(0.0);
            ++classes;
        }
    }
    if (classes == 0) return std::nullopt;
    return sum / static_cast<double>(classes);
}

std::string_view scoredKindName(size_t kind) {
    static constexpr std::string_view kNames[] = {"tap", "hold", "slide"};
    return kind < kScoredKindCount ? kNames[kind] : "";
}

}  // namespace TolkaTouch::Workbench

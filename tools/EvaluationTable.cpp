#include "tools/EvaluationTable.h"

#include <fmt/format.h>

#include "platform/PropertyValueJson.h"
#include "tools/workbench/Metrics.h"

namespace TolkaTouch::Tools {

namespace {

using namespace Workbench;

std::string ratio(const std::optional<double>& value) { return value ? fmt::format("{:.3f}", *value) : "-"; }
std::string milliseconds(const std::optional<double>& value) { return value ? fmt::format("{:.0f} ms", *value) : "-"; }

std::string classRow(std::string_view kind, std::string_view zone, const ClassCounts& counts) {
    const Rates rates = ratesOf(counts);
    return fmt::format("{:<7}{:<13}{:>6}{:>6}{:>6}{:>11}{:>8}{:>8}\n", kind, zone, counts.truePositives, counts.falsePositives,
                       counts.falseNegatives, ratio(rates.precision), ratio(rates.recall), ratio(rates.f1));
}

std::string valueText(const PropertyValue& value) { return PropertyValueJson::toJson(value).dump(); }

// The swept settings' values of one point, in axis order (the last value of a key wins).
std::vector<std::string> axisValues(const std::vector<SweepAxis>& axes, const Settings& settings) {
    std::vector<std::string> values;
    for (const SweepAxis& axis : axes) {
        std::string text = "-";
        for (const auto& [key, value] : settings) {
            if (key == axis.key) text = valueText(value);
        }
        values.push_back(text);
    }
    return values;
}

std::string shortKey(const std::string& key) { return key.starts_with("Algs.") ? key.substr(5) : key; }

}  // namespace

std::string settingsText(const Settings& settings) {
    if (settings.empty()) return "defaults";
    std::string text;
    for (const auto& [key, value] : settings) {
        if (!text.empty()) text += ' ';
        text += key + "=" + valueText(value);
    }
    return text;
}

std::string evaluationTable(const Evaluation& evaluation) {
    const Counts& counts = evaluation.counts;
    std::string out = fmt::format("{} recordings, {} frames, {:.2f} h; {} failed; tolerance {} ms; settings: {}\n\n", counts.recordings,
                                  counts.frames, static_cast<double>(counts.durationUs) / 3600e6, evaluation.failures.size(),
                                  static_cast<double>(evaluation.toleranceUs) / 1000.0, settingsText(evaluation.settings));
    out += fmt::format("{:<7}{:<13}{:>6}{:>6}{:>6}{:>11}{:>8}{:>8}\n", "kind", "zone", "TP", "FP", "FN", "precision", "recall", "F1");
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        for (size_t z = 0; z < kZoneCount; ++z) out += classRow(scoredKindName(k), zoneName(zoneAt(z)), counts.classes[k][z]);
        out += classRow(scoredKindName(k), "all", kindTotal(counts, k));
    }
    out += classRow("all", "all", overallTotal(counts));

    out += fmt::format("\n{:<18}{:>8}{:>8}{:>8}{:>8}\n", "intended \\ got", "tap", "hold", "slide", "nothing");
    for (size_t i = 0; i < kIntendedCount; ++i) {
        out += fmt::format("{:<18}", intendedName(static_cast<Intended>(i)));
        for (size_t r = 0; r < kRecognisedCount; ++r) out += fmt::format("{:>8}", counts.confusion[i][r]);
        out += '\n';
    }

    out += fmt::format("\n{:<18}{:>8}{:>10}{:>10}{:>10}\n", "latency", "samples", "median", "p90", "p99");
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        const LatencySummary summary = latencyOf(counts.latencyUs[k]);
        out += fmt::format("{:<18}{:>8}{:>10}{:>10}{:>10}\n", scoredKindName(k), summary.samples, milliseconds(summary.medianMs),
                           milliseconds(summary.p90Ms), milliseconds(summary.p99Ms));
    }

    const std::optional<double> perHour = falseActivationsPerHour(counts);
    const std::optional<double> rejects = falseRejectRate(counts);
    out += fmt::format("\nsplit {}, merged {}, wrong place {}\n", counts.split, counts.merged, counts.wrongPlace);
    out += fmt::format("false activations {} in {:.2f} h of noise-only recordings: {} per hour; false-reject rate {}\n",
                       counts.falseActivations, static_cast<double>(counts.noiseOnlyUs) / 3600e6, perHour ? fmt::format("{:.2f}", *perHour) : "-",
                       rejects ? fmt::format("{:.2f} %", *rejects * 100.0) : "-");
    return out;
}

std::string sweepTable(const std::vector<SweepAxis>& axes, const std::vector<SweepResult>& results, const std::vector<size_t>& ranking,
                       const std::string& metric) {
    std::vector<size_t> widths;
    std::string out;
    for (const SweepAxis& axis : axes) {
        widths.push_back(std::max<size_t>(shortKey(axis.key).size(), 8) + 2);
        out += fmt::format("{:<{}}", shortKey(axis.key), widths.back());
    }
    out += fmt::format("{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>9}  (by {})\n", "F1", "prec", "recall", "tap F1", "hold F1", "slideF1", "FA/h",
                       "FRR", "tap ms", metric);
    for (size_t index : ranking) {
        const SweepResult& result = results[index];
        const std::vector<std::string> values = axisValues(axes, result.settings);
        for (size_t a = 0; a < axes.size(); ++a) out += fmt::format("{:<{}}", values[a], widths[a]);
        const Counts& counts = result.evaluation.counts;
        out += fmt::format("{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>8}{:>9}\n", ratio(metricValue(counts, "f1")), ratio(metricValue(counts, "precision")),
                           ratio(metricValue(counts, "recall")), ratio(metricValue(counts, "tap-f1")), ratio(metricValue(counts, "hold-f1")),
                           ratio(metricValue(counts, "slide-f1")),
                           metricValue(counts, "false-activations-per-hour") ? fmt::format("{:.2f}", *metricValue(counts, "false-activations-per-hour")) : "-",
                           ratio(metricValue(counts, "false-reject-rate")),
                           metricValue(counts, "tap-latency-median") ? fmt::format("{:.0f}", *metricValue(counts, "tap-latency-median")) : "-");
    }
    return out;
}

std::string sweepCsv(const std::vector<SweepAxis>& axes, const std::vector<SweepResult>& results, const std::vector<size_t>& ranking) {
    std::string out;
    for (const SweepAxis& axis : axes) out += axis.key + ",";
    const std::vector<std::string>& metrics = sweepMetricNames();
    for (size_t m = 0; m < metrics.size(); ++m) out += metrics[m] + (m + 1 < metrics.size() ? "," : "\n");
    for (size_t index : ranking) {
        const SweepResult& result = results[index];
        for (const std::string& value : axisValues(axes, result.settings)) out += value + ",";
        for (size_t m = 0; m < metrics.size(); ++m) {
            const std::optional<double> value = metricValue(result.evaluation.counts, metrics[m]);
            out += (value ? fmt::format("{}", *value) : std::string()) + (m + 1 < metrics.size() ? "," : "\n");
        }
    }
    return out;
}

}  // namespace TolkaTouch::Tools

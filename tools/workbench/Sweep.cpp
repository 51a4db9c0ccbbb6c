#include "tools/workbench/Sweep.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <stdexcept>

#include "tolkatouch/Settings.h"
#include "tools/workbench/Metrics.h"

namespace TolkaTouch::Workbench {

namespace {

constexpr size_t kMostValues = 10000;

std::vector<std::string_view> split(std::string_view text, char separator) {
    std::vector<std::string_view> parts;
    size_t start = 0;
    for (;;) {
        const size_t end = text.find(separator, start);
        parts.push_back(text.substr(start, end == std::string_view::npos ? std::string_view::npos : end - start));
        if (end == std::string_view::npos) break;
        start = end + 1;
    }
    return parts;
}

double number(std::string_view text, std::string_view whole) {
    double value = 0.0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (text.empty() || error != std::errc() || end != text.data() + text.size() || !std::isfinite(value)) {
        throw std::invalid_argument("--grid " + std::string(whole) + ": '" + std::string(text) + "' is not a number");
    }
    return value;
}

std::string shortText(double value) {
    char buffer[32];
    std::snprintf(buffer, sizeof buffer, "%.10g", value);
    return buffer;
}

}  // namespace

SweepAxis parseSweepAxis(std::string_view text) {
    const size_t equals = text.find('=');
    if (equals == std::string_view::npos || equals == 0) throw std::invalid_argument("--grid " + std::string(text) + ": expected KEY=LO:HI:STEP or KEY=A,B,C");
    const std::string_view key = text.substr(0, equals);
    const std::string_view rest = text.substr(equals + 1);
    std::vector<std::string> texts;
    if (rest.find(':') != std::string_view::npos) {
        const std::vector<std::string_view> parts = split(rest, ':');
        if (parts.size() != 3) throw std::invalid_argument("--grid " + std::string(text) + ": expected KEY=LO:HI:STEP");
        const double low = number(parts[0], text);
        const double high = number(parts[1], text);
        const double step = number(parts[2], text);
        if (!(step > 0.0) || high < low) throw std::invalid_argument("--grid " + std::string(text) + ": expected LO <= HI and STEP > 0");
        for (size_t i = 0;; ++i) {
            const double value = low + static_cast<double>(i) * step;
            if (value > high + step * 1e-9) break;
            if (texts.size() == kMostValues) throw std::invalid_argument("--grid " + std::string(text) + ": more than 10000 values");
            texts.push_back(shortText(value));
        }
    } else {
        for (std::string_view part : split(rest, ',')) {
            if (part.empty()) throw std::invalid_argument("--grid " + std::string(text) + ": an empty value");
            if (texts.size() == kMostValues) throw std::invalid_argument("--grid " + std::string(text) + ": more than 10000 values");
            texts.emplace_back(part);
        }
    }
    SweepAxis axis;
    for (const std::string& value : texts) {
        const CheckedSetting checked = checkSetting(key, value);
        if (!checked.setting->tunable()) throw SettingError(std::string(key) + " is an action, not a setting to sweep");
        axis.key = checked.setting->algsKey();
        axis.values.push_back(checked.value);
    }
    axis.texts = std::move(texts);
    return axis;
}

std::vector<Settings> sweepPoints(const std::vector<SweepAxis>& axes, const Settings& base) {
    std::vector<Settings> points{base};
    for (const SweepAxis& axis : axes) {
        std::vector<Settings> next;
        for (const Settings& point : points) {
            for (const PropertyValue& value : axis.values) {
                Settings extended = point;
                extended.emplace_back(axis.key, value);
                next.push_back(std::move(extended));
            }
        }
        points = std::move(next);
    }
    return points;
}

std::vector<SweepResult> runSweep(const LoadedCorpus& corpus, const std::vector<Settings>& points, int64_t toleranceUs, unsigned jobs,
                                  const std::function<void(size_t, size_t)>& progress) {
    std::vector<SweepResult> results;
    results.reserve(points.size());
    for (const Settings& point : points) {
        EvaluationOptions options;
        options.settings = point;
        options.toleranceUs = toleranceUs;
        options.jobs = jobs;
        results.push_back(SweepResult{point, evaluateLoaded(corpus, options)});
        if (progress) progress(results.size(), points.size());
    }
    return results;
}

const std::vector<std::string>& sweepMetricNames() {
    static const std::vector<std::string> names{"f1", "macro-f1", "precision", "recall", "tap-f1", "hold-f1", "slide-f1",
                                                "false-activations-per-hour", "false-reject-rate", "tap-latency-median",
                                                "hold-latency-median"};
    return names;
}

bool isSweepMetric(std::string_view name) {
    const auto& names = sweepMetricNames();
    return std::find(names.begin(), names.end(), name) != names.end();
}

std::optional<double> metricValue(const Counts& counts, std::string_view name) {
    if (name == "f1") return ratesOf(overallTotal(counts)).f1;
    if (name == "macro-f1") return macroF1(counts);
    if (name == "precision") return ratesOf(overallTotal(counts)).precision;
    if (name == "recall") return ratesOf(overallTotal(counts)).recall;
    if (name == "tap-f1") return ratesOf(kindTotal(counts, 0)).f1;
    if (name == "hold-f1") return ratesOf(kindTotal(counts, 1)).f1;
    if (name == "slide-f1") return ratesOf(kindTotal(counts, 2)).f1;
    if (name == "false-activations-per-hour") return falseActivationsPerHour(counts);
    if (name == "false-reject-rate") return falseRejectRate(counts);
    if (name == "tap-latency-median") return latencyOf(counts.latencyUs[0]).medianMs;
    if (name == "hold-latency-median") return latencyOf(counts.latencyUs[1]).medianMs;
    throw std::invalid_argument("unknown metric '" + std::string(name) + "'");
}

bool higherIsBetter(std::string_view name) {
    return name == "f1" || name == "precision" || name == "recall" || name.ends_with("-f1");
}

std::vector<size_t> rankSweep(const std::vector<SweepResult>& results, std::string_view metric) {
    std::vector<std::optional<double>> values;
    for (const SweepResult& result : results) values.push_back(metricValue(result.evaluation.counts, metric));
    std::vector<size_t> order(results.size());
    for (size_t i = 0; i < order.size(); ++i) order[i] = i;
    const bool higher = higherIsBetter(metric);
    std::stable_sort(order.begin(), order.end(), [&](size_t a, size_t b) {
        if (!values[a] || !values[b]) return values[a].has_value() && !values[b].has_value();
        return higher ? *values[a] > *values[b] : *values[a] < *values[b];
    });
    return order;
}

}  // namespace TolkaTouch::Workbench

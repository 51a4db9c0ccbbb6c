// tolkatouch sweep: evaluates a labelled corpus over a grid of settings and ranks the points.

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "platform/PropertyValueJson.h"
#include "tolkatouch/Settings.h"
#include "tools/Commands.h"
#include "tools/CorpusArguments.h"
#include "tools/DocumentFile.h"
#include "tools/EvaluationTable.h"
#include "tools/workbench/EvaluationJson.h"

namespace TolkaTouch::Tools {

namespace {

struct SweepArguments {
    CorpusArguments corpus;
    std::vector<std::string> grid;
    std::string metric = "f1";
    bool json = false;
    bool csv = false;
};

std::string valueText(const PropertyValue& value) { return PropertyValueJson::toJson(value).dump(); }

// The settings of a point that differ from the defaults, as --set takes them.
std::string differenceFromDefaults(const Workbench::Settings& settings) {
    std::string text;
    for (const auto& [key, value] : settings) {
        const Setting* setting = findSetting(key);
        if (setting != nullptr && valueText(checkSetting(key, defaultText(*setting)).value) == valueText(value)) continue;
        text += (text.empty() ? "" : " ") + std::string("--set ") + key + "=" + valueText(value);
    }
    return text.empty() ? "none (the defaults are best)" : text;
}

std::string metricText(const std::optional<double>& value) { return value ? fmt::format("{:.4f}", *value) : "-"; }

void runSweep(const SweepArguments& arguments) {
    if (!Workbench::isSweepMetric(arguments.metric)) {
        std::string names;
        for (const std::string& name : Workbench::sweepMetricNames()) names += (names.empty() ? "" : ", ") + name;
        throw CLI::ValidationError("--metric", "unknown metric '" + arguments.metric + "' (" + names + ")");
    }
    std::vector<Workbench::SweepAxis> axes;
    for (const std::string& text : arguments.grid) {
        try {
            axes.push_back(Workbench::parseSweepAxis(text));
        } catch (const std::invalid_argument& error) {
            if (dynamic_cast<const SettingError*>(&error) != nullptr) throw;
            throw CLI::ValidationError("--grid", error.what());
        }
    }
    const Workbench::Settings base = Workbench::settingsFromAssignments(arguments.corpus.allSettings());
    const std::vector<Workbench::Settings> points = Workbench::sweepPoints(axes, base);

    const Workbench::CorpusListing listing = arguments.corpus.listing();
    ProgressLine loading("sweep: reading recordings");
    Workbench::LoadedCorpus corpus = Workbench::loadCorpus(listing.documents, arguments.corpus.threads(),
                                                           [&loading](size_t done, size_t total) { loading.update(done, total); });
    loading.finish();
    corpus.failures.insert(corpus.failures.begin(), listing.failures.begin(), listing.failures.end());

    ProgressLine progress("sweep: points");
    const int64_t tolerance = arguments.corpus.toleranceUs();
    const unsigned jobs = arguments.corpus.threads();
    const Workbench::Evaluation defaults = Workbench::runSweep(corpus, {base}, tolerance, jobs).front().evaluation;
    const std::vector<Workbench::SweepResult> results =
        Workbench::runSweep(corpus, points, tolerance, jobs, [&progress](size_t done, size_t total) { progress.update(done, total); });
    progress.finish();
    const std::vector<size_t> ranking = Workbench::rankSweep(results, arguments.metric);

    std::string out;
    if (arguments.json) {
        nlohmann::ordered_json json;
        json["Version"] = 1;
        json["Metric"] = arguments.metric;
        json["Defaults"] = Workbench::evaluationJson(defaults);
        json["Points"] = nlohmann::ordered_json::array();
        for (size_t index : ranking) json["Points"].push_back(Workbench::evaluationJson(results[index].evaluation));
        out = json.dump() + "\n";
    } else if (arguments.csv) {
        out = sweepCsv(axes, results, ranking);
    } else {
        out = sweepTable(axes, results, ranking, arguments.metric);
        if (!ranking.empty()) {
            const Workbench::SweepResult& best = results[ranking.front()];
            const std::optional<double> bestValue = Workbench::metricValue(best.evaluation.counts, arguments.metric);
            const std::optional<double> defaultValue = Workbench::metricValue(defaults.counts, arguments.metric);
            out += fmt::format("\nbest by {}: {} (defaults {}", arguments.metric, metricText(bestValue), metricText(defaultValue));
            if (bestValue && defaultValue) out += fmt::format(", {:+.4f}", *bestValue - *defaultValue);
            out += ")\n  " + differenceFromDefaults(best.settings) + "\n";
        }
        out += fmt::format("{} points, {} recordings, {} failed\n", results.size(), corpus.recordings.size(), corpus.failures.size());
    }
    std::fputs(out.c_str(), stdout);
    std::fflush(stdout);
    failWhenFilesFailed(corpus.failures, listing.documents.size() + listing.failures.size());
}

}  // namespace

void addSweepCommand(CLI::App& app) {
    auto arguments = std::make_shared<SweepArguments>();
    CLI::App* command = app.add_subcommand(
        "sweep",
        "Evaluate a labelled corpus at every point of a grid of settings and rank the points by a metric; ends with the "
        "best point and how it differs from the defaults.");
    arguments->corpus.addTo(*command, "Documents and folders of documents");
    command->add_option("--grid", arguments->grid, "A setting's values: KEY=LO:HI:STEP or KEY=A,B,C (repeatable: every combination)")
        ->type_name("KEY=VALUES")
        ->required()
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    command->add_option("--metric", arguments->metric,
                        "Rank by: f1 (default), macro-f1, precision, recall, tap-f1, hold-f1, slide-f1, false-activations-per-hour, "
                        "false-reject-rate, tap-latency-median, hold-latency-median");
    CLI::Option* json = command->add_flag("--json", arguments->json, "Print every point's evaluation as JSON, best first");
    command->add_flag("--csv", arguments->csv, "Print one CSV row per point, best first")->excludes(json);
    command->callback([arguments] { runSweep(*arguments); });
}

}  // namespace TolkaTouch::Tools

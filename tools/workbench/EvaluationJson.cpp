#include "tools/workbench/EvaluationJson.h"

#include "platform/PropertyValueJson.h"
#include "tools/workbench/Metrics.h"

namespace TolkaTouch::Workbench {

namespace {

using Json = nlohmann::ordered_json;

Json optional(const std::optional<double>& value) { return value ? Json(*value) : Json(nullptr); }

Json classJson(const ClassCounts& counts) {
    return Json{{"TP", counts.truePositives}, {"FP", counts.falsePositives}, {"FN", counts.falseNegatives}};
}

Json ratesJson(const ClassCounts& counts) {
    const Rates rates = ratesOf(counts);
    Json json = classJson(counts);
    json["Precision"] = optional(rates.precision);
    json["Recall"] = optional(rates.recall);
    json["F1"] = optional(rates.f1);
    return json;
}

Json countsJson(const Counts& counts) {
    Json classes = Json::object();
    Json confusion = Json::object();
    Json latency = Json::object();
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        Json zones = Json::object();
        for (size_t z = 0; z < kZoneCount; ++z) zones[std::string(zoneName(zoneAt(z)))] = classJson(counts.classes[k][z]);
        classes[std::string(scoredKindName(k))] = zones;
        latency[std::string(scoredKindName(k))] = counts.latencyUs[k];
    }
    for (size_t i = 0; i < kIntendedCount; ++i) {
        Json row = Json::object();
        for (size_t r = 0; r < kRecognisedCount; ++r) row[std::string(recognisedName(static_cast<Recognised>(r)))] = counts.confusion[i][r];
        confusion[std::string(intendedName(static_cast<Intended>(i)))] = row;
    }
    return Json{{"Recordings", counts.recordings},
                {"Frames", counts.frames},
                {"DurationUs", counts.durationUs},
                {"Classes", classes},
                {"Confusion", confusion},
                {"LatencyUs", latency},
                {"Split", counts.split},
                {"Merged", counts.merged},
                {"WrongPlace", counts.wrongPlace},
                {"IntendedGestures", counts.intendedGestures},
                {"FalseRejects", counts.falseRejects},
                {"NoiseOnlyUs", counts.noiseOnlyUs},
                {"FalseActivations", counts.falseActivations}};
}

const nlohmann::json& member(const nlohmann::json& object, const std::string& key, const std::string& where) {
    if (!object.is_object()) throw EvaluationJsonError(where + " is not an object");
    const auto it = object.find(key);
    if (it == object.end()) throw EvaluationJsonError("no " + where + "." + key);
    return *it;
}

uint64_t count(const nlohmann::json& object, const std::string& key, const std::string& where) {
    const nlohmann::json& value = member(object, key, where);
    if (!value.is_number_unsigned()) throw EvaluationJsonError(where + "." + key + " is not a count");
    return value.get<uint64_t>();
}

Counts countsFromJson(const nlohmann::json& json) {
    Counts counts;
    const std::string where = "Counts";
    counts.recordings = count(json, "Recordings", where);
    counts.frames = count(json, "Frames", where);
    counts.durationUs = count(json, "DurationUs", where);
    counts.split = count(json, "Split", where);
    counts.merged = count(json, "Merged", where);
    counts.wrongPlace = count(json, "WrongPlace", where);
    counts.intendedGestures = count(json, "IntendedGestures", where);
    counts.falseRejects = count(json, "FalseRejects", where);
    counts.noiseOnlyUs = count(json, "NoiseOnlyUs", where);
    counts.falseActivations = count(json, "FalseActivations", where);
    const nlohmann::json& classes = member(json, "Classes", where);
    const nlohmann::json& latency = member(json, "LatencyUs", where);
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        const std::string kind(scoredKindName(k));
        const nlohmann::json& zones = member(classes, kind, "Counts.Classes");
        for (size_t z = 0; z < kZoneCount; ++z) {
            const std::string zone(zoneName(zoneAt(z)));
            const nlohmann::json& cell = member(zones, zone, "Counts.Classes." + kind);
            const std::string cellWhere = "Counts.Classes." + kind + "." + zone;
            counts.classes[k][z] = ClassCounts{count(cell, "TP", cellWhere), count(cell, "FP", cellWhere), count(cell, "FN", cellWhere)};
        }
        const nlohmann::json& samples = member(latency, kind, "Counts.LatencyUs");
        if (!samples.is_array()) throw EvaluationJsonError("Counts.LatencyUs." + kind + " is not a list");
        for (const nlohmann::json& sample : samples) {
            if (!sample.is_number_integer()) throw EvaluationJsonError("Counts.LatencyUs." + kind + " holds a non-integer");
            counts.latencyUs[k].push_back(sample.get<int64_t>());
        }
        std::sort(counts.latencyUs[k].begin(), counts.latencyUs[k].end());
    }
    const nlohmann::json& confusion = member(json, "Confusion", where);
    for (size_t i = 0; i < kIntendedCount; ++i) {
        const std::string intended(intendedName(static_cast<Intended>(i)));
        const nlohmann::json& row = member(confusion, intended, "Counts.Confusion");
        for (size_t r = 0; r < kRecognisedCount; ++r) {
            counts.confusion[i][r] = count(row, std::string(recognisedName(static_cast<Recognised>(r))), "Counts.Confusion." + intended);
        }
    }
    return counts;
}

}  // namespace

Json metricsJson(const Counts& counts) {
    Json perKind = Json::object();
    Json latency = Json::object();
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        Json kind = ratesJson(kindTotal(counts, k));
        Json zones = Json::object();
        for (size_t z = 0; z < kZoneCount; ++z) zones[std::string(zoneName(zoneAt(z)))] = ratesJson(counts.classes[k][z]);
        kind["Zones"] = zones;
        perKind[std::string(scoredKindName(k))] = kind;
        const LatencySummary summary = latencyOf(counts.latencyUs[k]);
        latency[std::string(scoredKindName(k))] =
            Json{{"Samples", summary.samples}, {"MedianMs", optional(summary.medianMs)}, {"P90Ms", optional(summary.p90Ms)}, {"P99Ms", optional(summary.p99Ms)}};
    }
    return Json{{"Overall", ratesJson(overallTotal(counts))},
                {"Kinds", perKind},
                {"Latency", latency},
                {"FalseActivationsPerHour", optional(falseActivationsPerHour(counts))},
                {"FalseRejectRate", optional(falseRejectRate(counts))}};
}

Json evaluationJson(const Evaluation& evaluation) {
    Json settings = Json::object();
    for (const auto& [key, value] : evaluation.settings) settings[key] = PropertyValueJson::toJson(value);
    Json failures = Json::array();
    for (const FileFailure& failure : evaluation.failures) failures.push_back(Json{{"File", failure.path}, {"Reason", failure.reason}});
    Json json;
    json["Version"] = 1;
    // Whole microseconds as milliseconds: exact in a double, read back exactly.
    json["ToleranceMs"] = static_cast<double>(evaluation.toleranceUs) / 1000.0;
    json["Settings"] = settings;
    json["Counts"] = countsJson(evaluation.counts);
    json["Failures"] = failures;
    json["Metrics"] = metricsJson(evaluation.counts);
    return json;
}

Evaluation evaluationFromJson(std::string_view text) {
    const nlohmann::json json = nlohmann::json::parse(text.begin(), text.end(), nullptr, false);
    if (json.is_discarded()) throw EvaluationJsonError("not JSON");
    if (!json.is_object()) throw EvaluationJsonError("not an evaluation (expected an object)");
    const nlohmann::json& version = member(json, "Version", "result");
    if (!version.is_number_integer() || version.get<int64_t>() != 1) throw EvaluationJsonError("unsupported Version " + version.dump());
    Evaluation evaluation;
    const nlohmann::json& tolerance = member(json, "ToleranceMs", "result");
    if (!tolerance.is_number() || !(tolerance.get<double>() >= 0.0)) throw EvaluationJsonError("ToleranceMs is not a time");
    evaluation.toleranceUs = std::llround(tolerance.get<double>() * 1000.0);
    const nlohmann::json& settings = member(json, "Settings", "result");
    if (!settings.is_object()) throw EvaluationJsonError("Settings is not an object");
    for (const auto& [key, value] : settings.items()) evaluation.settings.emplace_back(key, PropertyValueJson::fromJson(value));
    evaluation.counts = countsFromJson(member(json, "Counts", "result"));
    const nlohmann::json& failures = member(json, "Failures", "result");
    if (!failures.is_array()) throw EvaluationJsonError("Failures is not a list");
    for (const nlohmann::json& failure : failures) {
        const nlohmann::json& file = member(failure, "File", "Failures[]");
        const nlohmann::json& reason = member(failure, "Reason", "Failures[]");
        if (!file.is_string() || !reason.is_string()) throw EvaluationJsonError("a failure's File and Reason are text");
        evaluation.failures.push_back(FileFailure{file.get<std::string>(), reason.get<std::string>()});
    }
    return evaluation;
}

}  // namespace TolkaTouch::Workbench

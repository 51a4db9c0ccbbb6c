#include "tools/workbench/Labels.h"

#include <algorithm>
#include <cmath>

#include <nlohmann/json.hpp>

namespace TolkaTouch::Workbench {

namespace {

constexpr double kLongestMs = 1e12;  // beyond thirty years a time is a typo

[[noreturn]] void fail(size_t index, const std::string& message) {
    throw LabelsError("label " + std::to_string(index + 1) + ": " + message);
}

int64_t timeField(const nlohmann::json& object, const char* key, size_t index) {
    const auto it = object.find(key);
    if (it == object.end()) fail(index, std::string("no ") + key);
    if (!it->is_number()) fail(index, std::string(key) + " is not a number");
    const double ms = it->get<double>();
    if (!(ms >= 0.0) || ms > kLongestMs) fail(index, std::string(key) + " is out of range");
    return std::llround(ms * 1000.0);
}

PixelRegion zoneField(const nlohmann::json& object, const char* key, size_t index) {
    const auto it = object.find(key);
    if (it == object.end()) fail(index, std::string("no ") + key);
    if (!it->is_string()) fail(index, std::string(key) + " is not a string");
    const auto zone = zoneFromName(it->get<std::string>());
    if (!zone || *zone == PixelRegion::None) {
        fail(index, "unknown zone '" + it->get<std::string>() + "' (play-pause, volume-up, volume-down)");
    }
    return *zone;
}

Label labelFrom(const nlohmann::json& object, size_t index) {
    if (!object.is_object()) fail(index, "not an object");
    for (const auto& [key, value] : object.items()) {
        if (key != "Kind" && key != "Zone" && key != "ToZone" && key != "StartMs" && key != "EndMs") {
            fail(index, "unknown key '" + key + "'");
        }
    }
    Label label;
    const auto kind = object.find("Kind");
    if (kind == object.end() || !kind->is_string()) fail(index, "no Kind");
    const auto intended = intendedFromName(kind->get<std::string>());
    if (!intended) fail(index, "unknown kind '" + kind->get<std::string>() + "' (tap, hold, slide, brush, none)");
    label.kind = *intended;
    if (label.kind == Intended::None) {
        if (object.contains("Zone")) fail(index, "a none label has no Zone");
    } else {
        label.zone = zoneField(object, "Zone", index);
    }
    if (label.kind == Intended::Slide) {
        label.toZone = zoneField(object, "ToZone", index);
        if (label.toZone == label.zone) fail(index, "a slide needs two different zones");
    } else if (object.contains("ToZone")) {
        fail(index, "only a slide has a ToZone");
    }
    label.startUs = timeField(object, "StartMs", index);
    label.endUs = timeField(object, "EndMs", index);
    if (label.endUs < label.startUs) fail(index, "EndMs is before StartMs");
    return label;
}

}  // namespace

std::vector<Label> parseLabels(std::string_view text) {
    const nlohmann::json document = nlohmann::json::parse(text.begin(), text.end(), nullptr, false);
    if (document.is_discarded()) throw LabelsError("not JSON");
    if (!document.is_object()) throw LabelsError("not a labels document (expected an object)");
    const auto version = document.find("Version");
    if (version == document.end() || !version->is_number_integer()) throw LabelsError("no Version");
    if (version->get<int64_t>() != 1) throw LabelsError("unsupported Version " + version->dump());
    const auto list = document.find("Labels");
    if (list == document.end() || !list->is_array()) throw LabelsError("no Labels list");
    for (const auto& [key, value] : document.items()) {
        if (key != "Version" && key != "Labels") throw LabelsError("unknown key '" + key + "'");
    }
    std::vector<Label> labels;
    labels.reserve(list->size());
    for (size_t i = 0; i < list->size(); ++i) labels.push_back(labelFrom((*list)[i], i));
    std::stable_sort(labels.begin(), labels.end(), [](const Label& a, const Label& b) { return a.startUs < b.startUs; });
    return labels;
}

std::string labelsDocument(const std::vector<Label>& labels) {
    std::string text = "{\"Version\": 1,\n \"Labels\": [";
    for (size_t i = 0; i < labels.size(); ++i) {
        const Label& label = labels[i];
        nlohmann::ordered_json object;
        object["Kind"] = intendedName(label.kind);
        if (label.kind != Intended::None) object["Zone"] = zoneName(label.zone);
        if (label.kind == Intended::Slide) object["ToZone"] = zoneName(label.toZone);
        object["StartMs"] = (label.startUs + 500) / 1000;
        object["EndMs"] = (label.endUs + 500) / 1000;
        text += i == 0 ? "\n  " : ",\n  ";
        text += object.dump();
    }
    text += labels.empty() ? "]}\n" : "\n ]}\n";
    return text;
}

std::string labelsPathFor(const std::string& documentPath) {
    if (documentPath.ends_with(".json")) return documentPath.substr(0, documentPath.size() - 5) + ".labels.json";
    // What `tolkatouch record` writes: the line form.
    if (documentPath.ends_with(".jsonl")) return documentPath.substr(0, documentPath.size() - 6) + ".labels.json";
    return documentPath + ".labels.json";
}

bool isLabelsPath(std::string_view path) { return path.ends_with(".labels.json"); }

std::string_view intendedName(Intended kind) {
    switch (kind) {
    case Intended::Tap: return "tap";
    case Intended::Hold: return "hold";
    case Intended::Slide: return "slide";
    case Intended::Brush: return "brush";
    case Intended::None: return "none";
    }
    return "";
}

std::optional<Intended> intendedFromName(std::string_view name) {
    for (Intended kind : {Intended::Tap, Intended::Hold, Intended::Slide, Intended::Brush, Intended::None}) {
        if (intendedName(kind) == name) return kind;
    }
    return std::nullopt;
}

std::string_view zoneName(PixelRegion zone) {
    switch (zone) {
    case PixelRegion::PlayPause: return "play-pause";
    case PixelRegion::VolumeUp: return "volume-up";
    case PixelRegion::VolumeDown: return "volume-down";
    case PixelRegion::None: return "none";
    }
    return "none";
}

std::optional<PixelRegion> zoneFromName(std::string_view name) {
    for (PixelRegion zone : {PixelRegion::PlayPause, PixelRegion::VolumeUp, PixelRegion::VolumeDown, PixelRegion::None}) {
        if (zoneName(zone) == name) return zone;
    }
    return std::nullopt;
}

}  // namespace TolkaTouch::Workbench

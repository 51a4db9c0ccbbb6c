#pragma once
// Labels: what a recording was meant to contain, gesture by gesture, so that the recognizer's
// events can be scored against it. `tolkatouch synth --labels` writes them; an engineer writes them
// by hand for a real recording. The labels of DOC.json live beside it in DOC.labels.json:
//
//   {"Version": 1,
//    "Labels": [{"Kind": "tap", "Zone": "volume-up", "StartMs": 304, "EndMs": 424},
//               {"Kind": "slide", "Zone": "volume-up", "ToZone": "volume-down", "StartMs": 900, "EndMs": 2100}]}
//
// Kind is tap, hold, slide, brush (a grazing touch that must give nothing) or none (a stretch in
// which nothing is meant to happen); Zone is play-pause, volume-up or volume-down (not for none);
// ToZone only for a slide. Times are milliseconds from the recording's first frame (the seconds
// `tolkatouch replay` prints, times 1000), StartMs when the finger arrives and EndMs when it leaves.
// An empty list marks a recording in which nothing at all is meant to happen (noise only).

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "tolkatouch/PixelRegion.h"

namespace TolkaTouch::Workbench {

// What a labelled stretch was meant to be.
enum class Intended : uint8_t { Tap, Hold, Slide, Brush, None };
inline constexpr size_t kIntendedCount = 5;

struct Label {
    Intended kind = Intended::None;
    PixelRegion zone = PixelRegion::None;    // None only for Intended::None
    PixelRegion toZone = PixelRegion::None;  // a slide's last zone
    int64_t startUs = 0;                     // from the first frame
    int64_t endUs = 0;
    bool operator==(const Label&) const = default;
};

// "label <n>: <what is wrong>", or what the JSON reader said.
class LabelsError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// The labels in start order (a stable sort: hand-written files need not be sorted). Throws
// LabelsError for anything that is not a labels document.
std::vector<Label> parseLabels(std::string_view text);

// The document form, one label per line, times in whole milliseconds rounded to the nearest.
std::string labelsDocument(const std::vector<Label>& labels);

// "DOC.labels.json" for "DOC.json" and "DOC.jsonl" (for any other name, the name plus ".labels.json").
std::string labelsPathFor(const std::string& documentPath);
bool isLabelsPath(std::string_view path);

std::string_view intendedName(Intended kind);
std::optional<Intended> intendedFromName(std::string_view name);
// "play-pause", "volume-up", "volume-down"; "none" for PixelRegion::None.
std::string_view zoneName(PixelRegion zone);
std::optional<PixelRegion> zoneFromName(std::string_view name);

}  // namespace TolkaTouch::Workbench

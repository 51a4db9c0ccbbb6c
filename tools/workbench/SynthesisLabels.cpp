#include "tools/workbench/SynthesisLabels.h"

#include <algorithm>

namespace TolkaTouch::Workbench {

namespace {

Intended intendedOf(Tools::GestureKind kind) {
    switch (kind) {
    case Tools::GestureKind::Tap: return Intended::Tap;
    case Tools::GestureKind::Hold: return Intended::Hold;
    case Tools::GestureKind::Slide: return Intended::Slide;
    case Tools::GestureKind::Brush: return Intended::Brush;
    default: return Intended::None;
    }
}

bool isTouch(Tools::GestureKind kind) {
    return kind == Tools::GestureKind::Tap || kind == Tools::GestureKind::Hold || kind == Tools::GestureKind::Slide ||
           kind == Tools::GestureKind::Brush;
}

}  // namespace

std::vector<Label> labelsOfSynthesis(const Tools::Synthesis& synthesis) {
    std::vector<Label> labels;
    if (synthesis.frames.empty()) return labels;
    const int64_t originNs = static_cast<int64_t>(synthesis.frames.front().timestamp);
    const auto fromOrigin = [originNs](uint64_t ns) { return (static_cast<int64_t>(ns) - originNs) / 1000; };

    const std::vector<Tools::GestureSpan>& spans = synthesis.spans;
    for (size_t i = 0; i < spans.size(); ++i) {
        const Tools::Gesture& gesture = spans[i].gesture;
        if (!isTouch(gesture.kind)) continue;
        // The resets placed inside this touch follow it, before the next line that takes time.
        std::vector<int64_t> cuts;
        for (size_t j = i + 1; j < spans.size(); ++j) {
            const Tools::Gesture& inner = spans[j].gesture;
            if (inner.kind == Tools::GestureKind::Set) continue;
            if (inner.kind != Tools::GestureKind::Reset || !inner.hasOffset) break;
            cuts.push_back(fromOrigin(spans[j].startNs));
        }
        Label label;
        label.kind = intendedOf(gesture.kind);
        label.zone = Tools::regionOfZone(gesture.zone);
        if (gesture.kind == Tools::GestureKind::Slide) label.toZone = Tools::regionOfZone(gesture.toZone);
        label.startUs = fromOrigin(spans[i].startNs);
        label.endUs = fromOrigin(spans[i].endNs);
        if (cuts.empty()) {
            labels.push_back(label);
            continue;
        }
        std::sort(cuts.begin(), cuts.end());
        cuts.push_back(label.endUs);
        int64_t pieceStart = label.startUs;
        for (const int64_t cut : cuts) {
            Label piece = label;
            piece.startUs = pieceStart;
            piece.endUs = cut;
            if (!(label.kind == Intended::Hold && cut - pieceStart >= kShortestLabelledHoldUs)) {
                piece.kind = Intended::None;
                piece.zone = PixelRegion::None;
            }
            labels.push_back(piece);
            pieceStart = cut;
        }
    }
    std::stable_sort(labels.begin(), labels.end(), [](const Label& a, const Label& b) { return a.startUs < b.startUs; });
    return labels;
}

}  // namespace TolkaTouch::Workbench

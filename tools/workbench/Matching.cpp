#include "tools/workbench/Matching.h"

#include <algorithm>
#include <cstdlib>
#include <optional>

namespace TolkaTouch::Workbench {

namespace {

std::optional<size_t> scoredIndex(Intended kind) {
    switch (kind) {
    case Intended::Tap: return 0;
    case Intended::Hold: return 1;
    case Intended::Slide: return 2;
    default: return std::nullopt;
    }
}

std::optional<size_t> scoredIndex(Recognised kind) {
    switch (kind) {
    case Recognised::Tap: return 0;
    case Recognised::Hold: return 1;
    case Recognised::Slide: return 2;
    default: return std::nullopt;
    }
}

bool validZone(PixelRegion zone) { return zone == PixelRegion::PlayPause || zone == PixelRegion::VolumeDown || zone == PixelRegion::VolumeUp; }

void countFalsePositive(const RecognisedGesture& gesture, Counts& counts) {
    const auto kind = scoredIndex(gesture.kind);
    if (kind && validZone(gesture.zone)) ++counts.classes[*kind][zoneIndex(gesture.zone)].falsePositives;
}

void note(std::vector<Mismatch>* mismatches, MismatchKind kind, int64_t startUs, int64_t endUs) {
    if (mismatches) mismatches->push_back(Mismatch{kind, startUs, endUs});
}

void note(std::vector<Mismatch>* mismatches, MismatchKind kind, const RecognisedGesture& gesture) {
    note(mismatches, kind, gesture.startUs, gesture.endUs);
}

bool sameKind(Intended intended, Recognised recognised) {
    return scoredIndex(intended) && scoredIndex(intended) == scoredIndex(recognised);
}

}  // namespace

std::string_view mismatchName(MismatchKind kind) {
    switch (kind) {
    case MismatchKind::Missed: return "missed";
    case MismatchKind::False: return "false";
    case MismatchKind::Split: return "split";
    case MismatchKind::Merged: return "merged";
    case MismatchKind::WrongZone: return "wrong zone";
    }
    return "missed";
}

void matchRecording(const std::vector<Label>& labels, const std::vector<RecognisedGesture>& recognised, uint64_t durationUs,
                    int64_t toleranceUs, Counts& counts, std::vector<Mismatch>* mismatches) {
    // Which label each recognised gesture falls on.
    std::vector<std::optional<size_t>> labelOf(recognised.size());
    std::vector<std::vector<size_t>> onLabel(labels.size());
    for (size_t g = 0; g < recognised.size(); ++g) {
        const int64_t start = recognised[g].startUs;
        std::optional<size_t> best;
        int64_t bestDistance = 0;
        for (size_t l = 0; l < labels.size(); ++l) {
            if (start < labels[l].startUs - toleranceUs || start > labels[l].endUs + toleranceUs) continue;
            const int64_t distance = std::llabs(start - labels[l].startUs);
            if (!best || distance < bestDistance) {
                best = l;
                bestDistance = distance;
            }
        }
        labelOf[g] = best;
        if (best) onLabel[*best].push_back(g);
    }

    const size_t none = static_cast<size_t>(Intended::None);
    for (size_t g = 0; g < recognised.size(); ++g) {
        if (labelOf[g]) continue;
        countFalsePositive(recognised[g], counts);
        note(mismatches, MismatchKind::False, recognised[g]);
        ++counts.confusion[none][static_cast<size_t>(recognised[g].kind)];
    }

    std::array<std::vector<int64_t>, kScoredKindCount> latencies;
    for (size_t l = 0; l < labels.size(); ++l) {
        const Label& label = labels[l];
        const std::vector<size_t>& fallen = onLabel[l];
        const RecognisedGesture* outcome = fallen.empty() ? nullptr : &recognised[fallen.front()];
        const Recognised outcomeKind = outcome ? outcome->kind : Recognised::Nothing;
        ++counts.confusion[static_cast<size_t>(label.kind)][static_cast<size_t>(outcomeKind)];
        if (fallen.size() > 1) {
            ++counts.split;
            for (size_t i = 1; i < fallen.size(); ++i) {
                countFalsePositive(recognised[fallen[i]], counts);
                note(mismatches, MismatchKind::Split, recognised[fallen[i]]);
            }
        }

        const auto kind = scoredIndex(label.kind);
        if (!kind) {
            if (outcome) {
                countFalsePositive(*outcome, counts);
                note(mismatches, MismatchKind::False, *outcome);
            }
            continue;
        }
        ++counts.intendedGestures;
        const bool rightKind = outcome && sameKind(label.kind, outcome->kind);
        const bool rightPlace = outcome && outcome->zone == label.zone && (label.kind != Intended::Slide || outcome->toZone == label.toZone);
        if (rightKind && rightPlace) {
            ++counts.classes[*kind][zoneIndex(label.zone)].truePositives;
            latencies[*kind].push_back(outcome->decidedUs - label.startUs);
            continue;
        }
        ++counts.classes[*kind][zoneIndex(label.zone)].falseNegatives;
        if (!outcome) {
            ++counts.falseRejects;
            note(mismatches, MismatchKind::Missed, label.startUs, label.endUs);
            continue;
        }
        countFalsePositive(*outcome, counts);
        if (rightKind) {
            ++counts.wrongPlace;
            note(mismatches, MismatchKind::WrongZone, *outcome);
        } else {
            note(mismatches, MismatchKind::Missed, label.startUs, label.endUs);
            note(mismatches, MismatchKind::False, *outcome);
        }
    }

    // A gesture that runs on over a later label nothing fell on took that label's touch into itself.
    for (size_t g = 0; g < recognised.size(); ++g) {
        for (size_t l = 0; l < labels.size(); ++l) {
            const bool later = labelOf[g] ? l > *labelOf[g] : labels[l].startUs > recognised[g].startUs;
            if (later && onLabel[l].empty() && scoredIndex(labels[l].kind) && recognised[g].startUs < labels[l].startUs &&
                recognised[g].endUs > labels[l].startUs + toleranceUs) {
                ++counts.merged;
                note(mismatches, MismatchKind::Merged, recognised[g]);
                break;
            }
        }
    }

    Counts own;
    for (size_t k = 0; k < kScoredKindCount; ++k) {
        std::sort(latencies[k].begin(), latencies[k].end());
        own.latencyUs[k] = std::move(latencies[k]);
    }
    counts.add(own);

    if (labels.empty()) {
        counts.noiseOnlyUs += durationUs;
        counts.falseActivations += recognised.size();
    }
}

}  // namespace TolkaTouch::Workbench

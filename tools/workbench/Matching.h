#pragma once
// Matching: scores one recording's recognised gestures against its labels.
//
// The rules, with T the time tolerance (100 ms unless told):
// - A recognised gesture falls on a label when its touch start lies within T of the label's
//   stretch: from StartMs - T to EndMs + T. When it lies within reach of several labels it falls
//   on the one whose start is nearest (the earlier on a tie); on none, it is a false positive of
//   its own kind and zone, and counts under intended "none" in the confusion matrix.
// - A label's outcome is the first recognised gesture that fell on it, or "nothing". Any further
//   gesture on it is a false positive, and the label counts once as split.
// - A tap, hold or slide label is a true positive of its kind and zone when its outcome has the
//   same kind and zone (for a slide also the same last zone), and then gives one latency sample:
//   from the label's start to the deciding event (the tap, or the hold start). Otherwise it is a
//   false negative, and its outcome, if any, a false positive; the intended kind recognised in
//   another zone counts as wrong place, nothing at all as a false reject.
// - Any gesture recognised on a brush or none label is a false positive.
// - A recognised gesture that runs on past the start (plus T) of a later label which nothing
//   fell on counts once as merged.
// - A recording whose label list is empty is noise only: its length and every gesture
//   recognised in it count toward the false activations per hour.

#include <cstdint>
#include <string_view>
#include <vector>

#include "tools/workbench/Counts.h"
#include "tools/workbench/Labels.h"
#include "tools/workbench/RecognisedGestures.h"

namespace TolkaTouch::Workbench {

inline constexpr int64_t kDefaultToleranceUs = 100'000;

// Where the recognised gestures and the labels disagree, one stretch each, for drawing on a
// timeline: a label nothing right fell on (missed: the label's stretch), a gesture counted as a
// false positive (false: the gesture's), a further gesture on one label (split), a gesture that
// ran on over a later label (merged) and the intended kind in another zone (wrong zone: the
// gesture's). A wrong kind on a label is missed and false, as it counts.
enum class MismatchKind : uint8_t { Missed, False, Split, Merged, WrongZone };
struct Mismatch {
    MismatchKind kind = MismatchKind::Missed;
    int64_t startUs = 0;  // from the first frame
    int64_t endUs = 0;
    bool operator==(const Mismatch&) const = default;
};
std::string_view mismatchName(MismatchKind kind);  // "missed", "false", "split", "merged", "wrong zone"

// Adds the recording's tallies to counts; durationUs is its length, first frame to last. With
// mismatches, also appends every disagreement there, in the order they are counted.
void matchRecording(const std::vector<Label>& labels, const std::vector<RecognisedGesture>& recognised, uint64_t durationUs,
                    int64_t toleranceUs, Counts& counts, std::vector<Mismatch>* mismatches = nullptr);

}  // namespace TolkaTouch::Workbench

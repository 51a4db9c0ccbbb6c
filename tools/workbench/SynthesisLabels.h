#pragma once
// The labels of a synthesised recording: what each line of its gesture script means to happen.
// A tap, hold, slide or brush line is one label over the time its finger is on or above the
// surface. A reset inside a touch cuts it in pieces, each its own label: a piece that lasts past
// the hold timeout (500 ms) with a margin stays a hold, a shorter one is meant to give nothing.

#include <vector>

#include "tools/Synthesizer.h"
#include "tools/workbench/Labels.h"

namespace TolkaTouch::Workbench {

// A piece of a hold cut by resets must last this long to be meant as a hold.
inline constexpr int64_t kShortestLabelledHoldUs = 560'000;

// Times from the synthesis' first frame.
std::vector<Label> labelsOfSynthesis(const Tools::Synthesis& synthesis);

}  // namespace TolkaTouch::Workbench

#pragma once
// The counters a replay ends with: the pipeline's "ResetCount" and "DisjointImageCount" and the
// recognizer's event statistics ("Algs.EventStats").

#include <string>

#include "pipeline/Pipeline.h"

namespace TolkaTouch::Tools {

// {"stats":<Algs.EventStats>,"ResetCount":n,"DisjointImageCount":n}, without a line end.
std::string statsJsonLine(const Pipeline& pipeline);

// The counters that are not zero, one per line, names left and numbers right-aligned; the
// pipeline's two first, then the dispatched and the rejected event counters.
std::string statsTable(const Pipeline& pipeline);

}  // namespace TolkaTouch::Tools

#pragma once
// The two description lines of a frame, for people tuning the recognizer: the hand state with the
// 15 pixels, and the same with the 23 virtual pixels. Formatted from the frame's snapshot alone.

#include <string>

#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

// "STARTTOUCH 0ms ActiveRegion=1", "TAP 96ms ActiveRegion=3 BELOWNOISE", ... or empty when idle.
std::string touchPhasePhrase(const FrameSnapshot& frame);
// "ts=..., sd=..., ..., [A=   0    0, ..., O=   0    0] <phrase>"
std::string touchStateLine(const FrameSnapshot& frame);
// "ts=..., sd=..., ..., [ABE=   0, ..., MNO=   0] <phrase>"
std::string virtualStateLine(const FrameSnapshot& frame);

}  // namespace TolkaTouch

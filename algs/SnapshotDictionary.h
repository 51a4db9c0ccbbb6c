#pragma once
// A frame's diagnostics snapshot as a property dictionary: what the plug-in answers for the
// "Algs.FrameSnapshot" state key, so that a host can follow the recognizer live. The keys are the
// names of the Python package's Frames arrays; single-precision numbers keep their exact value.

#include "platform/PropertyValue.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

PropertyValue snapshotDictionary(const FrameSnapshot& frame);

}  // namespace TolkaTouch

#pragma once
// Synthesizer: turns a gesture script into the frames of a realistic recording. Image reports
// come every 8 ms (with a little jitter in their host arrival times), numbered by a running
// firmware frame counter and stamped with the firmware's millisecond clock; the pixel readings
// come from a FingerModel following each gesture's finger. A firmware reset is reported as the
// firmware does it: a firmware event report, a pause while the controller restarts, then frames
// numbered from 0 again with the firmware clock restarted. Settings become state frames.
// The same script and seed always give the same frames.

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "tools/GestureScript.h"

namespace TolkaTouch::Tools {

// Where one line of the script lies in the recording, in host clock nanoseconds. A gesture that
// takes no time (set, reset inside a touch) has start == end.
struct GestureSpan {
    Gesture gesture;
    uint64_t startNs = 0;
    uint64_t endNs = 0;
};

struct Synthesis {
    std::vector<PipelineRecording::Frame> frames;  // oldest first
    std::vector<GestureSpan> spans;                // one per gesture, in script order
};

inline constexpr uint64_t kSynthesisStartNs = 1'000'000'000'000;  // the host clock at the first frame
inline constexpr uint32_t kFramePeriodMs = 8;

// How the finger presses: a light finger presses 0.75 times as firmly as a normal one with a
// narrower tip, a heavy one 1.35 times as firmly with a wider tip. Brushes graze alike.
enum class Finger { Light, Normal, Heavy };

struct SynthesisOptions {
    Finger finger = Finger::Normal;
    double noiseDeviation = 2.0;  // the sensor noise, in signed counts
};

Synthesis synthesize(const GestureScript& script, uint64_t seed, const SynthesisOptions& options = {});

std::string_view fingerName(Finger finger);  // "light", "normal", "heavy"
std::optional<Finger> fingerFromName(std::string_view name);

// The frames as a recording, ready to be written with json().
PipelineRecording recordingFromSynthesis(const Synthesis& synthesis);

}  // namespace TolkaTouch::Tools

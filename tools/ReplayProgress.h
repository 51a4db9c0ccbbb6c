#pragma once
// ReplayProgress: the line a paced `tolkatouch replay` keeps on a terminal's standard error,
// "position / length, time left", redrawn a few times a second while the replay waits between
// frames, cleared before each event line and at the end. Shows nothing when disabled (standard
// error is no terminal, or the replay is fast).

#include <cstdint>
#include <functional>
#include <string>

#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::Tools {

class ReplayProgress {
public:
    ReplayProgress(double recordingSeconds, double speed, bool enabled);
    ~ReplayProgress();  // clears the line

    // A replay's sleep (ReplayOptions::sleep) that sleeps, then redraws the line when it is due.
    std::function<void(uint64_t microseconds)> sleeper();
    void clear();  // before anything else is written to the terminal

    // The line's text at `elapsedSeconds` of wall time since the replay started.
    std::string text(double elapsedSeconds) const;

private:
    void draw();

    double _recordingSeconds;
    double _speed;
    bool _enabled;
    bool _shown = false;
    uint64_t _start = 0;      // host clock nanoseconds
    uint64_t _lastDrawn = 0;
};

// Seconds from a recording's first frame to its last.
double recordingSeconds(const PipelineRecording& recording);

}  // namespace TolkaTouch::Tools

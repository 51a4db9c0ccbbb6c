#include "tools/ReplayProgress.h"

#include <time.h>

#include <algorithm>
#include <cstdio>

#include <fmt/format.h>

#include "platform/HostClock.h"

namespace TolkaTouch::Tools {

namespace {
constexpr uint64_t kRedrawNanoseconds = 250'000'000;

uint64_t nowNanoseconds() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1'000'000'000ull + static_cast<uint64_t>(now.tv_nsec);
}

std::string clock(double seconds) {
    const auto whole = static_cast<long long>(std::max(0.0, seconds));
    return fmt::format("{}:{:02}", whole / 60, whole % 60);
}
}  // namespace

ReplayProgress::ReplayProgress(double recordingSeconds, double speed, bool enabled)
    : _recordingSeconds(recordingSeconds), _speed(speed > 0 ? speed : 1.0), _enabled(enabled), _start(nowNanoseconds()) {}

ReplayProgress::~ReplayProgress() { clear(); }

std::function<void(uint64_t)> ReplayProgress::sleeper() {
    return [this](uint64_t microseconds) {
        Host::sleepMicroseconds(microseconds);
        draw();
    };
}

std::string ReplayProgress::text(double elapsedSeconds) const {
    const double position = std::min(_recordingSeconds, elapsedSeconds * _speed);
    const double left = (_recordingSeconds - position) / _speed;
    return fmt::format("{} / {}, {} left", clock(position), clock(_recordingSeconds), clock(left));
}

void ReplayProgress::draw() {
    if (!_enabled) return;
    const uint64_t now = nowNanoseconds();
    if (_shown && now - _lastDrawn < kRedrawNanoseconds) return;
    _lastDrawn = now;
    const std::string line = "\r\033[K" + text(static_cast<double>(now - _start) / 1e9);
    std::fputs(line.c_str(), stderr);
    std::fflush(stderr);
    _shown = true;
}

void ReplayProgress::clear() {
    if (!_shown) return;
    std::fputs("\r\033[K", stderr);
    std::fflush(stderr);
    _shown = false;
}

double recordingSeconds(const PipelineRecording& recording) {
    const auto& frames = recording.frames();
    if (frames.size() < 2) return 0.0;
    return static_cast<double>(static_cast<int64_t>(frames.back().timestamp - frames.front().timestamp)) / 1e9;
}

}  // namespace TolkaTouch::Tools

#include "daemon/SimulationFeeder.h"

#include <time.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <optional>
#include <stdexcept>
#include <system_error>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingFrameReader.h"

namespace TolkaTouch {

namespace {
// The playback's downstream: reports go to the device, settings to the service.
class FeederInput final : public PipelineInput {
public:
    explicit FeederInput(SimulationFeeder::Target& target) : _target(target) {}
    void setTime(uint64_t) override {}  // the service stamps events with its own clock
    void setState(const std::string& key, PropertyValue value) override { _target.applySetting(key, value); }
    void handleInputReport(const uint8_t* bytes, size_t length) override { _target.writeReport(bytes, length); }

private:
    SimulationFeeder::Target& _target;
};
}  // namespace

// The frames of either form, a frame at a time: only the frames stay in memory, never the text.
std::unique_ptr<PipelineRecording> SimulationFeeder::readFrames(const std::string& path) {
    auto reader = RecordingFrameReader::openFile(path);
    auto recording = std::make_unique<PipelineRecording>();
    PipelineRecording::Frame frame;
    while (reader->next(frame)) recording->appendFrame(std::move(frame));
    return recording;
}

SimulationFeeder::SimulationFeeder(const std::string& path, float speed) : _path(path), _speed(speed) {
    try {
        _recording = readFrames(path);
    } catch (const std::system_error& error) {
        throw std::runtime_error("cannot read the recording " + path + ": " + error.code().message());
    } catch (const std::exception& error) {
        throw std::runtime_error("the recording " + path + " cannot be played: " + error.what());
    }
}

SimulationFeeder::~SimulationFeeder() {
    stop();
}

void SimulationFeeder::start(Target target) {
    _recording->clock.sleepMicroseconds = [this](uint64_t microseconds) { pause(microseconds); };
    _thread = std::thread([this, target = std::move(target)]() mutable { run(std::move(target)); });
}

void SimulationFeeder::requestStop() {
    _stopping = true;
}

void SimulationFeeder::stop() {
    requestStop();
    if (_thread.joinable()) _thread.join();
}

// Plain sleeps, the cheapest wait there is (at 125 reports a second the daemon's own cost is
// mostly wake-ups), in slices short enough that a stop request is seen within kStopLatency.
void SimulationFeeder::pause(uint64_t microseconds) {
    constexpr uint64_t kStopLatencyNs = 50'000'000;
    // A gap of a day or more in a recording is a broken clock, not a pause worth keeping.
    constexpr uint64_t kLongestPause = 86'400'000'000;
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    uint64_t start = static_cast<uint64_t>(now.tv_sec) * 1'000'000'000 + static_cast<uint64_t>(now.tv_nsec);
    uint64_t deadline = start + std::min(microseconds, kLongestPause) * 1000;
    for (uint64_t wake = start; !_stopping && wake < deadline;) {
        wake = std::min(deadline, wake + kStopLatencyNs);
        timespec until{static_cast<time_t>(wake / 1'000'000'000), static_cast<long>(wake % 1'000'000'000)};
        while (::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &until, nullptr) == EINTR) {
        }
    }
}

void SimulationFeeder::run(Target target) {
    auto input = std::make_shared<FeederInput>(target);
    _recording->pipeline = input;
    _recording->playReset();
    while (!_stopping && _recording->playCanContinue()) _recording->playNextFrame(_speed);
    _recording->pipeline.reset();
    if (!_stopping) target.finished();
}

}  // namespace TolkaTouch

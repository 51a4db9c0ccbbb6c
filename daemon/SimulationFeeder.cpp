#include "daemon/SimulationFeeder.h"

#include <algorithm>
#include <stdexcept>
#include <system_error>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingFrameReader.h"

namespace TolkaTouch {

struct SimulationFeeder::NextFrame {
    PipelineRecording::Frame frame;
    bool present = false;
};

namespace {
using Clock = std::chrono::steady_clock;  // CLOCK_MONOTONIC, the device's timer's clock

uint64_t nowNanoseconds() {
    const auto sinceBoot = std::chrono::duration_cast<std::chrono::nanoseconds>(Clock::now().time_since_epoch());
    return static_cast<uint64_t>(sinceBoot.count());
}

// The playback's downstream: reports go to the device with their due time, settings to the service.
class FeederInput final : public PipelineInput {
public:
    FeederInput(SimulationFeeder::Target& target, const uint64_t& due) : _target(target), _due(due) {}
    void setTime(uint64_t) override {}  // the service stamps events with its own clock
    void setState(const std::string& key, PropertyValue value) override { _target.applySetting(key, value); }
    void handleInputReport(const uint8_t* bytes, size_t length) override { _target.writeReport(bytes, length, _due); }

private:
    SimulationFeeder::Target& _target;
    const uint64_t& _due;
};
}  // namespace

SimulationFeeder::SimulationFeeder(const std::string& path, float speed)
    : _path(path), _speed(speed), _next(std::make_unique<NextFrame>()) {
    try {
        _reader = RecordingFrameReader::openFile(path, {}, RecordingFrameReader::Reading::AsItComes);
        _next->present = _reader->next(_next->frame);
    } catch (const std::system_error& error) {
        throw std::runtime_error("cannot read the recording " + path + ": " + error.code().message());
    } catch (const std::exception& error) {
        throw std::runtime_error("the recording " + path + " cannot be played: " + error.what());
    }
    _framesRead = _next->present ? 1 : 0;
}

SimulationFeeder::~SimulationFeeder() {
    stop();
}

void SimulationFeeder::start(Target target) {
    _thread = std::thread([this, target = std::move(target)]() mutable { run(std::move(target)); });
}

void SimulationFeeder::requestStop() {
    {
        std::lock_guard lock(_mutex);
        _stopping = true;
    }
    _stopChanged.notify_all();
}

void SimulationFeeder::stop() {
    requestStop();
    if (_thread.joinable()) _thread.join();
}

// No sleep per report: the due time moves on, and the thread waits only when it is kLead ahead,
// then until it may write kBatch more. A stop request ends the wait at once.
void SimulationFeeder::pause(uint64_t microseconds) {
    // A gap of a day or more in a recording is a broken clock, not a pause worth keeping.
    constexpr uint64_t kLongestPause = 86'400'000'000;
    _due += std::min(microseconds, kLongestPause) * 1000;
    const auto lead = static_cast<uint64_t>(kLead.count());
    if (_due <= nowNanoseconds() + lead) return;
    const Clock::time_point wake{std::chrono::nanoseconds(_due - lead + static_cast<uint64_t>(kBatch.count()))};
    std::unique_lock lock(_mutex);
    _stopChanged.wait_until(lock, wake, [this] { return _stopping.load(); });
}

std::string SimulationFeeder::cannotBePlayed(const std::exception& error) const {
    std::string message = "the recording " + _path + " cannot be played after " + std::to_string(_framesRead) +
                          (_framesRead == 1 ? " frame: " : " frames: ") + error.what();
    const auto* read = dynamic_cast<const RecordingReadError*>(&error);
    if (read != nullptr && !read->detail().empty()) message += " (" + read->detail() + ")";
    return message;
}

// The frame after the one played; false at the end, or after telling the target it does not read.
bool SimulationFeeder::readNext(const Target& target) {
    try {
        _next->present = _reader->next(_next->frame);
    } catch (const std::system_error& error) {
        if (target.failed) target.failed("cannot read the recording " + _path + ": " + error.code().message());
        return false;
    } catch (const std::exception& error) {
        if (target.failed) target.failed(cannotBePlayed(error));
        return false;
    }
    if (_next->present) ++_framesRead;
    return true;
}

void SimulationFeeder::run(Target target) {
    PipelineRecording playback;
    playback.pipeline = std::make_shared<FeederInput>(target, _due);
    playback.clock.sleepMicroseconds = [this](uint64_t microseconds) { pause(microseconds); };
    playback.playReset();
    _due = nowNanoseconds();
    while (_next->present && !_stopping) {
        playback.playFrame(_next->frame, _speed);
        if (!readNext(target)) return;
    }
    _reader.reset();  // the document is closed before the daemon's work ends
    if (!_stopping) target.finished();
}

}  // namespace TolkaTouch

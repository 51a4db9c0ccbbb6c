#pragma once
// SimulationFeeder: plays a recording document into the simulated device on a thread of its own,
// paced at the recorded times (divided by a speed factor), as the surface would have sent it.
// Recorded settings are applied through the service's properties once every report recorded
// before them has been handled. Reading and pacing a document is the recording's own playback,
// so the document format and its timing live in one place; this is the daemon's one use of the
// pipeline library, and nothing of the recognition runs here. The recording (either form) is read
// a frame at a time, so that a long recording costs the daemon only its frames.

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

class PipelineRecording;

class SimulationFeeder {
public:
    struct Target {
        // Queues one input report on the simulated device.
        std::function<void(const uint8_t* bytes, size_t length)> writeReport;
        // Applies a recorded setting (its key as recorded, "Algs.HoldTimeoutMilliseconds") once
        // every report written so far has been handled.
        std::function<void(const std::string& key, const PropertyValue& value)> applySetting;
        // Called on the feeder's thread after the last frame, unless stop() came first.
        std::function<void()> finished;
    };

    // Reads the document at `path`. Throws std::runtime_error with a one-line message when it
    // cannot be read or is not a recording document.
    SimulationFeeder(const std::string& path, float speed);
    ~SimulationFeeder();  // stops
    SimulationFeeder(const SimulationFeeder&) = delete;
    SimulationFeeder& operator=(const SimulationFeeder&) = delete;

    const std::string& path() const { return _path; }

    void start(Target target);
    // Asks the thread to end: a pacing pause ends within 50 ms and no further frame is started.
    // A target call in progress (a setting waiting for its reports) must be woken by the caller;
    // it can ask stopRequested().
    void requestStop();
    bool stopRequested() const { return _stopping.load(); }
    // requestStop(), then waits for the thread to end. Idempotent.
    void stop();

private:
    static std::unique_ptr<PipelineRecording> readFrames(const std::string& path);
    void run(Target target);
    void pause(uint64_t microseconds);

    std::string _path;
    float _speed;
    std::unique_ptr<PipelineRecording> _recording;
    std::thread _thread;
    std::atomic<bool> _stopping{false};
};

}  // namespace TolkaTouch

#pragma once
// SimulationFeeder: plays a recording document into the simulated device on a thread of its own,
// paced at the recorded times (divided by a speed factor), as the surface would have sent it.
// Recorded settings are applied through the service's properties once every report recorded
// before them has been handled. Reading and pacing a document is the recording's own playback,
// so the document format and its timing live in one place; this is the daemon's one use of the
// pipeline library, and nothing of the recognition runs here.
//
// The recording (either form) is read a frame at a time as it is played, so that the daemon's
// memory does not grow with the document and a stop is answered at once however long it is. The
// first frame is read before anything is played, so a file that is not a recording is refused
// up front; a frame further on that does not read ends the playback there (failed()), after the
// frames before it have been played.
//
// Reports are handed to the device with the time each is due, up to kLead ahead of it, so that
// the feeder's thread wakes once for a batch of reports and the device's own timer paces them.

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

class RecordingFrameReader;

class SimulationFeeder {
public:
    struct Target {
        // Queues one input report on the simulated device, to be handled at `due` (CLOCK_MONOTONIC
        // nanoseconds; the feeder writes a report at most kLead before it is due).
        std::function<void(const uint8_t* bytes, size_t length, uint64_t due)> writeReport;
        // Applies a recorded setting (its key as recorded, "Algs.HoldTimeoutMilliseconds") once
        // every report written so far has been handled.
        std::function<void(const std::string& key, const PropertyValue& value)> applySetting;
        // Called on the feeder's thread after the last frame, unless stop() came first.
        std::function<void()> finished;
        // Called on the feeder's thread instead of finished() when a frame does not read: a one-line
        // message naming the document and where in it ("the recording PATH cannot be played after
        // 120 frames: invalid frame type (in frame 121, at byte 5230)").
        std::function<void(const std::string& message)> failed;
    };

    // How far ahead of its time a report is written, and how much the feeder writes each time it
    // wakes: reports due in the next kLead - kBatch to kLead wait on the device. A second's worth
    // a wake-up: on a machine where waking a thread costs as much as handling a report, the
    // feeder's wake-ups are a cost of their own (150 reports of 73 bytes wait at most).
    static constexpr std::chrono::nanoseconds kLead = std::chrono::milliseconds(1200);
    static constexpr std::chrono::nanoseconds kBatch = std::chrono::milliseconds(1000);

    // Opens the document at `path` and reads its first frame. Throws std::runtime_error with a
    // one-line message when it cannot be read or is not a recording document.
    SimulationFeeder(const std::string& path, float speed);
    ~SimulationFeeder();  // stops
    SimulationFeeder(const SimulationFeeder&) = delete;
    SimulationFeeder& operator=(const SimulationFeeder&) = delete;

    const std::string& path() const { return _path; }

    void start(Target target);
    // Asks the thread to end: a pacing pause ends at once and no further frame is started.
    // A target call in progress (a setting waiting for its reports) must be woken by the caller;
    // it can ask stopRequested().
    void requestStop();
    bool stopRequested() const { return _stopping.load(); }
    // requestStop(), then waits for the thread to end. Idempotent.
    void stop();

private:
    void run(Target target);
    // Moves the due time on by the recorded pause, then waits while the report would be written
    // more than kLead ahead of its time.
    void pause(uint64_t microseconds);
    bool readNext(const Target& target);
    std::string cannotBePlayed(const std::exception& error) const;

    std::string _path;
    float _speed;
    std::unique_ptr<RecordingFrameReader> _reader;
    struct NextFrame;  // the next frame to play, if any
    std::unique_ptr<NextFrame> _next;
    uint64_t _framesRead = 0;
    uint64_t _due = 0;  // CLOCK_MONOTONIC nanoseconds at which the next report is due
    std::thread _thread;
    std::mutex _mutex;  // with _stopChanged: a pause waits on it
    std::condition_variable _stopChanged;
    std::atomic<bool> _stopping{false};
};

}  // namespace TolkaTouch

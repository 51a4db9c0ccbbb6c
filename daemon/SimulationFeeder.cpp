#include "daemon/SimulationFeeder.h"

#include "platform/PropertyValueJson.h"

#include <time.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <optional>
#include <stdexcept>
#include <system_error>

#include <nlohmann/json.hpp>

#include "pipeline/PipelineRecording.h"

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

namespace {
using nlohmann::json;

// The whole document, for the recording's reader. Throws std::system_error when it cannot be read.
std::vector<uint8_t> readWholeFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) throw std::system_error(errno, std::generic_category());
    std::vector<uint8_t> data((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    if (file.bad()) throw std::system_error(EIO, std::generic_category());
    return data;
}

// Reads a document a frame at a time: each element of its "Frames" (or, in the older layout,
// "Reports") goes through the recording's own reader as a one-frame document of the same
// version, and only the frames stay. A long recording never sits in memory as JSON, which would
// otherwise be most of what the daemon holds. Anything out of the ordinary (a parse error, an
// element that does not read, the version after the frames, no frames at all) answers null, and
// the caller reads the whole document instead, for its exact result or message.
class StreamingReader {
public:
    std::unique_ptr<PipelineRecording> read(std::istream& in) {
        auto recording = std::make_unique<PipelineRecording>();
        _recording = recording.get();
        try {
            // What is left of the document (its version and the emptied array) is not needed.
            [[maybe_unused]] json rest = json::parse(in, [this](int depth, json::parse_event_t event, json& parsed) {
                return handle(depth, event, parsed);
            });
        } catch (const std::exception&) {
            return nullptr;
        }
        if (_unusual || _recording->frames().empty()) return nullptr;
        return recording;
    }

private:
    bool handle(int depth, json::parse_event_t event, json& parsed) {
        using Event = json::parse_event_t;
        if (_unusual) return false;
        // A value nested deeper than any document may be is not kept (writing it back out would
        // recurse that deep); the whole-document reader then refuses the document with its message.
        if (depth > static_cast<int>(PropertyValueJson::kMaxNestingDepth)) {
            _unusual = true;
            return false;
        }
        if (depth == 0 && event == Event::array_start) _unusual = true;
        if (depth == 1) {
            bool framesKey = _key == "Frames" || _key == "Reports";
            switch (event) {
            case Event::key: _key = parsed.get<std::string>(); break;
            case Event::value:
                if (_key == "Version") _version = parsed;
                if (framesKey) _unusual = true;
                break;
            case Event::object_start:
                if (framesKey) _unusual = true;
                break;
            case Event::array_start:
                if (framesKey) {
                    if (!_arrayKey.empty() || !_version) _unusual = true;
                    _arrayKey = _key;
                    _inFrames = true;
                }
                break;
            case Event::array_end: _inFrames = false; break;
            default: break;
            }
            return true;
        }
        bool elementDone = depth == 2 && _inFrames &&
                           (event == Event::value || event == Event::object_end || event == Event::array_end);
        if (!elementDone) return true;
        json document = json::object();
        document["Version"] = *_version;
        document[_arrayKey] = json::array({std::move(parsed)});
        std::string text = document.dump();
        std::vector<uint8_t> bytes(text.begin(), text.end());
        PipelineRecording one(&bytes);  // throws as it would for the whole document
        for (const auto& frame : one.frames()) _recording->appendFrame(frame);
        return false;  // the element is done with: drop it
    }

    PipelineRecording* _recording = nullptr;
    std::string _key;
    std::string _arrayKey;
    std::optional<json> _version;
    bool _inFrames = false;
    bool _unusual = false;
};
}  // namespace

std::unique_ptr<PipelineRecording> SimulationFeeder::readStreaming(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) throw std::system_error(errno, std::generic_category());
    return StreamingReader().read(file);
}

PipelineRecording SimulationFeeder::readWhole(const std::string& path) {
    std::vector<uint8_t> data = readWholeFile(path);
    return PipelineRecording(&data);
}

SimulationFeeder::SimulationFeeder(const std::string& path, float speed) : _path(path), _speed(speed) {
    try {
        _recording = readStreaming(path);
        if (!_recording) _recording = std::make_unique<PipelineRecording>(readWhole(path));
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

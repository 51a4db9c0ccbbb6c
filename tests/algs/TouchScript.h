#pragma once
// TouchScript: whole touches for the recognizer's tests, written as "a finger on pixels C and D
// at strength 600 from 100 ms to 300 ms". Strength is the scaled value a pixel should reach; the
// script divides it by the pixel's gain to get the reading, and plays one image every 8 ms.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

#include "algs/Algs.h"
#include "common/Reports.h"

namespace TolkaTouch::Testing {

inline constexpr uint32_t kFramePeriodMs = 8;

// The reading that pixel `index` turns into about `strength` once scaled by its gain.
inline int16_t readingFor(size_t index, double strength) {
    const double reading = std::lround(strength / static_cast<double>(Algs::pixelGains.at(index)));
    return static_cast<int16_t>(std::clamp(reading, -32768.0, 32767.0));
}

// One event as the tests compare it.
struct EventRecord {
    uint32_t phase;
    uint32_t eventMask;
    double region;  // the event's y
    int64_t frameNumber;
    bool operator==(const EventRecord&) const = default;
};

inline std::ostream& operator<<(std::ostream& os, const EventRecord& e) {
    return os << "{phase " << e.phase << ", mask 0x" << std::hex << e.eventMask << std::dec << ", region " << e.region
              << ", frame " << e.frameNumber << "}";
}

inline EventRecord recordOf(const HIDEvent& event) {
    return {event.phase, event.eventMask, event.y, event.integerValue(kDigitizerFrameNumberField)};
}

// Expected events, by kind.
inline EventRecord mayBegin(int region, int64_t frame) { return {128, 0, double(region), frame}; }
inline EventRecord holdStart(int region, int64_t frame) { return {1, 2, double(region), frame}; }
inline EventRecord holdChange(int region, int64_t frame) { return {2, 2, double(region), frame}; }
inline EventRecord holdEnd(int region, int64_t frame) { return {4, 2, double(region), frame}; }
inline EventRecord tap(int region, int64_t frame) { return {0, 0x20000, double(region), frame}; }
inline EventRecord cancel(int64_t frame) { return {8, 0, 0.0, frame}; }

class TouchScript {
public:
    // Frames are numbered from firstFrame and timed from startMs on, one every 8 ms.
    explicit TouchScript(Algs& algs, uint32_t startMs = 1000, uint32_t firstFrame = 100)
        : _algs(algs), _nextTimeMs(startMs), _nextFrame(firstFrame) {}

    // A finger on `letters` ("CD") at `strength` from fromMs (inclusive) to toMs (exclusive).
    TouchScript& touch(const std::string& letters, double strength, uint32_t fromMs, uint32_t toMs) {
        return ramp(letters, strength, strength, fromMs, toMs);
    }

    // The same, with the strength moving linearly from `from` at fromMs to `to` at toMs.
    TouchScript& ramp(const std::string& letters, double from, double to, uint32_t fromMs, uint32_t toMs) {
        _contacts.push_back({letters, from, to, fromMs, toMs});
        return *this;
    }

    // The image at timeMs with the next frame number (does not advance the script).
    InputReport::Image imageAt(uint32_t timeMs) const {
        InputReport::Image image{};
        image.frameNumber = _nextFrame;
        image.timeMs = timeMs;
        double strength[kPixelCount] = {};
        for (const Contact& c : _contacts) {
            if (timeMs < c.fromMs || timeMs >= c.toMs) continue;
            const double t = c.toMs - c.fromMs > 1 ? double(timeMs - c.fromMs) / double(c.toMs - 1 - c.fromMs) : 0.0;
            const double s = c.from + (c.to - c.from) * std::min(t, 1.0);
            for (char letter : c.letters) strength[static_cast<size_t>(letter - 'A')] += s;
        }
        for (size_t i = 0; i < kPixelCount; ++i) {
            image.pixels[i] = readingFor(i, strength[i]);
            image.rawPixels[i] = static_cast<uint16_t>(image.pixels[i]);
        }
        return image;
    }

    // Plays every frame up to and including untilMs; returns the events in order.
    std::vector<EventRecord> playUntil(uint32_t untilMs) {
        std::vector<EventRecord> events;
        while (_nextTimeMs <= untilMs) {
            const InputReport::Image image = imageAt(_nextTimeMs);
            for (const HIDEventRef& event : _algs.handleImage(image)) events.push_back(recordOf(*event));
            _lastFrame = _nextFrame;
            ++_nextFrame;
            _nextTimeMs += kFramePeriodMs;
        }
        return events;
    }

    // The frame number at time timeMs (which must lie on the 8 ms grid of the script).
    int64_t frameAt(uint32_t timeMs) const { return _firstFrame + (timeMs - _startMs) / kFramePeriodMs; }

    uint32_t nextTimeMs() const { return _nextTimeMs; }
    uint32_t lastFrame() const { return _lastFrame; }

private:
    struct Contact {
        std::string letters;
        double from;
        double to;
        uint32_t fromMs;
        uint32_t toMs;
    };

    Algs& _algs;
    std::vector<Contact> _contacts;
    uint32_t _nextTimeMs;
    uint32_t _nextFrame;
    const uint32_t _startMs = _nextTimeMs;
    const uint32_t _firstFrame = _nextFrame;
    uint32_t _lastFrame = 0;
};

}  // namespace TolkaTouch::Testing

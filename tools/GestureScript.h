#pragma once
// A gesture script: one gesture per line, read by `tolkatouch synth`.
//
//   tap <zone> <duration>            a deliberate short touch
//   hold <zone> <duration>           a touch held past the hold timeout
//   slide <zone> <zone> <duration>   a hold that moves to another zone half-way (between
//                                    volume-up and volume-down it crosses play-pause)
//   brush <zone> <duration>          a light grazing touch that must not count
//   wait <duration>                  nothing on the surface
//   reset [<offset>]                 a firmware reset; with an offset, that far into the
//                                    gesture on the line before (e.g. in the middle of a hold)
//   set <key> <value>                a setting written through the recording (value as JSON,
//                                    otherwise text)
//   # ...                            a comment, also after a gesture
//
// Zones: play-pause, volume-up, volume-down. Durations: 120ms, 1.5s, or a bare number of ms.

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "common/Reports.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch::Tools {

enum class Zone { PlayPause, VolumeUp, VolumeDown };

PixelRegion regionOfZone(Zone zone);
std::string_view zoneName(Zone zone);
std::optional<Zone> zoneFromName(std::string_view name);

enum class GestureKind { Tap, Hold, Slide, Brush, Wait, Reset, Set };

std::string_view gestureKindName(GestureKind kind);

struct Gesture {
    GestureKind kind = GestureKind::Wait;
    int line = 0;                       // 1-based line of the script
    Zone zone = Zone::PlayPause;        // tap, hold, brush; where a slide starts
    Zone toZone = Zone::PlayPause;      // where a slide ends
    uint32_t durationMs = 0;            // tap, hold, slide, brush, wait; a reset's offset
    bool hasOffset = false;             // reset inside the gesture before it
    std::string key;                    // set
    PropertyValue value;                // set
};

// "line <n>: <what is wrong>"
class GestureScriptError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct GestureScript {
    std::vector<Gesture> gestures;

    // Throws GestureScriptError for the first line that does not read.
    static GestureScript parse(std::string_view text);
};

// "120ms", "1.5s" or "120" (milliseconds); nothing for anything else or beyond a day.
std::optional<uint32_t> durationFromText(std::string_view text);

}  // namespace TolkaTouch::Tools

#include "tools/GestureScript.h"

#include <charconv>
#include <cmath>
#include <cstdlib>

#include "tools/SettingValue.h"

namespace TolkaTouch::Tools {

namespace {

constexpr double kLongestDurationMs = 24.0 * 3600.0 * 1000.0;
constexpr uint32_t kShortestSlideMs = 1000;
// The finger model samples the surface every 8 ms: a touch shorter than two frames is not one.
constexpr uint32_t kShortestTouchMs = 16;
// A brush is a passing finger; one lingering longer is a touch the finger model does not make.
constexpr uint32_t kLongestBrushMs = 400;
// A longer script would make a document of gigabytes; an hour is already 450,000 frames.
constexpr uint64_t kLongestScriptMs = 3600 * 1000;

// The words of one line up to a "#"; a quoted value of `set` may hold a "#" or spaces, so the
// rest of a `set` line after its key is taken whole.
std::vector<std::string_view> words(std::string_view line) {
    std::vector<std::string_view> result;
    size_t position = 0;
    while (position < line.size()) {
        while (position < line.size() && (line[position] == ' ' || line[position] == '\t')) ++position;
        if (position >= line.size() || line[position] == '#') break;
        size_t end = position;
        while (end < line.size() && line[end] != ' ' && line[end] != '\t') ++end;
        result.push_back(line.substr(position, end - position));
        position = end;
    }
    return result;
}

std::string_view trimmed(std::string_view text) {
    while (!text.empty() && (text.front() == ' ' || text.front() == '\t' || text.front() == '\r')) text.remove_prefix(1);
    while (!text.empty() && (text.back() == ' ' || text.back() == '\t' || text.back() == '\r')) text.remove_suffix(1);
    return text;
}

[[noreturn]] void fail(int line, const std::string& message) {
    throw GestureScriptError("line " + std::to_string(line) + ": " + message);
}

Zone zoneArgument(std::string_view word, int line) {
    if (auto zone = zoneFromName(word)) return *zone;
    fail(line, "unknown zone '" + std::string(word) + "' (play-pause, volume-up, volume-down)");
}

uint32_t durationArgument(std::string_view word, int line) {
    if (auto duration = durationFromText(word)) return *duration;
    fail(line, "bad duration '" + std::string(word) + "' (e.g. 120ms, 1.5s)");
}

void expectWords(const std::vector<std::string_view>& parts, size_t count, int line, const char* usage) {
    if (parts.size() != count) fail(line, std::string("expected '") + usage + "'");
}

// A `set` line: the key, then everything up to the end of the line as the value's text. A "#"
// after the value starts a comment unless the value is a quoted string.
Gesture setGesture(std::string_view line, int lineNumber) {
    std::string_view rest = trimmed(line);
    rest.remove_prefix(3);  // "set"
    rest = trimmed(rest);
    const size_t keyEnd = rest.find_first_of(" \t");
    if (rest.empty() || rest.front() == '#' || keyEnd == std::string_view::npos) {
        fail(lineNumber, "expected 'set <key> <value>'");
    }
    Gesture gesture;
    gesture.kind = GestureKind::Set;
    gesture.key = std::string(rest.substr(0, keyEnd));
    std::string_view valueText = trimmed(rest.substr(keyEnd));
    if (!valueText.empty() && valueText.front() != '"') {
        valueText = trimmed(valueText.substr(0, valueText.find('#')));
    }
    if (valueText.empty()) fail(lineNumber, "expected 'set <key> <value>'");
    gesture.value = settingValueFromText(valueText);
    return gesture;
}

Gesture parseLine(std::string_view line, int lineNumber) {
    const std::vector<std::string_view> parts = words(line);
    const std::string_view verb = parts.front();
    Gesture gesture;
    if (verb == "tap" || verb == "hold" || verb == "brush") {
        expectWords(parts, 3, lineNumber,
                    verb == "tap" ? "tap <zone> <duration>" : verb == "hold" ? "hold <zone> <duration>" : "brush <zone> <duration>");
        gesture.kind = verb == "tap" ? GestureKind::Tap : verb == "hold" ? GestureKind::Hold : GestureKind::Brush;
        gesture.zone = zoneArgument(parts[1], lineNumber);
        gesture.durationMs = durationArgument(parts[2], lineNumber);
        if (gesture.durationMs < kShortestTouchMs) fail(lineNumber, "a touch lasts at least 16ms (two frames)");
        if (gesture.kind == GestureKind::Brush && gesture.durationMs > kLongestBrushMs) {
            fail(lineNumber, "a brush lasts at most 400ms: a finger that stays longer touches");
        }
    } else if (verb == "slide") {
        expectWords(parts, 4, lineNumber, "slide <zone> <zone> <duration>");
        gesture.kind = GestureKind::Slide;
        gesture.zone = zoneArgument(parts[1], lineNumber);
        gesture.toZone = zoneArgument(parts[2], lineNumber);
        gesture.durationMs = durationArgument(parts[3], lineNumber);
        if (gesture.zone == gesture.toZone) fail(lineNumber, "a slide needs two different zones");
        if (gesture.durationMs < kShortestSlideMs) fail(lineNumber, "a slide lasts at least 1s: it is held before it moves");
    } else if (verb == "wait") {
        expectWords(parts, 2, lineNumber, "wait <duration>");
        gesture.kind = GestureKind::Wait;
        gesture.durationMs = durationArgument(parts[1], lineNumber);
    } else if (verb == "reset") {
        if (parts.size() > 2) fail(lineNumber, "expected 'reset' or 'reset <offset>'");
        gesture.kind = GestureKind::Reset;
        if (parts.size() == 2) {
            gesture.hasOffset = true;
            gesture.durationMs = durationArgument(parts[1], lineNumber);
        }
    } else if (verb == "set") {
        return setGesture(line, lineNumber);
    } else {
        fail(lineNumber, "unknown gesture '" + std::string(verb) + "' (tap, hold, slide, brush, wait, reset, set)");
    }
    return gesture;
}

}  // namespace

PixelRegion regionOfZone(Zone zone) {
    switch (zone) {
    case Zone::PlayPause: return PixelRegion::PlayPause;
    case Zone::VolumeUp: return PixelRegion::VolumeUp;
    case Zone::VolumeDown: return PixelRegion::VolumeDown;
    }
    return PixelRegion::None;
}

std::string_view zoneName(Zone zone) {
    switch (zone) {
    case Zone::PlayPause: return "play-pause";
    case Zone::VolumeUp: return "volume-up";
    case Zone::VolumeDown: return "volume-down";
    }
    return "";
}

std::optional<Zone> zoneFromName(std::string_view name) {
    for (Zone zone : {Zone::PlayPause, Zone::VolumeUp, Zone::VolumeDown}) {
        if (zoneName(zone) == name) return zone;
    }
    return std::nullopt;
}

std::string_view gestureKindName(GestureKind kind) {
    switch (kind) {
    case GestureKind::Tap: return "tap";
    case GestureKind::Hold: return "hold";
    case GestureKind::Slide: return "slide";
    case GestureKind::Brush: return "brush";
    case GestureKind::Wait: return "wait";
    case GestureKind::Reset: return "reset";
    case GestureKind::Set: return "set";
    }
    return "";
}

std::optional<uint32_t> durationFromText(std::string_view text) {
    double scale = 1.0;
    if (text.ends_with("ms")) {
        text.remove_suffix(2);
    } else if (text.ends_with("s")) {
        text.remove_suffix(1);
        scale = 1000.0;
    }
    if (text.empty()) return std::nullopt;
    double value = 0.0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || !(value >= 0.0)) return std::nullopt;
    const double milliseconds = std::round(value * scale);
    if (milliseconds > kLongestDurationMs) return std::nullopt;
    return static_cast<uint32_t>(milliseconds);
}

GestureScript GestureScript::parse(std::string_view text) {
    GestureScript script;
    uint64_t totalMs = 0;
    int lineNumber = 0;
    size_t position = 0;
    while (position <= text.size()) {
        size_t end = text.find('\n', position);
        if (end == std::string_view::npos) end = text.size();
        std::string_view line = text.substr(position, end - position);
        if (line.ends_with('\r')) line.remove_suffix(1);  // a script written with CRLF line ends
        ++lineNumber;
        position = end + 1;
        if (words(line).empty()) continue;
        Gesture gesture = parseLine(line, lineNumber);
        gesture.line = lineNumber;
        if (gesture.kind == GestureKind::Reset && gesture.hasOffset) {
            const Gesture* previous = nullptr;
            for (auto it = script.gestures.rbegin(); it != script.gestures.rend(); ++it) {
                const bool placedInside = it->kind == GestureKind::Set || (it->kind == GestureKind::Reset && it->hasOffset);
                if (!placedInside) {
                    previous = &*it;
                    break;
                }
            }
            const bool isTouch = previous != nullptr && previous->kind != GestureKind::Wait && previous->kind != GestureKind::Reset;
            if (!isTouch || gesture.durationMs >= previous->durationMs) {
                fail(lineNumber, "a reset offset must fall inside the touch on a line before it");
            }
            if (previous->kind == GestureKind::Slide || previous->kind == GestureKind::Brush) {
                fail(lineNumber, "a reset can fall inside a tap or a hold, not inside a slide or a brush");
            }
        }
        const bool takesTime = gesture.kind != GestureKind::Set && gesture.kind != GestureKind::Reset;
        if (takesTime) totalMs += gesture.durationMs;
        if (totalMs > kLongestScriptMs) fail(lineNumber, "the script lasts longer than an hour");
        script.gestures.push_back(std::move(gesture));
    }
    return script;
}

}  // namespace TolkaTouch::Tools

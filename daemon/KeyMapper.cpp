#include "daemon/KeyMapper.h"

#include <linux/input-event-codes.h>

#include "tolkatouch/Gesture.h"

namespace TolkaTouch {

namespace {
std::optional<uint16_t> tapKey(uint32_t region) {
    switch (region) {
    case 1: return KEY_PLAYPAUSE;
    case 2: return KEY_VOLUMEDOWN;
    case 3: return KEY_VOLUMEUP;
    default: return std::nullopt;
    }
}

std::optional<uint16_t> holdVolumeKey(uint32_t region) {
    switch (region) {
    case 2: return KEY_VOLUMEDOWN;
    case 3: return KEY_VOLUMEUP;
    default: return std::nullopt;
    }
}

}  // namespace

KeyMapper::KeyMapper(KeyOutput& output, Clock clock) : _output(output), _clock(std::move(clock)) {}

void KeyMapper::handleEvent(const HIDEvent& event) {
    const std::optional<Gesture> gesture = GestureCodec::decode(event);
    if (!gesture) return;
    const auto region = static_cast<uint32_t>(gesture->region);
    switch (gesture->kind) {
    case GestureKind::Reset:
        _log.log("the surface's firmware reported a reset");
        break;
    case GestureKind::Tap:
        if (auto key = tapKey(region)) pressAndRelease(*key);
        break;
    case GestureKind::HoldStart:
        releaseAll();
        if (gesture->region == PixelRegion::PlayPause) {
            pressAndRelease(KEY_VOICECOMMAND);
        } else {
            holdRegion(region);
        }
        break;
    case GestureKind::HoldChange:
        holdRegion(region);
        break;
    case GestureKind::HoldEnd:
    case GestureKind::Cancel:
        releaseAll();
        break;
    case GestureKind::MayBegin:  // announces a touch; nothing to press yet
        break;
    }
}

std::optional<std::chrono::nanoseconds> KeyMapper::nextRepeatTime() const {
    if (!_heldKey) return std::nullopt;
    return _nextRepeat;
}

void KeyMapper::repeatDue() {
    if (!_heldKey) return;
    auto now = _clock();
    if (now < _nextRepeat) return;
    // Each step is a fresh press: input stacks commonly drop the kernel's autorepeat value, and a
    // volume key steps once per press.
    _output.write({*_heldKey, KeyValue::Release});
    _output.write({*_heldKey, KeyValue::Press});
    _nextRepeat += kRepeatInterval;
    if (_nextRepeat <= now) _nextRepeat = now + kRepeatInterval;
}

void KeyMapper::releaseAll() {
    if (!_heldKey) return;
    _output.write({*_heldKey, KeyValue::Release});
    _heldKey.reset();
}

void KeyMapper::pressAndRelease(uint16_t code) {
    _output.write({code, KeyValue::Press});
    _output.write({code, KeyValue::Release});
}

// A hold moved to (or began in) a region: its volume key is held and repeats; region 1 and no
// region hold nothing.
void KeyMapper::holdRegion(uint32_t region) {
    auto key = holdVolumeKey(region);
    if (key == _heldKey) return;
    releaseAll();
    if (!key) return;
    _output.write({*key, KeyValue::Press});
    _heldKey = key;
    _nextRepeat = _clock() + kRepeatInterval;
}

}  // namespace TolkaTouch

#pragma once
// KeyMapper: turns the surface's gesture events into media key writes. A tap in region 1 is
// play/pause, in region 2 volume down, in region 3 volume up; a hold in region 1 asks for the
// voice assistant; a hold in region 2 or 3 holds its volume key down and steps it again every
// 150 ms until the hold ends. Pure logic on an injectable clock: the caller asks when the next
// repeat is due and calls repeatDue() then; nothing here sleeps or owns a timer.

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>

#include "daemon/KeyOutput.h"
#include "platform/HIDEvent.h"
#include "platform/Log.h"

namespace TolkaTouch {

class KeyMapper {
public:
    using Clock = std::function<std::chrono::nanoseconds()>;
    static constexpr std::chrono::nanoseconds kRepeatInterval = std::chrono::milliseconds(150);

    KeyMapper(KeyOutput& output, Clock clock);

    void handleEvent(const HIDEvent& event);

    // The clock reading at which repeatDue() has the next step to write; empty when no key is held.
    std::optional<std::chrono::nanoseconds> nextRepeatTime() const;

    // Writes the repeat step that is due by now, if any. A late call writes one step, not a burst.
    void repeatDue();

    // Lets go of a held key (hold end, cancel, device gone, shutdown).
    void releaseAll();

    // The key held down, if any.
    std::optional<uint16_t> heldKey() const { return _heldKey; }

private:
    void pressAndRelease(uint16_t code);
    void holdRegion(uint32_t region);

    KeyOutput& _output;
    Clock _clock;
    std::optional<uint16_t> _heldKey;
    std::chrono::nanoseconds _nextRepeat{0};
    Log _log{"com.zantor.hid.TolkaTouch", "Daemon"};
};

}  // namespace TolkaTouch

#pragma once
// RecognisedGestures: the recognizer's events of one replay folded into whole gestures, the unit
// that labels are matched against. A tap is one; a hold runs from hold start to hold end (or to
// the firmware reset or the end of the recording that cuts it), and a hold that ends in another
// zone than it began is a slide. May-begin gives a gesture its touch start; a cancel (a touch
// turned down) makes no gesture.

#include <cstdint>
#include <vector>

#include "tolkatouch/Gesture.h"

namespace TolkaTouch::Workbench {

enum class Recognised : uint8_t { Tap, Hold, Slide, Nothing };
inline constexpr size_t kRecognisedCount = 4;

struct RecognisedGesture {
    Recognised kind = Recognised::Nothing;
    PixelRegion zone = PixelRegion::None;    // where it began
    PixelRegion toZone = PixelRegion::None;  // where a slide ended
    int64_t startUs = 0;    // the touch start (may-begin), from the recording's first frame
    int64_t decidedUs = 0;  // the event that decided it: tap or hold start
    int64_t endUs = 0;      // tap, hold end, or what cut the hold
    bool operator==(const RecognisedGesture&) const = default;
};

class GestureCollector {
public:
    // Events in the order the recognizer gave them, with their times from the first frame.
    void add(const Gesture& gesture, int64_t timeUs);
    // The gestures, in the order they were decided; a hold still open ends at endUs.
    std::vector<RecognisedGesture> finish(int64_t endUs);

private:
    void closeHold(int64_t timeUs);

    std::vector<RecognisedGesture> _gestures;
    bool _touchPending = false;
    int64_t _touchStartUs = 0;
    bool _holding = false;
    RecognisedGesture _hold;
};

std::string_view recognisedName(Recognised kind);  // "tap", "hold", "slide", "nothing"

}  // namespace TolkaTouch::Workbench

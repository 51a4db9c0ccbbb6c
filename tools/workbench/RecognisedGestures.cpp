#include "tools/workbench/RecognisedGestures.h"

namespace TolkaTouch::Workbench {

void GestureCollector::closeHold(int64_t timeUs) {
    if (!_holding) return;
    _hold.endUs = timeUs;
    if (_hold.toZone != _hold.zone) {
        _hold.kind = Recognised::Slide;
    } else {
        _hold.toZone = PixelRegion::None;
    }
    _gestures.push_back(_hold);
    _holding = false;
}

void GestureCollector::add(const Gesture& gesture, int64_t timeUs) {
    switch (gesture.kind) {
    case GestureKind::MayBegin:
        _touchPending = true;
        _touchStartUs = timeUs;
        break;
    case GestureKind::Tap:
        _gestures.push_back(RecognisedGesture{Recognised::Tap, gesture.region, PixelRegion::None,
                                              _touchPending ? _touchStartUs : timeUs, timeUs, timeUs});
        _touchPending = false;
        break;
    case GestureKind::Cancel:
        _touchPending = false;
        break;
    case GestureKind::HoldStart:
        closeHold(timeUs);
        _hold = RecognisedGesture{Recognised::Hold, gesture.region, gesture.region, _touchPending ? _touchStartUs : timeUs, timeUs, timeUs};
        _holding = true;
        _touchPending = false;
        break;
    case GestureKind::HoldChange:
        if (_holding) _hold.toZone = gesture.region;
        break;
    case GestureKind::HoldEnd:
        closeHold(timeUs);
        break;
    case GestureKind::Reset:
        closeHold(timeUs);
        _touchPending = false;
        break;
    }
}

std::vector<RecognisedGesture> GestureCollector::finish(int64_t endUs) {
    closeHold(endUs);
    _touchPending = false;
    return std::move(_gestures);
}

std::string_view recognisedName(Recognised kind) {
    switch (kind) {
    case Recognised::Tap: return "tap";
    case Recognised::Hold: return "hold";
    case Recognised::Slide: return "slide";
    case Recognised::Nothing: return "nothing";
    }
    return "";
}

}  // namespace TolkaTouch::Workbench

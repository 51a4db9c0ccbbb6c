#pragma once
// Replaying a recording document through a fresh recognizer, for programs that embed it
// (libtolkatouch): every frame at once, each event as `tolkatouch replay --fast` reports it.

#include <cstdint>
#include <functional>
#include <span>
#include <stdexcept>

#include "platform/HIDEvent.h"

namespace TolkaTouch {

// A document the reader refuses; what() is the reader's one-line reason.
class DocumentError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// Plays every frame of a recording document (the bytes of a version 0 or 1 document) into a fresh
// pipeline with the default settings, and hands each event to onEvent once the pipeline has
// stamped it with its frame's recorded time. Throws DocumentError, before any event, for a
// document it cannot read. GestureCodec (tolkatouch/Gesture.h) tells what an event carries.
void replayDocument(std::span<const uint8_t> document, const std::function<void(const HIDEvent&)>& onEvent);

}  // namespace TolkaTouch

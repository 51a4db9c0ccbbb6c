#pragma once
// EventList: the ordered events that handling one report produced. A frame gives at most one
// event and a firmware reset adds one more, so two are held in place and a list only reaches
// the heap beyond that: handing a frame's event on costs the event's own allocation and no other.

#include <array>
#include <cstddef>
#include <initializer_list>
#include <utility>
#include <vector>

#include "platform/HIDEvent.h"

namespace TolkaTouch {

class EventList {
public:
    using value_type = HIDEventRef;
    using iterator = HIDEventRef*;
    using const_iterator = const HIDEventRef*;

    EventList() = default;
    EventList(std::initializer_list<HIDEventRef> events) {
        for (const HIDEventRef& event : events) push_back(event);
    }
    EventList(const EventList& other) = default;
    EventList& operator=(const EventList& other) = default;
    // A list moved from is empty, as a moved-from standard container is in practice.
    EventList(EventList&& other) noexcept
        : _held(std::move(other._held)), _spilled(std::move(other._spilled)), _size(other._size) {
        other.clear();
    }
    EventList& operator=(EventList&& other) noexcept {
        if (this != &other) {
            _held = std::move(other._held);
            _spilled = std::move(other._spilled);
            _size = other._size;
            other.clear();
        }
        return *this;
    }

    void push_back(HIDEventRef event) {
        if (_spilled.empty() && _size < kHeld) {
            _held[_size++] = std::move(event);
            return;
        }
        if (_spilled.empty()) {
            // The third event: every event moves to the heap, so the list stays one run.
            _spilled.reserve(2 * kHeld);
            for (HIDEventRef& held : _held) _spilled.push_back(std::move(held));
        }
        _spilled.push_back(std::move(event));
        ++_size;
    }

    // Drops every reference; the list holds its events in place again afterwards.
    void clear() {
        for (HIDEventRef& held : _held) held.reset();
        _spilled.clear();
        _size = 0;
    }

    size_t size() const { return _size; }
    bool empty() const { return _size == 0; }

    HIDEventRef* data() { return _spilled.empty() ? _held.data() : _spilled.data(); }
    const HIDEventRef* data() const { return _spilled.empty() ? _held.data() : _spilled.data(); }
    iterator begin() { return data(); }
    iterator end() { return data() + _size; }
    const_iterator begin() const { return data(); }
    const_iterator end() const { return data() + _size; }

    HIDEventRef& operator[](size_t i) { return data()[i]; }
    const HIDEventRef& operator[](size_t i) const { return data()[i]; }
    HIDEventRef& front() { return data()[0]; }
    const HIDEventRef& front() const { return data()[0]; }
    HIDEventRef& back() { return data()[_size - 1]; }
    const HIDEventRef& back() const { return data()[_size - 1]; }

private:
    static constexpr size_t kHeld = 2;

    std::array<HIDEventRef, kHeld> _held;  // the first two events, while the list has no more
    std::vector<HIDEventRef> _spilled;     // every event, once a third was added
    size_t _size = 0;
};

}  // namespace TolkaTouch

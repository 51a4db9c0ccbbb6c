#include "daemon/LiveFrames.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include <nlohmann/json.hpp>

#include "platform/PropertyValueJson.h"

namespace TolkaTouch {

LiveFrames::LiveFrames(Clock clock) : _clock(std::move(clock)) {
    _wakeFd = ::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC);
    if (_wakeFd < 0) throw std::runtime_error(std::string("cannot create the live frame queue: ") + std::strerror(errno));
}

LiveFrames::~LiveFrames() {
    if (_wakeFd >= 0) ::close(_wakeFd);
}

bool LiveFrames::due() {
    if (!active()) return false;
    const int64_t now = _clock().count();
    int64_t next = _nextDue.load(std::memory_order_relaxed);
    if (now < next) return false;
    // The next one a period after this one's due time keeps the average at the cap; after a
    // pause (or at the start) it counts from now, so that no burst makes up for the pause.
    const int64_t period = kPeriod.count();
    const int64_t following = next != INT64_MIN && now - next < period ? next + period : now + period;
    // Another device's report thread may have taken this period: then this frame is not due.
    return _nextDue.compare_exchange_strong(next, following, std::memory_order_relaxed);
}

void LiveFrames::hand(uint32_t service, PropertyValue snapshot) {
    bool replacing = false;
    {
        std::lock_guard lock(_slotMutex);
        replacing = _slot.has_value();
        _slot.emplace(service, std::move(snapshot));
    }
    if (replacing) {
        _replaced.fetch_add(1, std::memory_order_relaxed);
        return;  // the loop has been woken for the one replaced
    }
    const uint64_t one = 1;
    [[maybe_unused]] ssize_t written = ::write(_wakeFd, &one, sizeof one);
}

std::optional<std::string> LiveFrames::take() {
    uint64_t count;
    [[maybe_unused]] ssize_t got = ::read(_wakeFd, &count, sizeof count);
    std::optional<std::pair<uint32_t, PropertyValue>> taken;
    {
        std::lock_guard lock(_slotMutex);
        taken.swap(_slot);
    }
    if (!taken || !taken->second.isDictionary()) return std::nullopt;
    nlohmann::ordered_json frame{{"service", taken->first}};
    frame.update(PropertyValueJson::toJson(taken->second));
    return nlohmann::ordered_json{{"frame", std::move(frame)}}.dump(-1, ' ', false,
                                                                     nlohmann::ordered_json::error_handler_t::replace);
}

}  // namespace TolkaTouch

#include "platform/SimulatedHIDDevice.h"

#include <sys/eventfd.h>
#include <sys/timerfd.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

#include "platform/HostClock.h"

namespace TolkaTouch {

namespace {
uint64_t monotonicNanoseconds() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1'000'000'000 + static_cast<uint64_t>(now.tv_nsec);
}
}  // namespace

std::shared_ptr<SimulatedHIDDevice> SimulatedHIDDevice::create(PropertyValue::Dictionary properties,
                                                               Delivery delivery) {
    // Semaphore mode: each read takes one count, so the descriptor stays readable while reports wait.
    const int inputFd = delivery == Delivery::AtOnce ? eventfd(0, EFD_SEMAPHORE | EFD_NONBLOCK | EFD_CLOEXEC)
                                                     : timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC);
    if (inputFd < 0) {
        return nullptr;
    }
    return std::shared_ptr<SimulatedHIDDevice>(new SimulatedHIDDevice(inputFd, delivery, std::move(properties)));
}

SimulatedHIDDevice::SimulatedHIDDevice(int inputFd, Delivery delivery, PropertyValue::Dictionary properties)
    : _inputFd(inputFd), _delivery(delivery), _deviceProperties(std::move(properties)) {}

SimulatedHIDDevice::~SimulatedHIDDevice() {
    unscheduleAll();
    ::close(_inputFd);
}

bool SimulatedHIDDevice::writeInputReport(std::vector<uint8_t> bytes, uint64_t due) {
    return writeInputReport(bytes.data(), bytes.size(), due);
}

void SimulatedHIDDevice::pushLocked(const uint8_t* bytes, size_t length, uint64_t due) {
    if (_count == _ring.size()) {
        // Full: a ring twice the size, the waiting reports first and in order.
        std::vector<Waiting> larger(std::max<size_t>(16, 2 * _ring.size()));
        for (size_t index = 0; index < _count; ++index) {
            larger[index] = std::move(_ring[(_head + index) % _ring.size()]);
        }
        _ring.swap(larger);
        _head = 0;
    }
    Waiting& slot = _ring[(_head + _count) % _ring.size()];
    slot.bytes.assign(bytes, bytes + (bytes ? length : 0));
    slot.due = due;
    ++_count;
}

void SimulatedHIDDevice::popLocked() {
    _head = (_head + 1) % _ring.size();
    --_count;
}

bool SimulatedHIDDevice::writeInputReport(const uint8_t* bytes, size_t length, uint64_t due) {
    {
        std::lock_guard lock(_mutex);
        if (_ended) {
            return false;
        }
        pushLocked(bytes, length, due);
        if (_delivery == Delivery::AtDueTime) {
            // The timer is set for the first waiting report only; a later one's turn comes after it.
            if (_count == 1) setTimerLocked(due);
            return true;
        }
    }
    // Counted after the report is queued and outside the lock, so the woken reader finds the
    // report and does not have to wait for the writer to let go of the lock.
    const uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = ::write(_inputFd, &one, sizeof one);
    return true;
}

void SimulatedHIDDevice::simulateRemoval() {
    std::lock_guard lock(_mutex);
    if (_ended) {
        return;
    }
    _ended = true;
    if (_delivery == Delivery::AtDueTime) {
        // The end is read once the last report is: at once when none waits.
        if (_count == 0) setTimerLocked(0);
        return;
    }
    // One more count than reports: the read that finds the queue empty reports the end.
    const uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = ::write(_inputFd, &one, sizeof one);
}

// The timer fires at `due` (at once when that has passed); setting it forgets earlier firings.
void SimulatedHIDDevice::setTimerLocked(uint64_t due) {
    due = std::max<uint64_t>(due, 1);  // zero would disarm it
    const itimerspec timer{{0, 0}, {static_cast<time_t>(due / 1'000'000'000), static_cast<long>(due % 1'000'000'000)}};
    ::timerfd_settime(_inputFd, TFD_TIMER_ABSTIME, &timer, nullptr);
}

// Forgets a firing that stands for no report; the next write sets the timer again.
void SimulatedHIDDevice::forgetFiringLocked() {
    uint64_t firings = 0;
    [[maybe_unused]] const ssize_t got = ::read(_inputFd, &firings, sizeof firings);
}

// One report whose time has come, then the timer set for the next one; under the lock, so the
// timer always stands for the first waiting report when the lock is let go. Setting the timer
// also forgets its firing, so a report costs the reading thread one call besides its wait; the
// firing is read only when nothing follows.
HIDDeviceBase::ReadOutcome SimulatedHIDDevice::readDueReport(uint8_t* buffer, size_t capacity) {
    std::lock_guard lock(_mutex);
    if (_count == 0) {
        if (!_ended) forgetFiringLocked();
        return {_ended ? ReadStatus::Gone : ReadStatus::NothingToRead};
    }
    if (frontLocked().due > monotonicNanoseconds()) {
        setTimerLocked(frontLocked().due);
        return {ReadStatus::NothingToRead};
    }
    const std::vector<uint8_t>& report = frontLocked().bytes;
    const size_t length = std::min(report.size(), capacity);
    if (length > 0) {
        std::memcpy(buffer, report.data(), length);
    }
    popLocked();
    if (_count > 0) {
        setTimerLocked(frontLocked().due);
    } else if (_ended) {
        setTimerLocked(0);
    } else {
        forgetFiringLocked();
    }
    return {ReadStatus::Report, length};
}

size_t SimulatedHIDDevice::pendingInputReportCount() const {
    std::lock_guard lock(_mutex);
    return _count;
}

HIDDeviceBase::ReadOutcome SimulatedHIDDevice::readInputReport(uint8_t* buffer, size_t capacity) {
    if (_delivery == Delivery::AtDueTime) {
        return readDueReport(buffer, capacity);
    }
    std::lock_guard lock(_mutex);
    uint64_t count = 0;
    if (::read(_inputFd, &count, sizeof count) != static_cast<ssize_t>(sizeof count)) {
        return {ReadStatus::NothingToRead};
    }
    if (_count == 0) {
        return {_ended ? ReadStatus::Gone : ReadStatus::NothingToRead};
    }
    // Like a datagram read: what does not fit in the buffer is lost.
    const std::vector<uint8_t>& report = frontLocked().bytes;
    const size_t length = std::min(report.size(), capacity);
    if (length > 0) {
        std::memcpy(buffer, report.data(), length);
    }
    popLocked();
    return {ReadStatus::Report, length};
}

void SimulatedHIDDevice::setFeatureReport(uint32_t reportID, std::vector<uint8_t> bytes) {
    std::lock_guard lock(_mutex);
    _featureReports.insert_or_assign(reportID, std::move(bytes));
}

void SimulatedHIDDevice::failReport(uint32_t reportID, uint32_t result) {
    std::lock_guard lock(_mutex);
    if (result == HIDResult::Success) {
        _failures.erase(reportID);
    } else {
        _failures.insert_or_assign(reportID, result);
    }
}

void SimulatedHIDDevice::setDeviceProperty(std::string key, PropertyValue value) {
    std::lock_guard lock(_mutex);
    _deviceProperties.insert_or_assign(std::move(key), std::move(value));
}

void SimulatedHIDDevice::setTimestampSource(std::function<uint64_t()> now) {
    std::lock_guard lock(_mutex);
    _now = std::move(now);
}

uint64_t SimulatedHIDDevice::readTimestamp() const {
    std::function<uint64_t()> now;
    {
        std::lock_guard lock(_mutex);
        now = _now;
    }
    return now ? now() : Host::absoluteTime();
}

PropertyValue SimulatedHIDDevice::deviceProperty(std::string_view key) const {
    std::lock_guard lock(_mutex);
    auto found = _deviceProperties.find(key);
    return found == _deviceProperties.end() ? PropertyValue() : found->second;
}

uint32_t SimulatedHIDDevice::open(uint32_t options) {
    {
        std::lock_guard lock(_mutex);
        ++_counts.open;
        _counts.lastOpenOptions = options;
    }
    return HIDDeviceBase::open(options);
}

uint32_t SimulatedHIDDevice::close(uint32_t options) {
    {
        std::lock_guard lock(_mutex);
        ++_counts.close;
        _counts.lastCloseOptions = options;
    }
    return HIDDeviceBase::close(options);
}

uint32_t SimulatedHIDDevice::getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) {
    std::lock_guard lock(_mutex);
    ++_counts.getReport;
    if (buffer == nullptr || length == 0) {
        return HIDResult::BadArgument;
    }
    if (_ended) {
        return HIDResult::NoDevice;
    }
    if (auto failure = _failures.find(reportID); failure != _failures.end()) {
        return failure->second;
    }
    if (type != HIDReportType::Feature) {
        return HIDResult::Unsupported;
    }
    auto report = _featureReports.find(reportID);
    if (report == _featureReports.end()) {
        return HIDResult::Unsupported;
    }
    // Like the kernel's request: a report longer than the buffer is cut to the buffer's size.
    length = std::min(length, report->second.size());
    if (length > 0) {
        std::memcpy(buffer, report->second.data(), length);
    }
    return HIDResult::Success;
}

void SimulatedHIDDevice::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                                     void* context) {
    {
        std::lock_guard lock(_mutex);
        ++(callback ? _counts.registerCallback : _counts.unregisterCallback);
    }
    HIDDeviceBase::registerInputReportCallback(buffer, length, callback, context);
}

void SimulatedHIDDevice::scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) {
    {
        std::lock_guard lock(_mutex);
        ++_counts.schedule;
    }
    HIDDeviceBase::scheduleWithRunLoop(runLoop, mode);
}

void SimulatedHIDDevice::unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) {
    {
        std::lock_guard lock(_mutex);
        ++_counts.unschedule;
    }
    HIDDeviceBase::unscheduleFromRunLoop(runLoop, mode);
}

SimulatedHIDDevice::Counts SimulatedHIDDevice::counts() const {
    std::lock_guard lock(_mutex);
    return _counts;
}

}  // namespace TolkaTouch

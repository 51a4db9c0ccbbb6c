#include "platform/SimulatedHIDDevice.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

#include "platform/HostClock.h"

namespace TolkaTouch {

std::shared_ptr<SimulatedHIDDevice> SimulatedHIDDevice::create(PropertyValue::Dictionary properties) {
    // Semaphore mode: each read takes one count, so the descriptor stays readable while reports wait.
    const int eventFd = eventfd(0, EFD_SEMAPHORE | EFD_NONBLOCK | EFD_CLOEXEC);
    if (eventFd < 0) {
        return nullptr;
    }
    return std::shared_ptr<SimulatedHIDDevice>(new SimulatedHIDDevice(eventFd, std::move(properties)));
}

SimulatedHIDDevice::SimulatedHIDDevice(int eventFd, PropertyValue::Dictionary properties)
    : _eventFd(eventFd), _deviceProperties(std::move(properties)) {}

SimulatedHIDDevice::~SimulatedHIDDevice() {
    unscheduleAll();
    ::close(_eventFd);
}

bool SimulatedHIDDevice::writeInputReport(const uint8_t* bytes, size_t length) {
    return writeInputReport(std::vector<uint8_t>(bytes, bytes + (bytes ? length : 0)));
}

bool SimulatedHIDDevice::writeInputReport(std::vector<uint8_t> bytes) {
    {
        std::lock_guard lock(_mutex);
        if (_ended) {
            return false;
        }
        _reports.push_back(std::move(bytes));
    }
    // Counted after the report is queued and outside the lock, so the woken reader finds the
    // report and does not have to wait for the writer to let go of the lock.
    const uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = ::write(_eventFd, &one, sizeof one);
    return true;
}

void SimulatedHIDDevice::simulateRemoval() {
    std::lock_guard lock(_mutex);
    if (_ended) {
        return;
    }
    _ended = true;
    // One more count than reports: the read that finds the queue empty reports the end.
    const uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = ::write(_eventFd, &one, sizeof one);
}

size_t SimulatedHIDDevice::pendingInputReportCount() const {
    std::lock_guard lock(_mutex);
    return _reports.size();
}

HIDDeviceBase::ReadOutcome SimulatedHIDDevice::readInputReport(uint8_t* buffer, size_t capacity) {
    std::lock_guard lock(_mutex);
    uint64_t count = 0;
    if (::read(_eventFd, &count, sizeof count) != static_cast<ssize_t>(sizeof count)) {
        return {ReadStatus::NothingToRead};
    }
    if (_reports.empty()) {
        return {_ended ? ReadStatus::Gone : ReadStatus::NothingToRead};
    }
    const std::vector<uint8_t> report = std::move(_reports.front());
    _reports.pop_front();
    // Like a datagram read: what does not fit in the buffer is lost.
    const size_t length = std::min(report.size(), capacity);
    if (length > 0) {
        std::memcpy(buffer, report.data(), length);
    }
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

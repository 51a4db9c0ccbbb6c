#include "platform/HIDDeviceBase.h"

#include "platform/HostClock.h"
#include "platform/RunLoop.h"

namespace TolkaTouch {

namespace {
// Large enough for any HID report the kernel hands out.
constexpr size_t kDiscardBufferSize = 16384;
}  // namespace

HIDDeviceBase::~HIDDeviceBase() {
    // Normally done already by the concrete device; harmless when it was.
    unscheduleAll();
}

uint32_t HIDDeviceBase::open(uint32_t options) {
    if (_removed.load()) {
        return HIDResult::NoDevice;
    }
    _openOptions.store(options);
    _open.store(true);
    return HIDResult::Success;
}

uint32_t HIDDeviceBase::close(uint32_t) {
    return _open.exchange(false) ? HIDResult::Success : HIDResult::NotOpen;
}

PropertyValue HIDDeviceBase::getProperty(std::string_view key) const {
    {
        std::lock_guard lock(_propertiesMutex);
        auto found = _properties.find(key);
        if (found != _properties.end()) {
            return found->second;
        }
    }
    return deviceProperty(key);
}

bool HIDDeviceBase::setProperty(std::string_view key, PropertyValue value) {
    if (key.empty()) {
        return false;
    }
    std::lock_guard lock(_propertiesMutex);
    _properties.insert_or_assign(std::string(key), std::move(value));
    return true;
}

void HIDDeviceBase::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                                void* context) {
    std::lock_guard lock(_deliveryMutex);
    _callback = callback;
    _context = callback ? context : nullptr;
    _buffer = callback ? buffer : nullptr;
    _bufferLength = callback ? length : 0;
}

void HIDDeviceBase::setRemovalHandler(std::function<void()> handler) {
    std::lock_guard lock(_deliveryMutex);
    _removalHandler = std::move(handler);
}

void HIDDeviceBase::scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) {
    if (_removed.load()) {
        return;
    }
    std::lock_guard lock(_schedulesMutex);
    for (const Schedule& schedule : _schedules) {
        if (schedule.key == &runLoop && schedule.mode == mode) {
            return;
        }
    }
    const RunLoop::SourceID source =
        runLoop.addSource(inputFileDescriptor(), mode, [this] { handleReadable(); });
    if (source != 0) {
        _schedules.push_back(Schedule{runLoop.weak_from_this(), &runLoop, mode, source});
    }
}

void HIDDeviceBase::unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) {
    Schedule removed{};
    {
        std::lock_guard lock(_schedulesMutex);
        for (auto it = _schedules.begin(); it != _schedules.end(); ++it) {
            if (it->key == &runLoop && it->mode == mode) {
                removed = std::move(*it);
                _schedules.erase(it);
                break;
            }
        }
    }
    if (removed.source != 0) {
        runLoop.removeSource(removed.source);
    }
}

void HIDDeviceBase::unscheduleAll() {
    std::vector<Schedule> schedules;
    {
        std::lock_guard lock(_schedulesMutex);
        schedules.swap(_schedules);
    }
    for (const Schedule& schedule : schedules) {
        if (auto runLoop = schedule.runLoop.lock()) {
            runLoop->removeSource(schedule.source);
        }
    }
}

uint64_t HIDDeviceBase::readTimestamp() const {
    return Host::absoluteTime();
}

void HIDDeviceBase::handleReadable() {
    bool gone = false;
    {
        std::lock_guard lock(_deliveryMutex);
        const bool deliver = _callback != nullptr && _buffer != nullptr && _bufferLength > 0 && _open.load();
        uint8_t* buffer = _buffer;
        size_t capacity = _bufferLength;
        if (!deliver) {
            if (_discard.empty()) {
                _discard.resize(kDiscardBufferSize);
            }
            buffer = _discard.data();
            capacity = _discard.size();
        }
        const ReadOutcome outcome = readInputReport(buffer, capacity);
        if (outcome.status == ReadStatus::Report && deliver) {
            const uint32_t reportID = reportsAreNumbered() && outcome.length > 0 ? buffer[0] : 0;
            _callback(_context, HIDResult::Success, static_cast<HIDDevice*>(this), HIDReportType::Input, reportID,
                      buffer, outcome.length, readTimestamp());
        }
        gone = outcome.status == ReadStatus::Gone;
    }
    if (gone) {
        handleRemoval();
    }
}

void HIDDeviceBase::handleRemoval() {
    if (_removed.exchange(true)) {
        return;
    }
    unscheduleAll();
    std::function<void()> handler;
    {
        std::lock_guard lock(_deliveryMutex);
        handler = _removalHandler;
    }
    if (handler) {
        handler();
    }
}

}  // namespace TolkaTouch

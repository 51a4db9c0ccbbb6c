#pragma once
// HIDDevice: the handle through which the service reaches its HID device: open and close, device
// properties, feature reports by ID, and input reports delivered on a run loop to a registered
// callback. HidrawDevice talks to a kernel hidraw node; SimulatedHIDDevice is fed by a test or tool.

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/HIDResult.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

class RunLoop;

enum class HIDReportType : uint32_t { Input = 0, Output = 1, Feature = 2 };

class HIDDevice {
public:
    // Called on the run loop's thread for each input report. `report` points into the registered
    // buffer and holds `length` bytes; a numbered report starts with its ID byte, and `reportID`
    // is that byte (0 for a device without report IDs). `timestamp` is in host clock ticks
    // (Host::absoluteTime()) taken when the report was read. `sender` is the HIDDevice.
    using InputReportCallback = void (*)(void* context, uint32_t result, void* sender, HIDReportType type,
                                         uint32_t reportID, const uint8_t* report, size_t length,
                                         uint64_t timestamp);

    virtual ~HIDDevice() = default;

    // Input reports are delivered only while the device is open; reports that arrive while it is
    // closed are read and dropped. Options are kept but have no effect here. A device that went
    // away answers NoDevice.
    virtual uint32_t open(uint32_t options) = 0;
    virtual uint32_t close(uint32_t options) = 0;  // NotOpen when it was not open

    // The device's property, or one set through setProperty (which wins); null when neither.
    virtual PropertyValue getProperty(std::string_view key) const = 0;
    // Keeps the value in the handle's own dictionary; false only for an empty key.
    virtual bool setProperty(std::string_view key, PropertyValue value) = 0;

    // Reads a report of `type` and `reportID` into `buffer`, whose size is passed in `length` and
    // replaced by the number of bytes read. A report longer than the buffer is cut to the buffer's
    // size. Numbered reports start with their ID byte. A null buffer or zero length: BadArgument.
    virtual uint32_t getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) = 0;

    // Reports are read into `buffer` (a longer report is cut to `length` bytes) and handed to
    // `callback` with `context`. A null callback unregisters. Returns after any callback that is
    // running on another thread has returned, so the buffer may be freed afterwards.
    virtual void registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                             void* context) = 0;

    // Input reports arrive while `runLoop` runs in `mode`. Scheduling the same pair twice has no
    // further effect; the device unschedules itself when it is destroyed or goes away.
    virtual void scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) = 0;
    virtual void unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) = 0;

    // Called once, on the run loop's thread, when the device goes away (its node was removed or
    // its report stream ended); by then every run loop source of the device is removed.
    virtual void setRemovalHandler(std::function<void()> handler) = 0;
};

using HIDDeviceRef = std::shared_ptr<HIDDevice>;

}  // namespace TolkaTouch

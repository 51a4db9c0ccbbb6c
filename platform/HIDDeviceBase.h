#pragma once
// HIDDeviceBase: what every device handle shares: the open state, the handle's own property
// dictionary, input report callback registration, and delivery of reports read from one file
// descriptor on the run loops the device is scheduled on. A concrete device supplies the reading.

#include <atomic>
#include <mutex>
#include <vector>

#include "platform/HIDDevice.h"

namespace TolkaTouch {

class HIDDeviceBase : public HIDDevice {
public:
    ~HIDDeviceBase() override;

    uint32_t open(uint32_t options) override;
    uint32_t close(uint32_t options) override;
    PropertyValue getProperty(std::string_view key) const override;
    bool setProperty(std::string_view key, PropertyValue value) override;
    void registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) override;
    void setRemovalHandler(std::function<void()> handler) override;

    bool isOpen() const { return _open.load(); }
    bool isRemoved() const { return _removed.load(); }

protected:
    enum class ReadStatus { Report, NothingToRead, Gone };
    struct ReadOutcome {
        ReadStatus status;
        size_t length = 0;
    };

    // Reads one report into `buffer` (at most `capacity` bytes, the rest of a longer report is
    // dropped). Runs on a run loop's thread when inputFileDescriptor() is readable.
    virtual ReadOutcome readInputReport(uint8_t* buffer, size_t capacity) = 0;
    virtual int inputFileDescriptor() const = 0;
    // The device's own property (VendorID, ...), null when it has none.
    virtual PropertyValue deviceProperty(std::string_view key) const = 0;
    // Whether input reports start with a report ID byte.
    virtual bool reportsAreNumbered() const = 0;
    virtual uint64_t readTimestamp() const;

    // Removes every run loop source of the device. A concrete device calls it first thing in its
    // destructor, before it closes its file descriptor.
    void unscheduleAll();

private:
    struct Schedule {
        std::weak_ptr<RunLoop> runLoop;
        const RunLoop* key;
        std::string mode;
        uint64_t source;
    };

    void handleReadable();
    void handleRemoval();

    std::atomic<bool> _open{false};
    std::atomic<bool> _removed{false};
    std::atomic<uint32_t> _openOptions{0};

    mutable std::mutex _propertiesMutex;
    PropertyValue::Dictionary _properties;

    // Held while a report is read and delivered, and by registration, so that unregistering from
    // another thread waits for a callback in flight. Recursive: a callback may unregister itself.
    std::recursive_mutex _deliveryMutex;
    uint8_t* _buffer = nullptr;
    size_t _bufferLength = 0;
    InputReportCallback _callback = nullptr;
    void* _context = nullptr;
    std::vector<uint8_t> _discard;  // reads reports that nobody takes
    std::function<void()> _removalHandler;

    std::mutex _schedulesMutex;
    std::vector<Schedule> _schedules;
};

}  // namespace TolkaTouch

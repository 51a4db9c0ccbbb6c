#pragma once
// SimulatedHIDDevice: a device handle whose input reports are written by a test or tool, from any
// thread, and delivered on the run loop like a real device's. Feature reports, per-report failures
// and device properties are set up by the caller; calls into the handle are counted for tests.
//
// Written reports wait in an unbounded queue, so that each write is exactly one report (zero-length
// ones included) and a writer never blocks. The queue is a ring of slots whose storage is reused,
// so that a stream of reports allocates nothing once the ring has grown to the most that wait. Delivered at once, they are signalled through a
// semaphore-mode eventfd; delivered at their due times, through a timer set for the first waiting
// report, so that a writer may queue reports ahead of their time and each report costs the reading
// thread one wake-up and the writer none, as a real surface's report costs one read.

#include <map>
#include <vector>

#include "platform/HIDDeviceBase.h"

namespace TolkaTouch {

class SimulatedHIDDevice : public HIDDeviceBase {
public:
    enum class Delivery {
        AtOnce,     // a written report is readable at once
        AtDueTime,  // a written report is readable from its due time on, in the order written
    };

    // Null only when no eventfd or timer can be made.
    static std::shared_ptr<SimulatedHIDDevice> create(PropertyValue::Dictionary properties = {},
                                                      Delivery delivery = Delivery::AtOnce);
    ~SimulatedHIDDevice() override;

    // Queues one input report; false once the device was removed. `due` (CLOCK_MONOTONIC
    // nanoseconds) is when a device delivering at due times hands it out; it is ignored otherwise.
    bool writeInputReport(std::vector<uint8_t> bytes, uint64_t due = 0);
    bool writeInputReport(const uint8_t* bytes, size_t length, uint64_t due = 0);
    // Ends the report stream: reports already written are still delivered, then the device is
    // removed (its sources go and the removal handler runs on the run loop's thread).
    void simulateRemoval();
    size_t pendingInputReportCount() const;

    // Answer to getReport(Feature, id, ...): these bytes (numbered reports start with their ID).
    void setFeatureReport(uint32_t reportID, std::vector<uint8_t> bytes);
    // getReport of `reportID` (any type) answers `result`; Success clears the failure.
    void failReport(uint32_t reportID, uint32_t result);
    // A device property (what getProperty answers when the handle's own dictionary has no entry).
    void setDeviceProperty(std::string key, PropertyValue value);
    // Whether input reports carry a leading report ID byte (default true).
    void setUsesReportIDs(bool numbered) { _numbered.store(numbered); }
    // Time stamps of delivered reports; Host::absoluteTime() unless replaced.
    void setTimestampSource(std::function<uint64_t()> now);

    uint32_t open(uint32_t options) override;
    uint32_t close(uint32_t options) override;
    uint32_t getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) override;
    void registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) override;

    struct Counts {
        int open = 0;
        int close = 0;
        int registerCallback = 0;    // with a callback
        int unregisterCallback = 0;  // with a null callback
        int schedule = 0;
        int unschedule = 0;
        int getReport = 0;
        uint32_t lastOpenOptions = 0;
        uint32_t lastCloseOptions = 0;
        bool operator==(const Counts&) const = default;
    };
    Counts counts() const;

protected:
    ReadOutcome readInputReport(uint8_t* buffer, size_t capacity) override;
    int inputFileDescriptor() const override { return _inputFd; }
    PropertyValue deviceProperty(std::string_view key) const override;
    bool reportsAreNumbered() const override { return _numbered.load(); }
    uint64_t readTimestamp() const override;

private:
    struct Waiting {
        std::vector<uint8_t> bytes;  // its capacity is kept for the next report in the slot
        uint64_t due = 0;
    };

    SimulatedHIDDevice(int inputFd, Delivery delivery, PropertyValue::Dictionary properties);
    ReadOutcome readDueReport(uint8_t* buffer, size_t capacity);
    Waiting& frontLocked() { return _ring[_head]; }
    void pushLocked(const uint8_t* bytes, size_t length, uint64_t due);
    void popLocked();
    void setTimerLocked(uint64_t due);
    void forgetFiringLocked();

    const int _inputFd;  // an eventfd, or a timer for reports delivered at their due times
    const Delivery _delivery;
    std::atomic<bool> _numbered{true};

    mutable std::mutex _mutex;
    std::vector<Waiting> _ring;  // the waiting reports: _count slots from _head on, wrapping
    size_t _head = 0;
    size_t _count = 0;
    bool _ended = false;
    std::map<uint32_t, std::vector<uint8_t>> _featureReports;
    std::map<uint32_t, uint32_t> _failures;
    PropertyValue::Dictionary _deviceProperties;
    std::function<uint64_t()> _now;
    Counts _counts;
};

}  // namespace TolkaTouch

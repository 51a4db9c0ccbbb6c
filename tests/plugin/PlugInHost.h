#pragma once
// PlugInHost: drives the built plug-in library the way a host does, for the plug-in's tests: loads
// it with dlopen, creates the service through the exported factory, serves it a simulated device
// under a service handle of its own, and collects what reaches the event callback, the system log
// and the trace points.

#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "platform/DispatchQueue.h"
#include "platform/HIDDevice.h"
#include "platform/HIDEvent.h"
#include "platform/Log.h"
#include "platform/PropertyValue.h"
#include "platform/RunLoop.h"
#include "platform/SimulatedHIDDevice.h"
#include "platform/Trace.h"
#include "tolkatouch/HIDServicePlugin.h"

namespace TolkaTouch::Testing {

// The factory of the built library, loaded once per process and never unloaded (a detached
// input report thread may still be finishing its last lines when a service has gone).
Host::PlugInFactoryFunction plugInFactory();

// A service handle no other test of the process uses.
uint32_t uniqueServiceHandle();

// Calls `condition` until it holds or `seconds` pass; answers whether it held.
template <typename Condition>
bool eventually(Condition condition, double seconds = 20.0) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) return false;
        std::this_thread::sleep_for(std::chrono::microseconds(200));
    }
    return true;
}

// One call of the host's event callback.
struct ReceivedEvent {
    void* target;
    void* refcon;
    void* sender;
    HIDEventRef event;
    uint32_t options;
    std::thread::id thread;
    bool onQueue;  // the callback ran as a task of the collector's queue
};

// The target of the event callback: keeps every call, in order.
class EventCollector {
public:
    explicit EventCollector(DispatchQueueRef queue = {}) : _queue(std::move(queue)) {}

    static void callback(void* target, void* refcon, void* sender, const HIDEventRef& event, uint32_t options);

    std::vector<ReceivedEvent> events() const;
    size_t count() const;
    bool waitForCount(size_t count, double seconds = 20.0) const;

private:
    DispatchQueueRef _queue;
    mutable std::mutex _mutex;
    mutable std::condition_variable _changed;
    std::vector<ReceivedEvent> _events;
};

// A log sink that also notes the thread each line was written on.
class ThreadTaggedLogSink : public LogSink {
public:
    struct Line {
        LogRecord record;
        std::thread::id thread;
    };
    void write(const LogRecord& record) override;
    std::vector<Line> lines() const;
    // The messages of one category, in order.
    std::vector<std::string> messages(const std::string& category = "HIDService") const;
    void clear();

private:
    mutable std::mutex _mutex;
    std::vector<Line> _lines;
};

// Installs the sinks (debug level on) for the life of the object.
class SinkInstallation {
public:
    SinkInstallation();
    ~SinkInstallation();
    std::shared_ptr<ThreadTaggedLogSink> log = std::make_shared<ThreadTaggedLogSink>();
    std::shared_ptr<Trace::MemorySink> trace = std::make_shared<Trace::MemorySink>();
    std::vector<Trace::Record> traces(uint32_t code) const;
};

class PlugInHost {
public:
    // Registers a fresh simulated device under a new service handle, calls the factory and asks
    // for the service interface.
    PlugInHost();
    // Gives back the references still held, lets queued deliveries finish and unregisters the
    // service handle.
    ~PlugInHost();
    PlugInHost(const PlugInHost&) = delete;
    PlugInHost& operator=(const PlugInHost&) = delete;

    uint32_t serviceHandle;
    std::shared_ptr<SimulatedHIDDevice> device;
    Host::PlugInInterface** plugin = nullptr;
    Host::HIDServiceInterface** service = nullptr;
    DispatchQueueRef queue = DispatchQueue::create("plug-in test queue");
    EventCollector collector{queue};

    Host::Result start();
    bool open(uint32_t options = 0);
    void close(uint32_t options = 0);
    Host::Result stop();
    void setEventCallback();  // the collector, with target = &collector and refcon = this
    void schedule();
    void unschedule();
    // Start, open, set the callback and schedule.
    void run();
    // Unschedule, close and stop.
    void halt();
    PropertyValue copyProperty(const char* key);
    bool setProperty(const char* key, const PropertyValue& value);
    void write(const std::vector<uint8_t>& report);

    // Releases the service interface reference and the plug-in reference (the service goes).
    void release();

private:
    bool _released = false;
};

// A device that sends nothing and writes down every call the service makes of it, with the
// buffer lengths, report IDs and run loop modes it was given, so that a test can read exactly
// how the service uses its device. Scheduling adds a source that never fires, so a run loop in
// that mode waits until it is stopped.
class CallLogDevice : public HIDDevice {
public:
    CallLogDevice();
    ~CallLogDevice() override;

    uint32_t open(uint32_t options) override;
    uint32_t close(uint32_t options) override;
    PropertyValue getProperty(std::string_view key) const override;
    bool setProperty(std::string_view key, PropertyValue value) override;
    uint32_t getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) override;
    void registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) override;
    void setRemovalHandler(std::function<void()> handler) override;

    // "open 0", "getReport Feature 0x10 128", "register 512 callback context",
    // "schedule kHandleInputReportsRunLoopMode", "unschedule ...", "register 512 null null", ...
    std::vector<std::string> calls() const;
    // Whether every registration and unregistration named the same buffer.
    bool oneBufferThroughout() const;

private:
    void note(std::string call) const;

    mutable std::mutex _mutex;
    mutable std::vector<std::string> _calls;  // getProperty is const, and noted too
    std::vector<const uint8_t*> _buffers;
    int _neverReadable;
    RunLoop::SourceID _source = 0;
};

// Registers `device` under a new service handle for the life of the object.
class ServedDevice {
public:
    explicit ServedDevice(std::shared_ptr<HIDDevice> device);
    ~ServedDevice();
    ServedDevice(const ServedDevice&) = delete;
    ServedDevice& operator=(const ServedDevice&) = delete;
    uint32_t serviceHandle;
};

// Report bytes as the surface sends them.
std::vector<uint8_t> imageReport(uint32_t frameNumber, uint32_t timeMs, int16_t reading = 0);
std::vector<uint8_t> firmwareEventReport(uint8_t event, const std::vector<uint8_t>& context = {});

}  // namespace TolkaTouch::Testing

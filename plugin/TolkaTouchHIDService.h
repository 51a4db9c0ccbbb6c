#pragma once
// TolkaTouchHIDService: the touch surface's HID service. It opens the device the host matched,
// runs an input report thread that feeds every report, under one lock, into the recording and
// through it into the pipeline, delivers the pipeline's events to the host's callback on the
// host's dispatch queue, and exposes settings, counters, diagnostics and the recording as
// service properties.
//
// Threads: host threads call the lifecycle and property operations; one input report thread runs
// per scheduling; the host's queue runs the event deliveries. `_pipelineLock` guards the
// pipeline, the recording and the probes installed in the pipeline, and is never held while the
// host's callback runs. The host must unschedule before its last Release: the input report thread
// does not keep the service alive.

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>

#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"
#include "platform/DispatchQueue.h"
#include "platform/HIDDevice.h"
#include "platform/EventList.h"
#include "platform/HIDEvent.h"
#include "platform/Log.h"
#include "platform/PropertyValue.h"
#include "platform/RunLoop.h"
#include <semaphore>
#include "plugin/TolkaHIDService.h"

namespace TolkaTouch {

class TolkaTouchHIDService : public TolkaHIDService {
public:
    // Where and to whom events are delivered. The input report thread works on a copy taken when
    // it is scheduled; the copy holds its own reference to the queue.
    struct DispatchEventInfo {
        DispatchQueueRef queue;
        Host::HIDEventCallback callback = nullptr;
        void* target = nullptr;
        void* refcon = nullptr;
        void* sender = nullptr;  // the service's HID service interface handle
    };

    // The private run loop mode of the input report thread: only the device's reports and the
    // stop block wake it.
    static constexpr const char* kInputReportRunLoopMode = "kHandleInputReportsRunLoopMode";
    // The recording keeps this many input reports.
    static constexpr uint64_t kMaxRecordedReports = 1350;

    // init: the log, one pipeline and the recording in front of it, bounded to 1350 reports.
    TolkaTouchHIDService();

    Host::Result probeWithService(uint32_t service, const PropertyValue* properties, int32_t* outScore) override;
    Host::Result startWithService(uint32_t service, const PropertyValue* properties) override;
    Host::Result stop() override;
    bool openWithOptions(uint32_t options) override;
    void closeWithOptions(uint32_t options) override;
    PropertyValue getPropertyForKey(const char* key) override;
    bool setProperty(const PropertyValue& value, const char* key) override;
    void setEventCallback(Host::HIDEventCallback callback, void* target, void* refcon) override;
    void scheduleWithDispatchQueue(const DispatchQueueRef& queue) override;
    void unscheduleWithDispatchQueue(const DispatchQueueRef& queue) override;
    HIDEventRef copyEventWithType(uint32_t type, const HIDEventRef& matching, uint32_t options) override;
    Host::Result setOutputEvent(const HIDEventRef& event) override;

    // Runs on the input report thread: installs the probes, registers for the device's reports
    // and runs the thread's run loop until unschedule stops it, then undoes all of that.
    void handleInputReports(const DispatchEventInfo* dispatchEventInfo);

protected:
    ~TolkaTouchHIDService() override;  // dealloc

private:
    using InputReportHandler =
        std::function<void(int32_t type, uint8_t reportID, const uint8_t* report, uint64_t length, uint64_t timestamp)>;

    static void inputReportThread(TolkaTouchHIDService* service, DispatchEventInfo dispatchEventInfo);
    static void inputReportCallback(void* context, uint32_t result, void* sender, HIDReportType type,
                                    uint32_t reportID, const uint8_t* report, size_t length, uint64_t timestamp);
    void handleInputReport(int32_t type, uint8_t reportID, const uint8_t* report, uint64_t length,
                           uint64_t timestamp);

    // The six probes of the pipeline (TolkaTouchHIDServiceDispatch.cpp).
    void installProbes(const DispatchEventInfo* dispatchEventInfo);
    void removeProbes();
    void inputReportProbe(const uint8_t* report, uint64_t length);
    void invalidInputReportProbe(const uint8_t* report, uint64_t length);
    void firmwareEventProbe(const InputReport::FirmwareEvent& event);
    void imageProbe(const InputReport::Image& image);
    void disjointImageProbe(uint32_t previousFrameNumber, const InputReport::Image& image);
    void hidEventsProbe(const EventList& events, const DispatchEventInfo& dispatchEventInfo);
    void dispatchEvents(const EventList& events, const DispatchEventInfo& dispatchEventInfo);

    // Properties (TolkaTouchHIDServiceProperties.cpp).
    PropertyValue firmwareDebugReports();
    PropertyValue factoryResetHoldDuration();
    PropertyValue recordingDocument();
    PropertyValue servicePluginDebug();

protected:
    // Protected rather than private so that a derived service (and the tests, through one) can
    // look at the state the host cannot see.
    Log _log;
    HIDDeviceRef _tolkaDevice;
    std::shared_ptr<RunLoop> _inputReportRunLoop;
    std::shared_ptr<std::counting_semaphore<>> _inputReportThreadSignal;
    DispatchEventInfo _dispatchEventInfo;
    std::mutex _pipelineLock;
    std::shared_ptr<Pipeline> _pipeline;
    PipelineRecording _recording;
};

}  // namespace TolkaTouch

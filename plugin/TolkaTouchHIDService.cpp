// The service's lifecycle and its input report thread.
#include "plugin/TolkaTouchHIDService.h"

#include <thread>

#include "platform/HIDServiceRegistry.h"
#include "platform/ThreadPriority.h"

namespace TolkaTouch {

namespace {
// The thread must keep up with the device's frame rate whatever else the machine does.
constexpr int kInputReportThreadPriority = 63;
// Room for the largest report the device sends.
constexpr size_t kInputReportBufferLength = 512;
}  // namespace

TolkaTouchHIDService::TolkaTouchHIDService()
    : _log("com.zantor.hid.TolkaTouch", "HIDService"), _pipeline(std::make_shared<Pipeline>()) {
    _recording.pipeline = _pipeline;
    _recording.setMaxFrameCount(kMaxRecordedReports);
}

TolkaTouchHIDService::~TolkaTouchHIDService() {
    _log.debug("%s", "dealloc");
    _inputReportRunLoop.reset();
    _tolkaDevice.reset();
    freeInterfaceTables();
}

Host::Result TolkaTouchHIDService::probeWithService(uint32_t, const PropertyValue*, int32_t*) {
    // The score stays unwritten: the host keeps its own default.
    _log.debug("%s", "probeWithService:properties:outScore:");
    return HIDResult::Success;
}

Host::Result TolkaTouchHIDService::startWithService(uint32_t service, const PropertyValue*) {
    _log.debug("%s", "startWithService:properties:");
    _tolkaDevice = HIDServiceRegistry::createDevice(service);
    return _tolkaDevice ? HIDResult::Success : HIDResult::NotCreated;
}

Host::Result TolkaTouchHIDService::stop() {
    _log.debug("%s", "stop");
    _tolkaDevice.reset();
    return HIDResult::Success;
}

bool TolkaTouchHIDService::openWithOptions(uint32_t options) {
    _log.debug("openWithOptions:%jx", static_cast<uintmax_t>(options));
    // A host that opens before a successful start gets a refusal, not a crash.
    if (!_tolkaDevice) return false;
    return _tolkaDevice->open(options) == HIDResult::Success;
}

void TolkaTouchHIDService::closeWithOptions(uint32_t options) {
    _log.debug("closeWithOptions:%jx", static_cast<uintmax_t>(options));
    if (_tolkaDevice) _tolkaDevice->close(options);
}

void TolkaTouchHIDService::scheduleWithDispatchQueue(const DispatchQueueRef& queue) {
    _log.debug("%s", "scheduleWithDispatchQueue:");
    _dispatchEventInfo.queue = queue;
    _dispatchEventInfo.sender = getServiceInterface();
    DispatchEventInfo dispatchEventInfo = _dispatchEventInfo;
    _inputReportThreadSignal = std::make_shared<std::counting_semaphore<>>(0);
    std::thread(inputReportThread, this, std::move(dispatchEventInfo)).detach();
    // Returns once the thread has published its run loop, so that unschedule can always reach it.
    _inputReportThreadSignal->acquire();
}

void TolkaTouchHIDService::inputReportThread(TolkaTouchHIDService* service, DispatchEventInfo dispatchEventInfo) {
    // The thread's own references: once it has signalled the end, unschedule returns and the host
    // may release the service at once, so nothing of the service is touched after that signal.
    std::shared_ptr<std::counting_semaphore<>> signal = service->_inputReportThreadSignal;
    Log log = service->_log;

    log.debug("%s", "input report thread start");
    service->_inputReportRunLoop = RunLoop::current();
    signal->release();
    service->handleInputReports(&dispatchEventInfo);
    dispatchEventInfo = {};
    signal->release();
    log.debug("%s", "input report thread end");
}

void TolkaTouchHIDService::handleInputReports(const DispatchEventInfo* dispatchEventInfo) {
    if (int error = setCurrentThreadRealtime(kSchedulingPolicyRoundRobin, kInputReportThreadPriority); error != 0) {
        _log.error("pthread_setschedparam failed: %d", error);
    }

    InputReportHandler handler = [this](int32_t type, uint8_t reportID, const uint8_t* report, uint64_t length,
                                        uint64_t timestamp) {
        handleInputReport(type, reportID, report, length, timestamp);
    };

    {
        std::lock_guard lock(_pipelineLock);
        installProbes(dispatchEventInfo);
    }

    std::shared_ptr<RunLoop> runLoop = RunLoop::current();
    auto reportBuffer = std::make_unique<uint8_t[]>(kInputReportBufferLength);
    // A host that schedules before a successful start has no device here: the run loop then has
    // nothing to serve in its mode and the thread ends at once; unschedule still finds it done.
    HIDDeviceRef device = _tolkaDevice;
    if (device) {
        device->registerInputReportCallback(reportBuffer.get(), kInputReportBufferLength, inputReportCallback,
                                            &handler);
        device->scheduleWithRunLoop(*runLoop, kInputReportRunLoopMode);
    }

    while (runLoop->runInMode(kInputReportRunLoopMode, RunLoop::kInfinite, true) ==
           RunLoop::RunResult::HandledSource) {
    }

    if (device) {
        device->unscheduleFromRunLoop(*runLoop, kInputReportRunLoopMode);
        device->registerInputReportCallback(reportBuffer.get(), kInputReportBufferLength, nullptr, nullptr);
    }

    {
        std::lock_guard lock(_pipelineLock);
        removeProbes();
    }
}

void TolkaTouchHIDService::inputReportCallback(void* context, uint32_t, void*, HIDReportType type,
                                               uint32_t reportID, const uint8_t* report, size_t length,
                                               uint64_t timestamp) {
    auto& handler = *static_cast<InputReportHandler*>(context);
    handler(static_cast<int32_t>(type), static_cast<uint8_t>(reportID), report, length, timestamp);
}

void TolkaTouchHIDService::unscheduleWithDispatchQueue(const DispatchQueueRef&) {
    _log.debug("%s", "unscheduleWithDispatchQueue:");
    if (_inputReportRunLoop) {
        _log.debug("%s", "signalling input report thread to exit");
        _inputReportRunLoop->performBlock(kInputReportRunLoopMode, [] { RunLoop::current()->stop(); });
        _inputReportRunLoop->wakeUp();
        _inputReportRunLoop.reset();
        _log.debug("%s", "waiting for input report thread to exit");
        _inputReportThreadSignal->acquire();
        _inputReportThreadSignal.reset();
        _log.debug("%s", "input report thread exited");
    }
    _dispatchEventInfo.queue.reset();
}

void TolkaTouchHIDService::setEventCallback(Host::HIDEventCallback callback, void* target, void* refcon) {
    _log.debug("%s", "setEventCallback:target:refcon:");
    _dispatchEventInfo.callback = callback;
    _dispatchEventInfo.target = target;
    _dispatchEventInfo.refcon = refcon;
}

HIDEventRef TolkaTouchHIDService::copyEventWithType(uint32_t, const HIDEventRef&, uint32_t) {
    _log.debug("%s", "copyEventWithType:matching:options:");
    return nullptr;
}

Host::Result TolkaTouchHIDService::setOutputEvent(const HIDEventRef&) {
    _log.debug("%s", "setOutputEvent:");
    return HIDResult::Unsupported;
}

}  // namespace TolkaTouch

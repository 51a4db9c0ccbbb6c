// What a host cannot see of the service: its members across the lifecycle, the probes it installs
// in the pipeline, and the pipeline and recording behind the "Pipeline" properties.
#include "plugin/TolkaTouchHIDService.h"

#include <gtest/gtest.h>

#include "platform/HIDServiceRegistry.h"
#include "tests/plugin/PlugInHost.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

using Testing::eventually;
using Testing::SinkInstallation;

class InspectableService : public TolkaTouchHIDService {
public:
    using TolkaTouchHIDService::_dispatchEventInfo;
    using TolkaTouchHIDService::_inputReportRunLoop;
    using TolkaTouchHIDService::_inputReportThreadSignal;
    using TolkaTouchHIDService::_pipeline;
    using TolkaTouchHIDService::_pipelineLock;
    using TolkaTouchHIDService::_recording;
    using TolkaTouchHIDService::_tolkaDevice;

    bool probesInstalled() {
        std::lock_guard lock(_pipelineLock);
        return _pipeline->inputReportProbe && _pipeline->invalidInputReportProbe && _pipeline->firmwareEventProbe &&
               _pipeline->imageProbe && _pipeline->disjointImageProbe && _pipeline->hidEventsProbe;
    }
    bool probesRemoved() {
        std::lock_guard lock(_pipelineLock);
        return !_pipeline->inputReportProbe && !_pipeline->invalidInputReportProbe && !_pipeline->firmwareEventProbe &&
               !_pipeline->imageProbe && !_pipeline->disjointImageProbe && !_pipeline->hidEventsProbe;
    }
};

// A service whose pipeline answers nothing for "DebugInfo".
class SilentPipelineService : public InspectableService {
public:
    PropertyValue getPropertyForKey(const char* key) override {
        if (key && std::string(key) == "Pipeline.DebugInfo") return {};
        return InspectableService::getPropertyForKey(key);
    }
};

struct TolkaTouchHIDServiceTest : ::testing::Test {
    uint32_t serviceHandle = Testing::uniqueServiceHandle();
    std::shared_ptr<SimulatedHIDDevice> device = SimulatedHIDDevice::create();
    DispatchQueueRef queue = DispatchQueue::create("inside test queue");
    Testing::EventCollector collector{queue};
    InspectableService* service = nullptr;

    void SetUp() override {
        std::shared_ptr<SimulatedHIDDevice> served = device;
        HIDServiceRegistry::registerService(serviceHandle, [served] { return served; });
        service = new InspectableService();
    }
    void TearDown() override {
        if (service) service->release();
        HIDServiceRegistry::unregisterService(serviceHandle);
    }
    void run() {
        service->startWithService(serviceHandle, nullptr);
        service->openWithOptions(0);
        service->setEventCallback(Testing::EventCollector::callback, &collector, nullptr);
        service->scheduleWithDispatchQueue(queue);
    }
    void halt() {
        service->unscheduleWithDispatchQueue(queue);
        service->closeWithOptions(0);
        service->stop();
    }
};

TEST_F(TolkaTouchHIDServiceTest, FreshServiceHasNoDeviceThreadOrQueue) {
    EXPECT_EQ(service->_tolkaDevice, nullptr);
    EXPECT_EQ(service->_inputReportRunLoop, nullptr);
    EXPECT_EQ(service->_inputReportThreadSignal, nullptr);
    EXPECT_EQ(service->_dispatchEventInfo.queue, nullptr);
    EXPECT_EQ(service->_dispatchEventInfo.callback, nullptr);
    EXPECT_NE(service->_pipeline, nullptr);
}

TEST_F(TolkaTouchHIDServiceTest, RecordingWrapsTheSharedPipelineAndKeepsAtMost1350Reports) {
    EXPECT_EQ(service->_recording.pipeline, service->_pipeline);
    EXPECT_EQ(service->_recording.maxFrameCount(), 1350u);
}

TEST_F(TolkaTouchHIDServiceTest, RunLoopIsSetOnceScheduleReturnsAndBothAreNullAfterUnschedule) {
    run();
    EXPECT_NE(service->_inputReportRunLoop, nullptr);
    EXPECT_NE(service->_inputReportThreadSignal, nullptr);
    EXPECT_EQ(service->_dispatchEventInfo.sender, service->getServiceInterface());
    EXPECT_EQ(service->_dispatchEventInfo.queue, queue);
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(service->_inputReportRunLoop, nullptr);
    EXPECT_EQ(service->_inputReportThreadSignal, nullptr);
    EXPECT_EQ(service->_dispatchEventInfo.queue, nullptr);
    // Callback, target, refcon and sender stay for the next schedule.
    EXPECT_EQ(service->_dispatchEventInfo.callback, &Testing::EventCollector::callback);
    EXPECT_EQ(service->_dispatchEventInfo.target, static_cast<void*>(&collector));
    EXPECT_EQ(service->_dispatchEventInfo.sender, service->getServiceInterface());
    service->stop();
}

TEST_F(TolkaTouchHIDServiceTest, ProbesAreInstalledWhileScheduledAndAllRemovedByUnschedule) {
    EXPECT_TRUE(service->probesRemoved());
    run();
    EXPECT_TRUE(eventually([&] { return service->probesInstalled(); }));
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_TRUE(service->probesRemoved());
    std::lock_guard lock(service->_pipelineLock);
    // The probes the service does not use stay empty throughout.
    EXPECT_FALSE(service->_pipeline->setTimeProbe || service->_pipeline->setStateProbe ||
                 service->_pipeline->getStateProbe);
}

TEST_F(TolkaTouchHIDServiceTest, ReportThatYieldsThreeEventsTracesThemAndCallsBackThreeTimes) {
    SinkInstallation sinks;
    run();
    ASSERT_TRUE(eventually([&] { return service->probesInstalled(); }));
    const EventList events = {makeDigitizerEvent(1, HIDEventPhase::MayBegin, 1),
                              makeDigitizerEvent(2, HIDEventPhase::Began, 1), GestureCodec::encode(GestureKind::Reset)};
    // Handed to the installed probe on the input report thread, as the pipeline does.
    service->_inputReportRunLoop->performBlock(TolkaTouchHIDService::kInputReportRunLoopMode, [&] {
        std::lock_guard lock(service->_pipelineLock);
        service->_pipeline->handleHIDEvents(events);
    });
    ASSERT_TRUE(collector.waitForCount(3));
    halt();

    std::vector<Testing::ReceivedEvent> received = collector.events();
    ASSERT_EQ(received.size(), 3u);
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_EQ(received[i].event, events[i]);
        EXPECT_EQ(received[i].options, 0u);
        EXPECT_EQ(received[i].sender, service->getServiceInterface());
        EXPECT_TRUE(received[i].onQueue);
    }
    std::vector<Trace::Record> dispatchTraces;
    for (const Trace::Record& record : sinks.trace->records()) {
        if (record.code == 0x2B150184 || record.code == 0x2B150188) dispatchTraces.push_back(record);
    }
    EXPECT_EQ(dispatchTraces, (std::vector<Trace::Record>{
                                  {0x2B150184, 3, 0, 0, 0},
                                  {0x2B150188, 11, HIDEventPhase::MayBegin, 0, 0},
                                  {0x2B150188, 11, HIDEventPhase::Began, 0, 0},
                                  {0x2B150188, 1, 0, 0, 0},
                              }));
    std::vector<std::string> lines = sinks.log->messages();
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "HID events probe: 3 event(s)"), 1);
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "Dispatch 3 event(s) takeoff"), 1);
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "Dispatch 3 event(s) land"), 1);
}

TEST_F(TolkaTouchHIDServiceTest, ReadingPipelineDebugInfoAsksThePipelineForDebugInfo) {
    std::vector<std::string> asked;
    service->_pipeline->getStateProbe = [&](const std::string& key) { asked.push_back(key); };
    PropertyValue answer = service->getPropertyForKey("Pipeline.DebugInfo");
    EXPECT_EQ(asked, std::vector<std::string>{"DebugInfo"});
    EXPECT_EQ(answer, service->_pipeline->getState("DebugInfo"));
}

TEST_F(TolkaTouchHIDServiceTest, WritingAPipelineKeyHandsTheRecordingTheSubKey) {
    std::vector<std::pair<std::string, PropertyValue>> set;
    service->_pipeline->setStateProbe = [&](const std::string& key, const PropertyValue& value) {
        set.emplace_back(key, value);
    };
    EXPECT_TRUE(service->setProperty(PropertyValue(12), "Pipeline.Algs.Anything"));
    ASSERT_EQ(set.size(), 1u);
    EXPECT_EQ(set[0].first, "Algs.Anything");
    EXPECT_EQ(set[0].second, PropertyValue(12));
    ASSERT_EQ(service->_recording.frames().size(), 1u);
    EXPECT_EQ(service->_recording.frames().back().key, "Algs.Anything");
}

TEST_F(TolkaTouchHIDServiceTest, ServicePluginDebugWithAPipelineAnsweringNullHasNoPipelineDebugInfoEntry) {
    auto* silent = new SilentPipelineService();
    PropertyValue debug = silent->getPropertyForKey("ServicePluginDebug");
    ASSERT_TRUE(debug.isDictionary());
    EXPECT_EQ(debug.find("Pipeline.DebugInfo"), nullptr);
    EXPECT_NE(debug.find("Version"), nullptr);
    EXPECT_NE(debug.find("FirmwareDebugReports"), nullptr);
    EXPECT_NE(debug.find("Recording"), nullptr);
    for (const auto& [key, value] : *debug.dictionary()) EXPECT_FALSE(value.isNull()) << key;
    silent->release();
}

}  // namespace
}  // namespace TolkaTouch

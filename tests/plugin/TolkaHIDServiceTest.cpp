// The base object: its tables, its reference count and the defaults of every operation.
#include "plugin/TolkaHIDService.h"

#include <gtest/gtest.h>

#include "plugin/TolkaIUnknown.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

// A service that overrides nothing.
class PlainService : public TolkaHIDService {};

struct PlainServiceTest : ::testing::Test {
    PlainService* object = new PlainService();
    void* pluginHandle = object->getPluginInterface();
    void* serviceHandle = object->getServiceInterface();
    Host::PlugInInterface* plugin = *static_cast<Host::PlugInInterface**>(pluginHandle);
    Host::HIDServiceInterface* service = *static_cast<Host::HIDServiceInterface**>(serviceHandle);
    ~PlainServiceTest() override { object->release(); }
};

TEST_F(PlainServiceTest, TablesHoldTheObjectInTheirReservedSlot) {
    EXPECT_EQ(plugin->_reserved, static_cast<void*>(static_cast<TolkaHIDService*>(object)));
    EXPECT_EQ(service->_reserved, static_cast<void*>(static_cast<TolkaHIDService*>(object)));
    EXPECT_EQ(TolkaHIDService::fromInterface(pluginHandle), object);
    EXPECT_EQ(TolkaHIDService::fromInterface(serviceHandle), object);
}

TEST_F(PlainServiceTest, HandlesAreTheAddressesOfTheTwoTablePointers) {
    EXPECT_NE(pluginHandle, serviceHandle);
    EXPECT_EQ(static_cast<char*>(serviceHandle) - static_cast<char*>(pluginHandle),
              static_cast<std::ptrdiff_t>(sizeof(void*)));
}

TEST_F(PlainServiceTest, PlugInTableHasItsShimsAndVersion) {
    EXPECT_EQ(plugin->QueryInterface, &TolkaIUnknown::QueryInterface);
    EXPECT_EQ(plugin->AddRef, &TolkaIUnknown::AddRef);
    EXPECT_EQ(plugin->Release, &TolkaIUnknown::Release);
    EXPECT_EQ(plugin->version, 1u);
    EXPECT_EQ(plugin->revision, 0u);
    EXPECT_EQ(plugin->Probe, &TolkaIUnknown::Probe);
    EXPECT_EQ(plugin->Start, &TolkaIUnknown::Start);
    EXPECT_EQ(plugin->Stop, &TolkaIUnknown::Stop);
}

TEST_F(PlainServiceTest, ServiceTableHasItsShimsInSlotOrder) {
    EXPECT_EQ(service->QueryInterface, &TolkaIUnknown::QueryInterface);
    EXPECT_EQ(service->AddRef, &TolkaIUnknown::AddRef);
    EXPECT_EQ(service->Release, &TolkaIUnknown::Release);
    EXPECT_EQ(service->open, &TolkaIUnknown::open);
    EXPECT_EQ(service->close, &TolkaIUnknown::close);
    EXPECT_EQ(service->copyProperty, &TolkaIUnknown::copyProperty);
    EXPECT_EQ(service->setProperty, &TolkaIUnknown::setProperty);
    EXPECT_EQ(service->setEventCallback, &TolkaIUnknown::setEventCallback);
    EXPECT_EQ(service->scheduleWithDispatchQueue, &TolkaIUnknown::scheduleWithDispatchQueue);
    EXPECT_EQ(service->unscheduleFromDispatchQueue, &TolkaIUnknown::unscheduleFromDispatchQueue);
    EXPECT_EQ(service->copyEvent, &TolkaIUnknown::copyEvent);
    EXPECT_EQ(service->setOutputEvent, &TolkaIUnknown::setOutputEvent);
}

TEST_F(PlainServiceTest, FreshObjectHoldsOneReference) {
    EXPECT_EQ(object->retainCount(), 1u);
    object->retain();
    EXPECT_EQ(object->retainCount(), 2u);
    object->release();
    EXPECT_EQ(object->retainCount(), 1u);
}

TEST_F(PlainServiceTest, ProbeStartStopAndOutputEventsAreNotSupported) {
    int32_t score = 17;
    EXPECT_EQ(plugin->Probe(pluginHandle, nullptr, 5, &score), HIDResult::Unsupported);
    EXPECT_EQ(score, 17);
    EXPECT_EQ(plugin->Start(pluginHandle, nullptr, 5), HIDResult::Unsupported);
    EXPECT_EQ(plugin->Stop(pluginHandle), HIDResult::Unsupported);
    HIDEventRef event = GestureCodec::encode(GestureKind::Reset);
    EXPECT_EQ(service->setOutputEvent(serviceHandle, &event), HIDResult::Unsupported);
}

TEST_F(PlainServiceTest, OpenAnswersFalseAndPropertiesAndEventsAnswerNothing) {
    EXPECT_FALSE(service->open(serviceHandle, 0));
    service->close(serviceHandle, 0);
    EXPECT_TRUE(service->copyProperty(serviceHandle, "Version").isNull());
    PropertyValue value(1);
    EXPECT_FALSE(service->setProperty(serviceHandle, "Pipeline.Algs.DebugInfo", &value));
    EXPECT_EQ(service->copyEvent(serviceHandle, 11, nullptr, 0), nullptr);
}

TEST_F(PlainServiceTest, CallbackAndSchedulingDoNothing) {
    DispatchQueueRef queue = DispatchQueue::create("unused");
    service->setEventCallback(serviceHandle, nullptr, nullptr, nullptr);
    service->scheduleWithDispatchQueue(serviceHandle, &queue);
    service->unscheduleFromDispatchQueue(serviceHandle, &queue);
    EXPECT_EQ(queue.use_count(), 1);
    EXPECT_EQ(object->retainCount(), 1u);
}

}  // namespace
}  // namespace TolkaTouch

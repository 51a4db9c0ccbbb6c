// The table shims: forwarding with the argument order of the methods, the lifetime slots'
// reference arithmetic, the two interfaces QueryInterface answers, and exceptions kept from the host.
#include "plugin/TolkaIUnknown.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "plugin/TolkaHIDService.h"
#include "tests/plugin/PlugInHost.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

// Notes the arguments each method receives and answers with values the tests choose.
class RecordingService : public TolkaHIDService {
public:
    uint32_t service = 0;
    const PropertyValue* properties = nullptr;
    int32_t* score = nullptr;
    uint32_t options = 0;
    std::string key;
    bool keyWasNull = false;
    PropertyValue value;
    Host::HIDEventCallback callback = nullptr;
    void* target = nullptr;
    void* refcon = nullptr;
    DispatchQueueRef queue;
    uint32_t eventType = 0;
    HIDEventRef event;
    bool throwing = false;

    Host::Result probeWithService(uint32_t s, const PropertyValue* p, int32_t* outScore) override {
        service = s;
        properties = p;
        score = outScore;
        if (throwing) throw std::runtime_error("probe broke");
        return 0x11;
    }
    Host::Result startWithService(uint32_t s, const PropertyValue* p) override {
        service = s;
        properties = p;
        return 0x12;
    }
    Host::Result stop() override { return 0x13; }
    bool openWithOptions(uint32_t o) override {
        options = o;
        return true;
    }
    void closeWithOptions(uint32_t o) override { options = o; }
    PropertyValue getPropertyForKey(const char* k) override {
        keyWasNull = k == nullptr;
        key = k ? k : "";
        if (throwing) throw std::bad_alloc();
        return PropertyValue("answer");
    }
    bool setProperty(const PropertyValue& v, const char* k) override {
        value = v;
        keyWasNull = k == nullptr;
        key = k ? k : "";
        return true;
    }
    void setEventCallback(Host::HIDEventCallback c, void* t, void* r) override {
        callback = c;
        target = t;
        refcon = r;
    }
    void scheduleWithDispatchQueue(const DispatchQueueRef& q) override { queue = q; }
    void unscheduleWithDispatchQueue(const DispatchQueueRef& q) override { queue = q ? nullptr : q; }
    HIDEventRef copyEventWithType(uint32_t type, const HIDEventRef& matching, uint32_t o) override {
        eventType = type;
        event = matching;
        options = o;
        return matching;
    }
    Host::Result setOutputEvent(const HIDEventRef& e) override {
        event = e;
        return 0x14;
    }
};

void eventCallback(void*, void*, void*, const HIDEventRef&, uint32_t) {}

struct TolkaIUnknownTest : ::testing::Test {
    RecordingService* object = new RecordingService();
    void* plugin = object->getPluginInterface();
    void* service = object->getServiceInterface();
    ~TolkaIUnknownTest() override {
        if (object) object->release();
    }
};

TEST_F(TolkaIUnknownTest, AddRefReturnsThreeAndLeavesTwo) {
    EXPECT_EQ(TolkaIUnknown::AddRef(plugin), 3u);
    EXPECT_EQ(object->retainCount(), 2u);
    object->release();
}

TEST_F(TolkaIUnknownTest, ReleaseAfterAddRefReturnsTwoAndLeavesOne) {
    TolkaIUnknown::AddRef(plugin);
    EXPECT_EQ(TolkaIUnknown::Release(service), 2u);
    EXPECT_EQ(object->retainCount(), 1u);
}

TEST_F(TolkaIUnknownTest, ReleaseOfTheLastReferenceReturnsOneAndDeletesTheObject) {
    EXPECT_EQ(TolkaIUnknown::Release(plugin), 1u);
    object = nullptr;  // gone; the fixture must not release it again
}

TEST_F(TolkaIUnknownTest, QueryInterfaceAnswersTheBaseInterfaceWithThePlugInHandle) {
    void* answer = nullptr;
    EXPECT_EQ(TolkaIUnknown::QueryInterface(service, Host::kIUnknownInterfaceID, &answer), HIDResult::Success);
    EXPECT_EQ(answer, plugin);
    EXPECT_EQ(object->retainCount(), 2u);
    object->release();
}

TEST_F(TolkaIUnknownTest, QueryInterfaceAnswersTheServiceInterfaceWithTheServiceHandle) {
    void* answer = nullptr;
    EXPECT_EQ(TolkaIUnknown::QueryInterface(plugin, Host::kHIDServiceInterfaceID, &answer), HIDResult::Success);
    EXPECT_EQ(answer, service);
    EXPECT_EQ(object->retainCount(), 2u);
    object->release();
}

TEST_F(TolkaIUnknownTest, QueryInterfaceWithThePlugInTypeLeavesTheAnswerAndTheCountAlone) {
    void* answer = this;
    EXPECT_EQ(TolkaIUnknown::QueryInterface(plugin, Host::kHIDServicePlugInTypeID, &answer),
              HIDResult::NoInterface);
    EXPECT_EQ(answer, static_cast<void*>(this));
    EXPECT_EQ(object->retainCount(), 1u);
}

TEST_F(TolkaIUnknownTest, ProbeTakesPropertiesBeforeTheServiceAndForwardsTheServiceFirst) {
    PropertyValue matching(PropertyValue::Dictionary{{"VendorID", PropertyValue(0x1234)}});
    int32_t score = 9;
    EXPECT_EQ(TolkaIUnknown::Probe(plugin, &matching, 77, &score), 0x11u);
    EXPECT_EQ(object->service, 77u);
    EXPECT_EQ(object->properties, &matching);
    EXPECT_EQ(object->score, &score);
}

TEST_F(TolkaIUnknownTest, StartTakesPropertiesBeforeTheServiceAndForwardsTheServiceFirst) {
    PropertyValue properties(PropertyValue::Dictionary{});
    EXPECT_EQ(TolkaIUnknown::Start(plugin, &properties, 78), 0x12u);
    EXPECT_EQ(object->service, 78u);
    EXPECT_EQ(object->properties, &properties);
}

TEST_F(TolkaIUnknownTest, StopForwardsAndAnswersTheResult) {
    EXPECT_EQ(TolkaIUnknown::Stop(plugin), 0x13u);
}

TEST_F(TolkaIUnknownTest, OpenAndCloseForwardTheirOptions) {
    EXPECT_TRUE(TolkaIUnknown::open(service, 0x2A));
    EXPECT_EQ(object->options, 0x2Au);
    TolkaIUnknown::close(service, 0x2B);
    EXPECT_EQ(object->options, 0x2Bu);
}

TEST_F(TolkaIUnknownTest, CopyPropertyHandsTheAnswerToTheCaller) {
    PropertyValue answer = TolkaIUnknown::copyProperty(service, "Version");
    EXPECT_EQ(object->key, "Version");
    EXPECT_EQ(answer, PropertyValue("answer"));
    TolkaIUnknown::copyProperty(service, nullptr);
    EXPECT_TRUE(object->keyWasNull);
}

TEST_F(TolkaIUnknownTest, SetPropertyTakesTheKeyBeforeTheValueAndForwardsTheValueFirst) {
    PropertyValue value(42);
    EXPECT_TRUE(TolkaIUnknown::setProperty(service, "Pipeline.Algs.X", &value));
    EXPECT_EQ(object->key, "Pipeline.Algs.X");
    EXPECT_EQ(object->value, PropertyValue(42));
}

TEST_F(TolkaIUnknownTest, SetPropertyWithoutAValueForwardsTheNullValue) {
    object->value = PropertyValue(1);
    EXPECT_TRUE(TolkaIUnknown::setProperty(service, "Key", nullptr));
    EXPECT_TRUE(object->value.isNull());
}

TEST_F(TolkaIUnknownTest, SetEventCallbackForwardsCallbackTargetAndRefcon) {
    int target = 0;
    int refcon = 0;
    TolkaIUnknown::setEventCallback(service, eventCallback, &target, &refcon);
    EXPECT_EQ(object->callback, &eventCallback);
    EXPECT_EQ(object->target, &target);
    EXPECT_EQ(object->refcon, &refcon);
}

TEST_F(TolkaIUnknownTest, SchedulingForwardsTheHostsQueue) {
    DispatchQueueRef queue = DispatchQueue::create("shim test");
    TolkaIUnknown::scheduleWithDispatchQueue(service, &queue);
    EXPECT_EQ(object->queue, queue);
    TolkaIUnknown::unscheduleFromDispatchQueue(service, &queue);
    EXPECT_EQ(object->queue, nullptr);
}

TEST_F(TolkaIUnknownTest, CopyEventAndSetOutputEventForwardTheirArguments) {
    HIDEventRef event = GestureCodec::encode(GestureKind::Reset);
    EXPECT_EQ(TolkaIUnknown::copyEvent(service, 11, &event, 3), event);
    EXPECT_EQ(object->eventType, 11u);
    EXPECT_EQ(object->options, 3u);
    EXPECT_EQ(TolkaIUnknown::setOutputEvent(service, &event), 0x14u);
    EXPECT_EQ(object->event, event);
}

TEST_F(TolkaIUnknownTest, AnExceptionInsideAMethodIsLoggedAndNeverReachesTheHost) {
    Testing::SinkInstallation sinks;
    object->throwing = true;
    int32_t score = 0;
    EXPECT_EQ(TolkaIUnknown::Probe(plugin, nullptr, 1, &score), HIDResult::Unsupported);
    EXPECT_TRUE(TolkaIUnknown::copyProperty(service, "Recording").isNull());
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{
                                         "probeWithService:properties:outScore: failed: probe broke",
                                         "getPropertyForKey: failed: std::bad_alloc",
                                     }));
}

}  // namespace
}  // namespace TolkaTouch

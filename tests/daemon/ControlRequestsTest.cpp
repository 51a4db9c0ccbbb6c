#include "daemon/ControlRequests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

#include <nlohmann/json.hpp>

#include "platform/Log.h"

namespace TolkaTouch {
namespace {

class FakeTarget : public ControlTarget {
public:
    std::vector<ControlDeviceInfo> devices() override { return list; }
    std::optional<PropertyValue> getProperty(std::optional<uint32_t> service, const std::string& key) override {
        asked.push_back({service, key});
        if (list.empty() || (service && *service != list.front().service)) return std::nullopt;
        auto it = properties.find(key);
        return it == properties.end() ? PropertyValue() : it->second;
    }
    std::optional<bool> setProperty(std::optional<uint32_t> service, const std::string& key,
                                    const PropertyValue& value) override {
        if (list.empty() || (service && *service != list.front().service)) return std::nullopt;
        properties[key] = value;
        return key != "Refused";
    }
    bool startLive() override {
        ++liveAsked;
        return hasLive;
    }

    std::vector<ControlDeviceInfo> list{{1, "/dev/hidraw4", 0x1209, 0x0001}};
    std::map<std::string, PropertyValue> properties;
    std::vector<std::pair<std::optional<uint32_t>, std::string>> asked;
    bool hasLive = true;
    int liveAsked = 0;
};

TEST(ControlRequestsTest, GetAnswersTheServicesValue) {
    FakeTarget target;
    target.properties["Version"] = PropertyValue(PropertyValue::Array{28, 0, 0});
    EXPECT_EQ(answerControlRequest(R"({"get": "Version"})", target), R"({"value":[28,0,0]})");
}

TEST(ControlRequestsTest, GetOfAKeyNobodyAnswersIsNull) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"get": "Nothing"})", target), R"({"value":null})");
}

TEST(ControlRequestsTest, GetGoesToTheNamedDevice) {
    FakeTarget target;
    answerControlRequest(R"({"get": "Version", "device": 1})", target);
    ASSERT_EQ(target.asked.size(), 1u);
    EXPECT_EQ(target.asked[0].first, 1u);
    EXPECT_EQ(answerControlRequest(R"({"get": "Version", "device": 7})", target),
              R"({"error":"no device with service 7"})");
}

TEST(ControlRequestsTest, GetWithoutAnyDeviceIsAnError) {
    FakeTarget target;
    target.list.clear();
    EXPECT_EQ(answerControlRequest(R"({"get": "Version"})", target), R"({"error":"no device"})");
}

TEST(ControlRequestsTest, SetPassesTheValueAndAnswersTheServicesResult) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"set": "Pipeline.Algs.HoldTimeoutMilliseconds", "value": 400})", target),
              R"({"ok":true})");
    EXPECT_EQ(target.properties["Pipeline.Algs.HoldTimeoutMilliseconds"], PropertyValue(400u));
    EXPECT_EQ(answerControlRequest(R"({"set": "Refused", "value": "x"})", target), R"({"ok":false})");
}

TEST(ControlRequestsTest, ASettingInAnyKeyFormIsWrittenInThePropertysFormWithItsTableType) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"set": "Algs.ActivationThreshold", "value": 250})", target), R"({"ok":true})");
    EXPECT_EQ(target.properties["Pipeline.Algs.ActivationThreshold"], PropertyValue(250.0));
    EXPECT_EQ(answerControlRequest(R"({"set": "EnableTapSuppression", "value": false})", target), R"({"ok":true})");
    EXPECT_EQ(target.properties["Pipeline.Algs.EnableTapSuppression"], PropertyValue(false));
}

TEST(ControlRequestsTest, AMadeUpSettingIsRefusedAndNothingReachesTheService) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"set": "Pipeline.Algs.HoldTimeoutMiliseconds", "value": 400})", target),
              R"x({"error":"unknown setting \"Pipeline.Algs.HoldTimeoutMiliseconds\" (did you mean \"Pipeline.Algs.HoldTimeoutMilliseconds\"?)"})x");
    EXPECT_THAT(answerControlRequest(R"({"set": "Pipeline.Junk17", "value": 1})", target),
                testing::StartsWith(R"({"error":"unknown setting \"Pipeline.Junk17\" (did you mean )"));
    EXPECT_TRUE(target.properties.empty());
}

TEST(ControlRequestsTest, ASettingValueOutsideItsRangeIsRefusedWithTheRange) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"set": "Pipeline.Algs.HoldTimeoutMilliseconds", "value": "banana"})", target),
              R"({"error":"setting \"Pipeline.Algs.HoldTimeoutMilliseconds\" takes a whole number of milliseconds from 1 to 60000, not \"banana\""})");
    EXPECT_TRUE(target.properties.empty());
}

TEST(ControlRequestsTest, KeysOutsideTheSettingsDomainsPassAsTheyAre) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"set": "ServicePluginDebug", "value": 3})", target), R"({"ok":true})");
    EXPECT_EQ(target.properties["ServicePluginDebug"], PropertyValue(3u));
}

TEST(ControlRequestsTest, LogLevelsAreShownAndChangedForTheWholeProcess) {
    FakeTarget target;
    const Log algs("com.zantor.hid.TolkaTouch", "ControlAlgs");
    EXPECT_EQ(answerControlRequest(R"({"log": "ControlAlgs", "level": "debug"})", target), R"({"ok":true})");
    EXPECT_TRUE(algs.debugEnabled());
    const auto levels = nlohmann::json::parse(answerControlRequest(R"({"log": true})", target));
    EXPECT_EQ(levels["levels"]["ControlAlgs"], "debug");
    EXPECT_EQ(levels["levels"]["*"], "default");
    EXPECT_EQ(answerControlRequest(R"({"log": "ControlAlgs", "level": "default"})", target), R"({"ok":true})");
    EXPECT_FALSE(algs.debugEnabled());
    EXPECT_EQ(answerControlRequest(R"({"log": "ControlAlgs", "level": "loud"})", target),
              R"({"error":"malformed request: \"log\" takes a category (or *) and a \"level\": debug, info, default, error, fault or off"})");
}

TEST(ControlRequestsTest, DevicesListsServiceNodeAndIds) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"devices": true})", target),
              R"({"devices":[{"node":"/dev/hidraw4","product":1,"service":1,"vendor":4617}]})");
}

TEST(ControlRequestsTest, TextThatIsNotAJsonObjectIsMalformed) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest("get Version", target), R"({"error":"malformed request"})");
    EXPECT_EQ(answerControlRequest(R"(["get", "Version"])", target), R"({"error":"malformed request"})");
    EXPECT_EQ(answerControlRequest(R"({"get": "Version"} trailing)", target), R"({"error":"malformed request"})");
    EXPECT_EQ(answerControlRequest("", target), R"({"error":"malformed request"})");
    EXPECT_EQ(answerControlRequest("{\"get\": \"\xff\"}", target), R"({"error":"malformed request"})");
}

TEST(ControlRequestsTest, DeeplyNestedValueIsMalformed) {
    FakeTarget target;
    std::string deep = R"({"set": "Key", "value": )" + std::string(30000, '[') + std::string(30000, ']') + "}";
    EXPECT_EQ(answerControlRequest(deep, target), R"({"error":"malformed request"})");
    EXPECT_TRUE(target.properties.empty());
}

TEST(ControlRequestsTest, WrongMemberTypesAreMalformed) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"get": 5})", target),
              R"({"error":"malformed request: \"get\" takes a key string"})");
    EXPECT_EQ(answerControlRequest(R"({"set": "Key"})", target),
              R"({"error":"malformed request: \"set\" takes a key string and a \"value\""})");
    EXPECT_EQ(answerControlRequest(R"({"get": "Version", "device": -1})", target),
              R"({"error":"malformed request: \"device\" takes a service number"})");
}

TEST(ControlRequestsTest, AnObjectWithoutAKnownRequestIsUnknown) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"reboot": true})", target), R"({"error":"unknown request"})");
    EXPECT_EQ(answerControlRequest(R"({"devices": false})", target), R"({"error":"unknown request"})");
}

TEST(ControlRequestsTest, LiveSubscribesTheClientToTheFrameSnapshots) {
    FakeTarget target;
    EXPECT_EQ(answerControlRequest(R"({"live": true})", target), R"({"ok":true})");
    EXPECT_EQ(target.liveAsked, 1);
}

TEST(ControlRequestsTest, LiveWithAnythingButTrueIsMalformedAndSubscribesNobody) {
    FakeTarget target;
    for (const char* request : {R"({"live": false})", R"({"live": 60})", R"({"live": "yes"})", R"({"live": null})"}) {
        EXPECT_EQ(answerControlRequest(request, target), R"({"error":"malformed request: \"live\" takes true"})")
            << request;
    }
    EXPECT_EQ(target.liveAsked, 0);
}

TEST(ControlRequestsTest, LiveFromATargetWithoutFramesIsAnError) {
    FakeTarget target;
    target.hasLive = false;
    EXPECT_EQ(answerControlRequest(R"({"live": true})", target),
              R"({"error":"this daemon has no live frames to give"})");
}

TEST(ControlRequestsTest, OversizedReplyNamesTheLimit) {
    EXPECT_EQ(oversizedControlRequestReply(), R"j({"error":"request too long (over 65536 bytes)"})j");
}

}  // namespace
}  // namespace TolkaTouch

// The service's properties as a host reads and writes them through the built library.
#include <gtest/gtest.h>

#include "pipeline/PipelineRecording.h"
#include "tests/plugin/PlugInHost.h"

namespace TolkaTouch {
namespace {

using Testing::firmwareEventReport;
using Testing::imageReport;
using Testing::PlugInHost;
using Testing::SinkInstallation;

const std::vector<std::string> kDebugReportKeys = {"0x04", "0x10", "0x11", "0x12", "0x13",
                                                   "0x1d", "0x32", "0x3b", "0x3c", "0x3f"};

std::vector<std::string> keysOf(const PropertyValue& value) {
    std::vector<std::string> keys;
    if (const PropertyValue::Dictionary* dictionary = value.dictionary()) {
        for (const auto& [key, member] : *dictionary) keys.push_back(key);
    }
    return keys;
}

PipelineRecording readRecording(const PropertyValue& document) {
    const std::string* text = document.string();
    std::vector<uint8_t> bytes = text ? std::vector<uint8_t>(text->begin(), text->end()) : std::vector<uint8_t>{};
    return PipelineRecording(&bytes);
}

struct TolkaTouchHIDServicePropertiesTest : ::testing::Test {
    PlugInHost host;
    void SetUp() override {
        host.start();
        host.open();
    }
};

TEST_F(TolkaTouchHIDServicePropertiesTest, VersionAnswers28_0_0) {
    EXPECT_EQ(host.copyProperty("Version"),
              PropertyValue(PropertyValue::Array{PropertyValue(28), PropertyValue(0), PropertyValue(0)}));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FirmwareDebugReportsAlwaysHasExactlyTenEntries) {
    PropertyValue reports = host.copyProperty("FirmwareDebugReports");
    EXPECT_EQ(keysOf(reports), kDebugReportKeys);
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FirmwareDebugReportsShowsTheBytesReadAsHex) {
    host.device->setFeatureReport(0x04, {0x04, 0x0a, 0xff});
    host.device->setFeatureReport(0x3F, std::vector<uint8_t>(200, 0x3F));  // cut to the 128-byte buffer
    PropertyValue reports = host.copyProperty("FirmwareDebugReports");
    ASSERT_NE(reports.find("0x04"), nullptr);
    EXPECT_EQ(*reports.find("0x04"), PropertyValue("04 0a ff "));
    std::string expected;
    for (int i = 0; i < 128; ++i) expected += "3f ";
    EXPECT_EQ(*reports.find("0x3f"), PropertyValue(expected));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, RefusedReportShowsItsFailureWithoutStoppingTheDump) {
    host.device->setFeatureReport(0x11, {0x11, 0x01});
    host.device->failReport(0x10, 0xE00002C7);
    PropertyValue reports = host.copyProperty("FirmwareDebugReports");
    EXPECT_EQ(keysOf(reports), kDebugReportKeys);
    EXPECT_EQ(*reports.find("0x10"), PropertyValue("Failed to get report ID 0x10: 0xe00002c7"));
    EXPECT_EQ(*reports.find("0x11"), PropertyValue("11 01 "));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FirmwareDebugReportsIsReadWithoutWritingAnyLogLine) {
    SinkInstallation sinks;
    host.device->failReport(0x10, 0xE00002C7);
    host.copyProperty("FirmwareDebugReports");
    EXPECT_EQ(sinks.log->messages(), std::vector<std::string>{"getPropertyForKey:FirmwareDebugReports"});
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FactoryResetHoldDurationAnswersTheParsedValue) {
    host.device->setFeatureReport(0x1F, {0x1F, 0xE8, 0x03, 0x00, 0x00});
    PropertyValue duration = host.copyProperty("FactoryResetHoldDuration");
    EXPECT_EQ(duration.kind(), PropertyValue::Kind::Unsigned);
    EXPECT_EQ(duration, PropertyValue(1000u));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FactoryResetHoldDurationIsNullWhenTheReportFails) {
    host.device->setFeatureReport(0x1F, {0x1F, 0xE8, 0x03, 0x00, 0x00});
    host.device->failReport(0x1F, 0xE00002C7);
    EXPECT_TRUE(host.copyProperty("FactoryResetHoldDuration").isNull());
}

TEST_F(TolkaTouchHIDServicePropertiesTest, FactoryResetHoldDurationIsNullWhenTheReportDoesNotParse) {
    host.device->setFeatureReport(0x1F, {0x1F, 0xE8});
    EXPECT_TRUE(host.copyProperty("FactoryResetHoldDuration").isNull());
}

TEST_F(TolkaTouchHIDServicePropertiesTest, RecordingReturnsADocumentTheReaderAccepts) {
    host.setEventCallback();
    host.schedule();
    host.setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(700));
    host.write(imageReport(1, 10));
    host.write(firmwareEventReport(0, {9}));
    ASSERT_TRUE(host.collector.waitForCount(1));
    host.unschedule();

    PipelineRecording recording = readRecording(host.copyProperty("Recording"));
    ASSERT_EQ(recording.frames().size(), 3u);
    auto frame = recording.frames().begin();
    EXPECT_EQ(frame->type, PipelineRecording::FrameType::State);
    EXPECT_EQ(frame->key, "Algs.HoldTimeoutMilliseconds");
    ASSERT_TRUE(frame->value.has_value());
    EXPECT_EQ(*frame->value, PropertyValue(700u));  // JSON keeps no sign for it
    ++frame;
    EXPECT_EQ(frame->type, PipelineRecording::FrameType::InputReport);
    EXPECT_EQ(frame->report, imageReport(1, 10));
    ++frame;
    EXPECT_EQ(frame->report, firmwareEventReport(0, {9}));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, RecordingOfAFreshServiceIsAnEmptyDocument) {
    PipelineRecording recording = readRecording(host.copyProperty("Recording"));
    EXPECT_TRUE(recording.frames().empty());
}

TEST_F(TolkaTouchHIDServicePropertiesTest, ServicePluginDebugHoldsEveryKeyThatAnswers) {
    PropertyValue debug = host.copyProperty("ServicePluginDebug");
    std::vector<std::string> expected = {"FirmwareDebugReports", "Pipeline.DebugInfo", "Recording", "Version"};
    if (!host.copyProperty("Pipeline.Algs.DebugInfo").isNull()) expected.insert(expected.begin() + 1, "Pipeline.Algs.DebugInfo");
    EXPECT_EQ(keysOf(debug), expected);
    EXPECT_EQ(*debug.find("Version"), host.copyProperty("Version"));
    EXPECT_EQ(*debug.find("Pipeline.DebugInfo"), host.copyProperty("Pipeline.DebugInfo"));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, ServicePluginDebugAsksTheServiceForEachKeyInOrder) {
    SinkInstallation sinks;
    host.copyProperty("ServicePluginDebug");
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{
                                         "getPropertyForKey:ServicePluginDebug",
                                         "getPropertyForKey:Version",
                                         "getPropertyForKey:FirmwareDebugReports",
                                         "getPropertyForKey:Recording",
                                         "getPropertyForKey:Pipeline.DebugInfo",
                                         "getPropertyForKey:Pipeline.Algs.DebugInfo",
                                     }));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, PipelineDebugInfoAnswersThePipelinesTwoCounters) {
    EXPECT_EQ(host.copyProperty("Pipeline.DebugInfo"),
              PropertyValue(PropertyValue::Dictionary{{"DisjointImageCount", PropertyValue(0u)},
                                                      {"ResetCount", PropertyValue(0u)}}));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, WritingAPipelineSettingAnswersTrueAndReadsBack) {
    EXPECT_TRUE(host.setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(700)));
    EXPECT_EQ(host.copyProperty("Pipeline.Algs.HoldTimeoutMilliseconds"), PropertyValue(700u));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, WritingAnUnknownPipelineKeyStillAnswersTrueAndIsRecorded) {
    EXPECT_TRUE(host.setProperty("Pipeline.NoSuchKey", PropertyValue("x")));
    EXPECT_TRUE(host.copyProperty("Pipeline.NoSuchKey").isNull());
    PipelineRecording recording = readRecording(host.copyProperty("Recording"));
    ASSERT_EQ(recording.frames().size(), 1u);
    EXPECT_EQ(recording.frames().front().key, "NoSuchKey");
    EXPECT_TRUE(host.device->getProperty("Pipeline.NoSuchKey").isNull());
}

TEST_F(TolkaTouchHIDServicePropertiesTest, PipelineDomainIsMatchedCaseSensitively) {
    EXPECT_TRUE(host.setProperty("pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(700)));  // the device's
    EXPECT_EQ(host.device->getProperty("pipeline.Algs.HoldTimeoutMilliseconds"), PropertyValue(700));
    EXPECT_EQ(host.copyProperty("Pipeline.Algs.HoldTimeoutMilliseconds"), PropertyValue(500u));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, WritingVersionIsPassedToTheDevice) {
    EXPECT_TRUE(host.setProperty("Version", PropertyValue(3)));
    EXPECT_EQ(host.device->getProperty("Version"), PropertyValue(3));
    EXPECT_EQ(host.copyProperty("Version"),
              PropertyValue(PropertyValue::Array{PropertyValue(28), PropertyValue(0), PropertyValue(0)}));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, OtherKeysAreTheDevicesOwnProperties) {
    host.device->setDeviceProperty("VendorID", PropertyValue(0x1234));
    EXPECT_EQ(host.copyProperty("VendorID"), PropertyValue(0x1234));
    EXPECT_TRUE(host.copyProperty("NoSuchProperty").isNull());
    EXPECT_TRUE(host.setProperty("Transport", PropertyValue("USB")));
    EXPECT_EQ(host.copyProperty("Transport"), PropertyValue("USB"));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, NullKeyAnswersNullAndFalse) {
    EXPECT_TRUE(host.copyProperty(nullptr).isNull());
    EXPECT_FALSE(host.setProperty(nullptr, PropertyValue(1)));
}

TEST_F(TolkaTouchHIDServicePropertiesTest, PropertyCallsLogTheirKeysAndValues) {
    SinkInstallation sinks;
    host.copyProperty("Version");
    host.setProperty("Pipeline.Algs.ActivationThreshold", PropertyValue(250));
    host.copyProperty(nullptr);
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{
                                         "getPropertyForKey:Version",
                                         "setProperty:" + PropertyValue(250).description() +
                                             " forKey:Pipeline.Algs.ActivationThreshold",
                                         "getPropertyForKey:(null)",
                                     }));
}

// A service started on a device that writes down every call made of it.
struct TolkaTouchHIDServiceDeviceCallsTest : ::testing::Test {
    std::shared_ptr<Testing::CallLogDevice> device = std::make_shared<Testing::CallLogDevice>();
    Testing::ServedDevice served{device};
    PlugInHost host;
    void SetUp() override {
        ASSERT_EQ((*host.plugin)->Start(host.plugin, nullptr, served.serviceHandle), HIDResult::Success);
    }
};

TEST_F(TolkaTouchHIDServiceDeviceCallsTest, FeatureReportsAreReadInTableOrderInto128ByteBuffersAndTheHoldDurationInto32) {
    host.copyProperty("FirmwareDebugReports");
    host.copyProperty("FactoryResetHoldDuration");
    EXPECT_EQ(device->calls(), (std::vector<std::string>{
                                   "getReport Feature 0x04 128",
                                   "getReport Feature 0x10 128",
                                   "getReport Feature 0x11 128",
                                   "getReport Feature 0x12 128",
                                   "getReport Feature 0x13 128",
                                   "getReport Feature 0x1d 128",
                                   "getReport Feature 0x32 128",
                                   "getReport Feature 0x3b 128",
                                   "getReport Feature 0x3c 128",
                                   "getReport Feature 0x3f 128",
                                   "getReport Feature 0x1f 32",
                               }));
}

TEST_F(TolkaTouchHIDServiceDeviceCallsTest, FailureTextNamesTheReportIdWithoutPadding) {
    PropertyValue reports = host.copyProperty("FirmwareDebugReports");
    ASSERT_NE(reports.find("0x04"), nullptr);
    EXPECT_EQ(*reports.find("0x04"), PropertyValue("Failed to get report ID 0x4: 0xe00002c7"));
    EXPECT_EQ(*reports.find("0x3f"), PropertyValue("Failed to get report ID 0x3f: 0xe00002c7"));
}

TEST_F(TolkaTouchHIDServiceDeviceCallsTest, PipelineKeysNeverReachTheDeviceWhateverTheirSubKey) {
    EXPECT_TRUE(host.copyProperty("Pipeline.Version").isNull());
    EXPECT_TRUE(host.copyProperty("Pipeline.Recording").isNull());
    EXPECT_TRUE(host.setProperty("Pipeline.Version", PropertyValue(1)));
    EXPECT_TRUE(device->calls().empty());
}

TEST_F(TolkaTouchHIDServiceDeviceCallsTest, ServiceKeysAreReadByTheServiceAndWrittenToTheDevice) {
    host.copyProperty("Version");
    host.copyProperty("Recording");
    EXPECT_TRUE(device->calls().empty());
    EXPECT_TRUE(host.setProperty("Recording", PropertyValue("x")));
    host.copyProperty("Other");
    EXPECT_EQ(device->calls(), (std::vector<std::string>{"setProperty Recording \"x\"", "getProperty Other"}));
}

}  // namespace
}  // namespace TolkaTouch

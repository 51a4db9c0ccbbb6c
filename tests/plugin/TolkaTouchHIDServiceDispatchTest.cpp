// Reports written into the device reach the recording and the pipeline on the input report
// thread; the probes log and trace; events reach the host's callback on the host's queue.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <optional>
#include <thread>

#include "pipeline/PipelineRecording.h"
#include "tests/plugin/PlugInHost.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

using Testing::eventually;
using Testing::firmwareEventReport;
using Testing::imageReport;
using Testing::PlugInHost;
using Testing::SinkInstallation;

constexpr uint32_t kTraceInputReport = 0x2B150180;
constexpr uint32_t kTraceDispatchLanded = 0x2B150184;
constexpr uint32_t kTraceDispatchEvent = 0x2B150188;
constexpr uint32_t kTraceFirmwareEvent = 0x2B15018C;

// The HIDService lines of the thread that wrote `marker`, in order.
std::vector<std::string> linesOfThreadThatWrote(const Testing::ThreadTaggedLogSink& sink, const std::string& marker) {
    std::optional<std::thread::id> thread;
    for (const auto& line : sink.lines()) {
        if (line.record.message == marker) thread = line.thread;
    }
    std::vector<std::string> lines;
    if (!thread) return lines;
    for (const auto& line : sink.lines()) {
        if (line.thread == *thread && line.record.category == "HIDService") lines.push_back(line.record.message);
    }
    return lines;
}

LogLevel levelOf(const Testing::ThreadTaggedLogSink& sink, const std::string& message) {
    for (const auto& line : sink.lines()) {
        if (line.record.message == message) return line.record.level;
    }
    ADD_FAILURE() << "no line " << message;
    return LogLevel::Debug;
}

// Runs the host on a fresh service with the sinks installed; `settle` writes a firmware reset and
// waits for its event, by which time every report written before it has been handled.
struct TolkaTouchHIDServiceDispatchTest : ::testing::Test {
    SinkInstallation sinks;
    PlugInHost host;
    size_t expected = 0;

    void SetUp() override {
        host.run();
        sinks.log->clear();
        sinks.trace->clear();
    }
    void TearDown() override { host.halt(); }
    void settle() {
        host.write(firmwareEventReport(0));
        ASSERT_TRUE(host.collector.waitForCount(++expected));
    }
};

TEST_F(TolkaTouchHIDServiceDispatchTest, InputReportProbeGivenLengthZeroTracesFourZeros) {
    host.write({});
    settle();
    std::vector<Trace::Record> traces = sinks.traces(kTraceInputReport);
    ASSERT_EQ(traces.size(), 2u);
    EXPECT_EQ(traces[0], (Trace::Record{kTraceInputReport, 0, 0, 0, 0}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, InvalidInputReportProbeGivenLengthZeroLogsLenZero) {
    host.write({});
    settle();
    std::vector<std::string> lines = linesOfThreadThatWrote(*sinks.log, "Input report probe");
    ASSERT_GE(lines.size(), 3u);
    EXPECT_EQ(lines[1], "Input report probe");
    EXPECT_EQ(lines[2], "Invalid input report len==0");
    EXPECT_EQ(levelOf(*sinks.log, "Invalid input report len==0"), LogLevel::Debug);
}

TEST_F(TolkaTouchHIDServiceDispatchTest, InputReportProbeGivenTwoBytesTracesThemThenZeros) {
    host.write({0x05, 0x06});
    settle();
    std::vector<Trace::Record> traces = sinks.traces(kTraceInputReport);
    ASSERT_EQ(traces.size(), 2u);
    EXPECT_EQ(traces[0], (Trace::Record{kTraceInputReport, 5, 6, 0, 0}));
    EXPECT_EQ(traces[1], (Trace::Record{kTraceInputReport, 2, 0, 0, 0}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, InvalidInputReportIsLoggedWithItsID) {
    std::vector<uint8_t> report(50, 0);
    report[0] = 1;  // an image report ID with the wrong length
    host.write(report);
    settle();
    std::vector<std::string> lines = linesOfThreadThatWrote(*sinks.log, "Input report probe");
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "Invalid input report with ID 1"), 1);
    EXPECT_TRUE(sinks.traces(kTraceDispatchLanded).size() == 1u);
}

TEST_F(TolkaTouchHIDServiceDispatchTest, FirmwareEventContextIsReadMostSignificantByteFirst) {
    host.write(firmwareEventReport(3, {1, 2, 3, 4, 5, 6, 7, 8}));
    settle();
    EXPECT_EQ(levelOf(*sinks.log, "Firmware event probe; event: 3, context: 102030405060708"), LogLevel::Default);
    std::vector<Trace::Record> traces = sinks.traces(kTraceFirmwareEvent);
    ASSERT_EQ(traces.size(), 2u);
    EXPECT_EQ(traces[0], (Trace::Record{kTraceFirmwareEvent, 3, 0x0102030405060708, 0, 0}));
    EXPECT_EQ(traces[1], (Trace::Record{kTraceFirmwareEvent, 0, 0, 0, 0}));
    EXPECT_EQ(sinks.traces(kTraceInputReport)[0], (Trace::Record{kTraceInputReport, 2, 3, 1, 2}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, ReportThatYieldsNoEventsQueuesNothing) {
    host.write(firmwareEventReport(3));
    host.write(imageReport(1, 10));
    settle();
    EXPECT_EQ(sinks.traces(kTraceDispatchLanded), (std::vector<Trace::Record>{{kTraceDispatchLanded, 1, 0, 0, 0}}));
    EXPECT_EQ(host.collector.count(), 1u);
    std::vector<std::string> lines = sinks.log->messages();
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "HID events probe: 1 event(s)"), 1);
    EXPECT_EQ(std::count(lines.begin(), lines.end(), "Dispatch 1 event(s) takeoff"), 1);
}

TEST_F(TolkaTouchHIDServiceDispatchTest, FirmwareResetReachesTheCallbackOnTheHostsQueue) {
    settle();
    std::vector<Testing::ReceivedEvent> events = host.collector.events();
    ASSERT_EQ(events.size(), 1u);
    const Testing::ReceivedEvent& received = events[0];
    EXPECT_EQ(received.target, static_cast<void*>(&host.collector));
    EXPECT_EQ(received.refcon, static_cast<void*>(&host));
    EXPECT_EQ(received.sender, static_cast<void*>(host.service));
    EXPECT_EQ(received.options, 0u);
    EXPECT_TRUE(received.onQueue);
    EXPECT_EQ(received.event->type, HIDEventType::VendorDefined);
    EXPECT_EQ(received.event->usagePage, 0xFF60u);
    EXPECT_EQ(received.event->usage, 2u);

    // Never on the input report thread, the one that ran the probes.
    for (const auto& line : sinks.log->lines()) {
        if (line.record.message == "Input report probe") {
            EXPECT_NE(line.thread, received.thread);
        }
    }
}

TEST_F(TolkaTouchHIDServiceDispatchTest, OneReportLogsItsWayFromTheDeviceToTheHost) {
    host.device->setTimestampSource([] { return uint64_t{123456789}; });
    settle();
    std::vector<Testing::ReceivedEvent> events = host.collector.events();
    ASSERT_EQ(events.size(), 1u);
    EXPECT_EQ(linesOfThreadThatWrote(*sinks.log, "Input report probe"),
              (std::vector<std::string>{
                  "Received input report (type 0, reportID 2, reportLength 10, timestampMach 123456789)",
                  "Input report probe",
                  "Firmware event probe; event: 0, context: 0",
                  "HID events probe: 1 event(s)",
                  "Dispatch 1 event(s) takeoff",
              }));
    EXPECT_EQ(linesOfThreadThatWrote(*sinks.log, "Dispatch 1 event(s) land"),
              (std::vector<std::string>{
                  "Dispatch 1 event(s) land",
                  "Dispatch event: " + events[0].event->description(),
              }));
    EXPECT_EQ(levelOf(*sinks.log, "Dispatch event: " + events[0].event->description()), LogLevel::Default);
    EXPECT_EQ(sinks.traces(kTraceDispatchLanded), (std::vector<Trace::Record>{{kTraceDispatchLanded, 1, 0, 0, 0}}));
    EXPECT_EQ(sinks.traces(kTraceDispatchEvent),
              (std::vector<Trace::Record>{{kTraceDispatchEvent, 1 /* vendor-defined */, 0, 0, 0}}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, ImagesAreLoggedAndADisjointOneAtErrorLevel) {
    host.write(imageReport(5, 100));
    host.write(imageReport(6, 110));
    host.write(imageReport(8, 120));
    settle();
    EXPECT_EQ(levelOf(*sinks.log, "Received image frame: 5"), LogLevel::Default);
    EXPECT_EQ(levelOf(*sinks.log, "Received image frame: 8"), LogLevel::Default);
    EXPECT_EQ(levelOf(*sinks.log, "Disjoint image (frame number: 6 -> 8)\n\n"), LogLevel::Error);
    EXPECT_EQ(host.copyProperty("Pipeline.DebugInfo"),
              PropertyValue(PropertyValue::Dictionary{{"DisjointImageCount", PropertyValue(1u)},
                                                      {"ResetCount", PropertyValue(1u)}}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, EventsCarryTheRecordingsClockReadingOfTheirReport) {
    for (int i = 0; i < 5; ++i) settle();
    PropertyValue document = host.copyProperty("Recording");
    std::vector<uint8_t> bytes(document.string()->begin(), document.string()->end());
    PipelineRecording recording(&bytes);
    std::vector<uint64_t> recorded;
    for (const auto& frame : recording.frames()) recorded.push_back(frame.timestamp);
    std::vector<uint64_t> stamped;
    for (const auto& received : host.collector.events()) stamped.push_back(received.event->timestamp);
    EXPECT_EQ(stamped, recorded);  // the host clock's timebase is 1/1 here
}

TEST_F(TolkaTouchHIDServiceDispatchTest, SetOutputEventAnswersUnsupportedForAnyEvent) {
    HIDEventRef event = makeDigitizerEvent(0, HIDEventPhase::Began, 1);
    EXPECT_EQ((*host.service)->setOutputEvent(host.service, &event), HIDResult::Unsupported);
    EXPECT_EQ((*host.service)->setOutputEvent(host.service, nullptr), HIDResult::Unsupported);
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{"setOutputEvent:", "setOutputEvent:"}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, CopyEventAnswersNullForAnyArguments) {
    HIDEventRef event = GestureCodec::encode(GestureKind::Reset);
    EXPECT_EQ((*host.service)->copyEvent(host.service, 11, &event, 1), nullptr);
    EXPECT_EQ((*host.service)->copyEvent(host.service, 0, nullptr, 0), nullptr);
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{"copyEventWithType:matching:options:",
                                                               "copyEventWithType:matching:options:"}));
}

TEST_F(TolkaTouchHIDServiceDispatchTest, SetEventCallbackLogsItsName) {
    host.setEventCallback();
    EXPECT_EQ(sinks.log->messages(), std::vector<std::string>{"setEventCallback:target:refcon:"});
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/HidrawDevice.h"

#include <gtest/gtest.h>
#include <linux/input.h>
#include <unistd.h>

#include <cerrno>
#include <vector>

#include "platform/RunLoop.h"

namespace TolkaTouch {
namespace {

using Bytes = std::vector<uint8_t>;
using RunResult = RunLoop::RunResult;

constexpr double kGenerousSeconds = 10.0;
const std::string kMode = "HidrawDeviceMode";

struct Receiver {
    std::vector<Bytes> reports;
    std::vector<uint32_t> reportIDs;
    std::vector<void*> senders;

    static void callback(void* context, uint32_t, void* sender, HIDReportType, uint32_t reportID, const uint8_t* report,
                         size_t length, uint64_t) {
        auto* self = static_cast<Receiver*>(context);
        self->reports.emplace_back(report, report + length);
        self->reportIDs.push_back(reportID);
        self->senders.push_back(sender);
    }
};

// A hidraw handle whose node is the read end of a pipe: each write to the pipe is one report,
// closing the write end is the device going away.
struct PipeDevice {
    int writeEnd = -1;
    std::shared_ptr<HidrawDevice> device;
    std::shared_ptr<RunLoop> loop = RunLoop::current();
    uint8_t buffer[512] = {};
    Receiver receiver;

    PipeDevice() {
        int fds[2];
        EXPECT_EQ(::pipe(fds), 0);
        writeEnd = fds[1];
        device = HidrawDevice::adopt(fds[0], "pipe");
        device->open(0);
        device->registerInputReportCallback(buffer, sizeof buffer, Receiver::callback, &receiver);
        device->scheduleWithRunLoop(*loop, kMode);
    }
    ~PipeDevice() {
        device.reset();
        closeWriteEnd();
    }
    void write(const Bytes& report) const {
        ASSERT_EQ(::write(writeEnd, report.data(), report.size()), static_cast<ssize_t>(report.size()));
    }
    void closeWriteEnd() {
        if (writeEnd >= 0) {
            ::close(writeEnd);
            writeEnd = -1;
        }
    }
};

TEST(HidrawDeviceTest, MissingNodeAnswersNoDevice) {
    uint32_t result = HIDResult::Success;
    EXPECT_EQ(HidrawDevice::create("/dev/hidraw-that-does-not-exist", &result), nullptr);
    EXPECT_EQ(result, 0xE00002C0u);
    EXPECT_EQ(HidrawDevice::create("/dev/hidraw-that-does-not-exist"), nullptr);
}

TEST(HidrawDeviceTest, NodeThatIsNotHidrawAnswersUnsupported) {
    uint32_t result = HIDResult::Success;
    EXPECT_EQ(HidrawDevice::create("/dev/null", &result), nullptr);
    EXPECT_EQ(result, HIDResult::Unsupported);
}

TEST(HidrawDeviceTest, EachReadIsOneReportWithItsIDByte) {
    PipeDevice fixture;
    fixture.write(Bytes{0x01, 0x11, 0x22});
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, true), RunResult::HandledSource);
    fixture.write(Bytes{0x02, 0x33});
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, true), RunResult::HandledSource);
    EXPECT_EQ(fixture.receiver.reports, (std::vector<Bytes>{{0x01, 0x11, 0x22}, {0x02, 0x33}}));
    EXPECT_EQ(fixture.receiver.reportIDs, (std::vector<uint32_t>{1, 2}));
    EXPECT_EQ(fixture.receiver.senders[0], static_cast<HIDDevice*>(fixture.device.get()));
}

TEST(HidrawDeviceTest, EndOfTheStreamRemovesTheDeviceAndCallsTheHandlerOnce) {
    PipeDevice fixture;
    int removals = 0;
    fixture.device->setRemovalHandler([&] { ++removals; });
    fixture.write(Bytes{0x01, 0x01});
    fixture.closeWriteEnd();
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, false), RunResult::Finished);
    EXPECT_EQ(removals, 1);
    EXPECT_TRUE(fixture.device->isRemoved());
    EXPECT_EQ(fixture.receiver.reports, (std::vector<Bytes>{{0x01, 0x01}}));
    uint8_t buffer[8];
    size_t length = sizeof buffer;
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x10, buffer, length), HIDResult::NoDevice);
}

TEST(HidrawDeviceTest, FeatureRequestOnANodeWithoutItAnswersUnsupported) {
    PipeDevice fixture;
    uint8_t buffer[128] = {};
    size_t length = sizeof buffer;
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x10, buffer, length), 0xE00002C7u);
    EXPECT_EQ(length, 128u);
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Input, 0x10, buffer, length), HIDResult::Unsupported);
}

TEST(HidrawDeviceTest, BadReportRequestsAnswerBadArgument) {
    PipeDevice fixture;
    uint8_t buffer[4];
    size_t length = sizeof buffer;
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x10, nullptr, length), HIDResult::BadArgument);
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x100, buffer, length), HIDResult::BadArgument);
    length = 0;
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x10, buffer, length), HIDResult::BadArgument);
}

TEST(HidrawDeviceTest, NodeWithoutInfoHasOnlyTheHandlesOwnProperties) {
    PipeDevice fixture;
    EXPECT_TRUE(fixture.device->getProperty("VendorID").isNull());
    EXPECT_TRUE(fixture.device->getProperty("Transport").isNull());
    EXPECT_TRUE(fixture.device->setProperty("VendorID", PropertyValue(0x1234)));
    EXPECT_EQ(fixture.device->getProperty("VendorID"), PropertyValue(0x1234));
    EXPECT_FALSE(fixture.device->setProperty("", PropertyValue(1)));
    EXPECT_EQ(fixture.device->path(), "pipe");
}

TEST(HidrawDeviceTest, OpenAndCloseAnswerResultCodes) {
    PipeDevice fixture;
    EXPECT_EQ(fixture.device->close(0), HIDResult::Success);
    EXPECT_EQ(fixture.device->close(0), HIDResult::NotOpen);
    EXPECT_EQ(fixture.device->open(0), HIDResult::Success);
}

TEST(HidrawDeviceTest, BusTypesNameTheirTransport) {
    EXPECT_EQ(HidrawDevice::transportName(BUS_USB), "USB");
    EXPECT_EQ(HidrawDevice::transportName(BUS_BLUETOOTH), "Bluetooth");
    EXPECT_EQ(HidrawDevice::transportName(BUS_VIRTUAL), "Virtual");
    EXPECT_EQ(HidrawDevice::transportName(BUS_I2C), "I2C");
    EXPECT_EQ(HidrawDevice::transportName(BUS_SPI), "SPI");
    EXPECT_EQ(HidrawDevice::transportName(0x99), "Unknown");
}

TEST(HidrawDeviceTest, ReportDescriptorWithAReportIDItemUsesReportIDs) {
    // Usage page (vendor), usage, collection, report ID 1, report size 8, end collection.
    const Bytes numbered{0x06, 0x00, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0x85, 0x01, 0x75, 0x08, 0xC0};
    EXPECT_TRUE(HidrawDevice::descriptorUsesReportIDs(numbered.data(), numbered.size()));
    const Bytes plain{0x06, 0x00, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0x75, 0x08, 0xC0};
    EXPECT_FALSE(HidrawDevice::descriptorUsesReportIDs(plain.data(), plain.size()));
}

TEST(HidrawDeviceTest, ReportIDByteInsideItemDataIsNotAReportIDItem) {
    // Logical maximum with the two data bytes 0x85 0x00, then a long item carrying 0x85.
    const Bytes descriptor{0x26, 0x85, 0x00, 0xFE, 0x02, 0x10, 0x85, 0x85};
    EXPECT_FALSE(HidrawDevice::descriptorUsesReportIDs(descriptor.data(), descriptor.size()));
    const Bytes truncated{0x27, 0x85};
    EXPECT_FALSE(HidrawDevice::descriptorUsesReportIDs(truncated.data(), truncated.size()));
    EXPECT_FALSE(HidrawDevice::descriptorUsesReportIDs(nullptr, 0));
}

TEST(HidrawDeviceTest, ErrorNumbersMapToResultCodes) {
    EXPECT_EQ(HidrawDevice::resultForErrno(0), HIDResult::Success);
    EXPECT_EQ(HidrawDevice::resultForErrno(ENOENT), HIDResult::NoDevice);
    EXPECT_EQ(HidrawDevice::resultForErrno(ENODEV), HIDResult::NoDevice);
    EXPECT_EQ(HidrawDevice::resultForErrno(EACCES), HIDResult::NotPrivileged);
    EXPECT_EQ(HidrawDevice::resultForErrno(ENOTTY), HIDResult::Unsupported);
    EXPECT_EQ(HidrawDevice::resultForErrno(EPIPE), HIDResult::Unsupported);
    EXPECT_EQ(HidrawDevice::resultForErrno(ETIMEDOUT), HIDResult::Timeout);
    EXPECT_EQ(HidrawDevice::resultForErrno(EIO), HIDResult::IOError);
    EXPECT_EQ(HidrawDevice::resultForErrno(EBUSY), HIDResult::Error);
}

}  // namespace
}  // namespace TolkaTouch

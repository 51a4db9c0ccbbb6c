#include "tools/VirtualSurface.h"

#include <gtest/gtest.h>

#include <linux/input.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/ReportDescriptor.h"

namespace TolkaTouch {
namespace {

using Bytes = std::vector<uint8_t>;

VirtualSurface::Options surfaceOptions() {
    VirtualSurface::Options options;
    options.vendor = VirtualSurface::kDefaultVendorId;
    options.product = VirtualSurface::kDefaultProductId;
    options.featureReports = VirtualSurface::defaultFeatureReports();
    return options;
}

uhid_event getReport(uint32_t id, uint8_t reportID, uint8_t type = UHID_FEATURE_REPORT) {
    uhid_event event{};
    event.type = UHID_GET_REPORT;
    event.u.get_report.id = id;
    event.u.get_report.rnum = reportID;
    event.u.get_report.rtype = type;
    return event;
}

uhid_event kernelEvent(uint32_t type) {
    uhid_event event{};
    event.type = type;
    return event;
}

Bytes replyBytes(const uhid_event& reply) {
    return Bytes(reply.u.get_report_reply.data, reply.u.get_report_reply.data + reply.u.get_report_reply.size);
}

std::string featureError(const std::string& text) {
    try {
        VirtualSurface::featureFromOption(text);
    } catch (const std::invalid_argument& error) {
        return error.what();
    }
    return "no error";
}

TEST(VirtualSurfaceTest, CarriesTheIDsTheDaemonLooksForByDefault) {
    EXPECT_EQ(VirtualSurface::kDefaultVendorId, 0x1209);
    EXPECT_EQ(VirtualSurface::kDefaultProductId, 0x0001);
}

TEST(VirtualSurfaceTest, CreateRequestCarriesTheDescriptorNameAndIDsOnTheUSBBus) {
    VirtualSurface::Options options = surfaceOptions();
    options.name = "surface under test";
    const uhid_event event = VirtualSurface::createRequest(options);
    EXPECT_EQ(event.type, uint32_t(UHID_CREATE2));
    EXPECT_STREQ(reinterpret_cast<const char*>(event.u.create2.name), "surface under test");
    EXPECT_EQ(event.u.create2.bus, BUS_USB);
    EXPECT_EQ(event.u.create2.vendor, 0x1209u);
    EXPECT_EQ(event.u.create2.product, 0x0001u);
    ASSERT_EQ(event.u.create2.rd_size, ReportDescriptor::kBytes.size());
    EXPECT_EQ(Bytes(event.u.create2.rd_data, event.u.create2.rd_data + event.u.create2.rd_size),
              Bytes(ReportDescriptor::kBytes.begin(), ReportDescriptor::kBytes.end()));
}

TEST(VirtualSurfaceTest, DefaultAnswersCoverEveryFeatureReportTheDescriptorDeclares) {
    const auto answers = VirtualSurface::defaultFeatureReports();
    EXPECT_EQ(answers.size(), 11u);
    EXPECT_EQ(answers.at(0x1F), (Bytes{0x1F, 0x88, 0x13, 0x00, 0x00}));  // 5000
    EXPECT_EQ(answers.at(0x04), (Bytes{0x04, 0x05, 0x06, 0x07, 0x08, 0x09, 0x0A, 0x0B, 0x0C}));
    for (const auto& report : ReportDescriptor::kDiagnosticReports) {
        EXPECT_EQ(answers.at(report.id).size(), 1u + report.payloadLength) << int(report.id);
    }
}

TEST(VirtualSurfaceTest, AFeatureReportReadIsAnsweredWithItsBytesUnderTheRequestsID) {
    VirtualSurface::Status status;
    auto reply = VirtualSurface::answer(getReport(77, 0x1F), surfaceOptions(), status);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->type, uint32_t(UHID_GET_REPORT_REPLY));
    EXPECT_EQ(reply->u.get_report_reply.id, 77u);
    EXPECT_EQ(reply->u.get_report_reply.err, 0);
    EXPECT_EQ(replyBytes(*reply), (Bytes{0x1F, 0x88, 0x13, 0x00, 0x00}));
    EXPECT_EQ(status.featureRequests, 1u);
}

TEST(VirtualSurfaceTest, AFailingReportIsAnsweredWithAnIOError) {
    VirtualSurface::Options options = surfaceOptions();
    options.failingReports = {0x10};
    VirtualSurface::Status status;
    auto reply = VirtualSurface::answer(getReport(3, 0x10), options, status);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->u.get_report_reply.id, 3u);
    EXPECT_EQ(reply->u.get_report_reply.err, EIO);
    EXPECT_EQ(reply->u.get_report_reply.size, 0);
}

TEST(VirtualSurfaceTest, AnUndeclaredReportOrAnInputReportReadIsAnsweredWithInvalidArgument) {
    VirtualSurface::Status status;
    EXPECT_EQ(VirtualSurface::answer(getReport(1, 0x05), surfaceOptions(), status)->u.get_report_reply.err, EINVAL);
    EXPECT_EQ(VirtualSurface::answer(getReport(2, 0x1F, UHID_INPUT_REPORT), surfaceOptions(), status)
                  ->u.get_report_reply.err,
              EINVAL);
}

TEST(VirtualSurfaceTest, AFeatureWriteIsAcknowledged) {
    uhid_event request = kernelEvent(UHID_SET_REPORT);
    request.u.set_report.id = 9;
    VirtualSurface::Status status;
    auto reply = VirtualSurface::answer(request, surfaceOptions(), status);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->type, uint32_t(UHID_SET_REPORT_REPLY));
    EXPECT_EQ(reply->u.set_report_reply.id, 9u);
    EXPECT_EQ(reply->u.set_report_reply.err, 0);
}

TEST(VirtualSurfaceTest, StartOpenAndCloseAreFollowedWithoutReply) {
    VirtualSurface::Status status;
    const auto options = surfaceOptions();
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_START), options, status).has_value());
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_OPEN), options, status).has_value());
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_OPEN), options, status).has_value());
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_CLOSE), options, status).has_value());
    EXPECT_TRUE(status.started);
    EXPECT_TRUE(status.everOpened);
    EXPECT_EQ(status.openCount, 1);
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_OUTPUT), options, status).has_value());
    EXPECT_FALSE(VirtualSurface::answer(kernelEvent(UHID_STOP), options, status).has_value());
    EXPECT_FALSE(status.started);
}

TEST(VirtualSurfaceTest, FeatureSpecReadsTheIDInHexOrDecimalAndTheBytesAfterIt) {
    EXPECT_EQ(VirtualSurface::featureFromOption("0x1f=88130000").second, (Bytes{0x1F, 0x88, 0x13, 0x00, 0x00}));
    EXPECT_EQ(VirtualSurface::featureFromOption("31=88 13:00 00").second, (Bytes{0x1F, 0x88, 0x13, 0x00, 0x00}));
    EXPECT_EQ(VirtualSurface::featureFromOption("0x10=").second, (Bytes{0x10}));
    EXPECT_EQ(VirtualSurface::featureFromOption("010=ff").first, 10);
}

TEST(VirtualSurfaceTest, FeatureSpecRefusesWhatItCannotRead) {
    EXPECT_EQ(featureError("1f"), "expected ID=HEX, got 1f");
    EXPECT_EQ(featureError("x=00"), "not a report ID from 1 to 255: x");
    EXPECT_EQ(featureError("0=00"), "not a report ID from 1 to 255: 0");
    EXPECT_EQ(featureError("256=00"), "not a report ID from 1 to 255: 256");
    EXPECT_EQ(featureError("-1=00"), "not a report ID from 1 to 255: -1");
    EXPECT_EQ(featureError("0x1f=8"), "odd number of hex digits: 0x1f=8");
    EXPECT_EQ(featureError("0x1f=zz"), "not hex: 0x1f=zz");
    EXPECT_EQ(featureError("0x1f=" + std::string(256, '0')), "longer than 127 bytes after the ID: 0x1f=" + std::string(256, '0'));
}

TEST(VirtualSurfaceTest, AMissingUhidNodeIsAOneLineError) {
    try {
        VirtualSurface surface(surfaceOptions(), "/nonexistent/uhid");
        FAIL() << "no error";
    } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), "cannot open /nonexistent/uhid: No such file or directory");
    }
}

TEST(VirtualSurfaceTest, WritesCreateInputAndDestroyInThatOrder) {
    char path[] = "/tmp/tolka-uhid-XXXXXX";
    int fd = ::mkstemp(path);
    ASSERT_GE(fd, 0);
    ::close(fd);
    {
        VirtualSurface surface(surfaceOptions(), path);
        surface.sendInputReport({0x02, 0x00, 1, 2, 3, 4, 5, 6, 7, 8});
        surface.destroy();
        surface.destroy();  // once only
    }
    std::ifstream in(path, std::ios::binary);
    Bytes written((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    ::unlink(path);
    ASSERT_EQ(written.size(), 3 * sizeof(uhid_event));
    const auto* events = reinterpret_cast<const uhid_event*>(written.data());
    EXPECT_EQ(events[0].type, uint32_t(UHID_CREATE2));
    EXPECT_EQ(events[1].type, uint32_t(UHID_INPUT2));
    EXPECT_EQ(Bytes(events[1].u.input2.data, events[1].u.input2.data + events[1].u.input2.size),
              (Bytes{0x02, 0x00, 1, 2, 3, 4, 5, 6, 7, 8}));
    EXPECT_EQ(events[2].type, uint32_t(UHID_DESTROY));
}

}  // namespace
}  // namespace TolkaTouch

#include "tools/ReportSource.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "common/Reports.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {
namespace {

using Status = ReportSource::Status;

std::filesystem::path streamFile(const char* name, const std::vector<uint8_t>& bytes) {
    const auto path = std::filesystem::temp_directory_path() /
                      (std::string("tolkatouch-test-") + std::to_string(::getpid()) + "-" + name);
    std::ofstream(path, std::ios::binary).write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    return path;
}

std::vector<uint8_t> report(uint8_t id, size_t length) {
    std::vector<uint8_t> bytes(length, 0x5a);
    bytes[0] = id;
    return bytes;
}

TEST(ReportSourceTest, StreamIsCutIntoReportsByTheLengthOfEachID) {
    std::vector<uint8_t> bytes = report(InputReport::kImageReportID, 73);
    const std::vector<uint8_t> event = report(InputReport::kFirmwareEventReportID, 10);
    bytes.insert(bytes.end(), event.begin(), event.end());
    const auto path = streamFile("two-reports", bytes);
    ReportSource source(path.string());
    EXPECT_FALSE(source.isHidraw());

    ReportSource::Outcome first = source.next(100);
    EXPECT_EQ(first.status, Status::Report);
    EXPECT_EQ(first.report, report(InputReport::kImageReportID, 73));
    ReportSource::Outcome second = source.next(100);
    EXPECT_EQ(second.status, Status::Report);
    EXPECT_EQ(second.report, event);
    ReportSource::Outcome end = source.next(100);
    EXPECT_EQ(end.status, Status::Gone);
    EXPECT_EQ(end.reason, "no more reports");
    std::filesystem::remove(path);
}

TEST(ReportSourceTest, StreamEndingInsideAReportIsGoneSayingSo) {
    const auto path = streamFile("cut", report(InputReport::kImageReportID, 50));
    ReportSource source(path.string());
    ReportSource::Outcome outcome = source.next(100);
    EXPECT_EQ(outcome.status, Status::Gone);
    EXPECT_EQ(outcome.reason, "it ended in the middle of a report");
    std::filesystem::remove(path);
}

TEST(ReportSourceTest, ReportWithAnIDTheSurfaceNeverSendsIsGoneNamingTheID) {
    const auto path = streamFile("unknown-id", report(0x42, 20));
    ReportSource source(path.string());
    ReportSource::Outcome outcome = source.next(100);
    EXPECT_EQ(outcome.status, Status::Gone);
    EXPECT_EQ(outcome.reason, "a report with the unknown ID 66");
    std::filesystem::remove(path);
}

TEST(ReportSourceTest, PipeWithNothingYetWaitsAndTimesOut) {
    int fds[2];
    ASSERT_EQ(::pipe(fds), 0);
    ReportSource source("/proc/self/fd/" + std::to_string(fds[0]));
    EXPECT_EQ(source.next(10).status, Status::Timeout);
    const std::vector<uint8_t> event = report(InputReport::kFirmwareEventReportID, 10);
    ASSERT_EQ(::write(fds[1], event.data(), 4), 4);
    EXPECT_EQ(source.next(10).status, Status::Timeout);
    ASSERT_EQ(::write(fds[1], event.data() + 4, 6), 6);
    ReportSource::Outcome outcome = source.next(10);
    EXPECT_EQ(outcome.status, Status::Report);
    EXPECT_EQ(outcome.report, event);
    ::close(fds[1]);
    EXPECT_EQ(source.next(10).status, Status::Gone);
    ::close(fds[0]);
}

TEST(ReportSourceTest, PathThatCannotBeOpenedIsAToolErrorNamingIt) {
    try {
        ReportSource source("/nonexistent/hidraw9");
        FAIL() << "no error";
    } catch (const ToolError& error) {
        EXPECT_STREQ(error.what(), "/nonexistent/hidraw9: No such file or directory");
    }
}

}  // namespace
}  // namespace TolkaTouch::Tools

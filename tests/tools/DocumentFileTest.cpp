#include "tools/DocumentFile.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>

namespace TolkaTouch::Tools {
namespace {

std::string errorOf(const std::function<void()>& action) {
    try {
        action();
    } catch (const ToolError& error) {
        return error.what();
    }
    return "no error";
}

std::filesystem::path scratchFile(const char* name) {
    return std::filesystem::temp_directory_path() / (std::string("tolkatouch-test-") + std::to_string(::getpid()) + "-" + name);
}

TEST(DocumentFileTest, WrittenBytesReadBack) {
    const auto path = scratchFile("bytes");
    writeFileBytes(path, {1, 2, 3, 0, 255});
    EXPECT_EQ(readFileBytes(path), (std::vector<uint8_t>{1, 2, 3, 0, 255}));
    std::filesystem::remove(path);
}

TEST(DocumentFileTest, MissingFileGivesTheSystemsReason) {
    EXPECT_EQ(errorOf([] { readFileBytes("/nonexistent/recording.json"); }), "/nonexistent/recording.json: No such file or directory");
    EXPECT_EQ(errorOf([] { writeFileBytes("/nonexistent/out.json", {}); }), "/nonexistent/out.json: No such file or directory");
}

TEST(DocumentFileTest, ReaderMessageNamesTheDocument) {
    const std::string text = "[]";
    EXPECT_EQ(errorOf([&] { recordingFromDocument(std::vector<uint8_t>(text.begin(), text.end()), "x.json"); }),
              "x.json: migrateSerializedContainer failed: invalid container");
}

TEST(DocumentFileTest, DocumentRoundTripKeepsTheFrames) {
    PipelineRecording recording;
    recording.appendFrame(PipelineRecording::Frame::inputReport(1000, {2, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    recording.appendFrame(PipelineRecording::Frame::state(2000, "Algs.HoldTimeoutMilliseconds", PropertyValue(700u)));
    const auto path = scratchFile("document");
    writeFileBytes(path, recording.json());
    const PipelineRecording loaded = loadRecording(path);
    ASSERT_EQ(loaded.frames().size(), 2u);
    EXPECT_EQ(loaded.frames().front().report, recording.frames().front().report);
    EXPECT_EQ(loaded.frames().back().key, "Algs.HoldTimeoutMilliseconds");
    std::filesystem::remove(path);
}

}  // namespace
}  // namespace TolkaTouch::Tools

#include "tools/RecordOutput.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {
namespace {

std::filesystem::path scratchFolder(const char* name) {
    const auto folder = std::filesystem::temp_directory_path() /
                        (std::string("tolkatouch-test-") + std::to_string(::getpid()) + "-" + name);
    std::filesystem::remove_all(folder);
    std::filesystem::create_directories(folder);
    return folder;
}

std::string firstLine(const std::filesystem::path& path) {
    std::ifstream in(path);
    std::string line;
    std::getline(in, line);
    return line;
}

RecordingLinesHeader header() {
    RecordingLinesHeader header;
    header.settings["Algs.HoldTimeoutMilliseconds"] = PropertyValue(int64_t{650});
    return header;
}

TEST(RecordOutputTest, RotationSizesReadAsBytesKibiMebiAndGibibytes) {
    EXPECT_EQ(rotationFromText("4096")->bytes, 4096u);
    EXPECT_EQ(rotationFromText("512K")->bytes, 512u * 1024);
    EXPECT_EQ(rotationFromText("100M")->bytes, 100u * 1024 * 1024);
    EXPECT_EQ(rotationFromText("2G")->bytes, 2ull * 1024 * 1024 * 1024);
    EXPECT_FALSE(rotationFromText("100M")->nanoseconds.has_value());
}

TEST(RecordOutputTest, RotationDurationsReadAsSecondsMinutesAndHours) {
    EXPECT_EQ(rotationFromText("30s")->nanoseconds, 30'000'000'000ull);
    EXPECT_EQ(rotationFromText("10min")->nanoseconds, 600'000'000'000ull);
    EXPECT_EQ(rotationFromText("1.5h")->nanoseconds, 5'400'000'000'000ull);
    EXPECT_FALSE(rotationFromText("1h")->bytes.has_value());
}

TEST(RecordOutputTest, RotationRefusesOtherUnitsNoNumberAndFilesTooSmallOrTooShort) {
    for (const char* text : {"10parsecs", "", "K", "s", "100", "4095", "0.5s", "1.2.3M", "-5M"}) {
        EXPECT_FALSE(rotationFromText(text).has_value()) << text;
    }
}

TEST(RecordOutputTest, RotatedFilesAreNumberedBeforeTheExtensionAndEachStartsWithTheHeader) {
    const auto folder = scratchFolder("rotation");
    {
        RecordOutput output((folder / "rec.jsonl").string(), true, header(), 1000);
        EXPECT_EQ(output.currentPath(), (folder / "rec.0001.jsonl").string());
        output.rotate(2000);
        EXPECT_EQ(output.currentPath(), (folder / "rec.0002.jsonl").string());
        output.close();
    }
    for (const char* name : {"rec.0001.jsonl", "rec.0002.jsonl"}) {
        EXPECT_EQ(firstLine(folder / name), "{\"Version\":1,\"Format\":\"lines\",\"Settings\":{\"Algs.HoldTimeoutMilliseconds\":650}}")
            << name;
    }
    EXPECT_FALSE(std::filesystem::exists(folder / "rec.jsonl"));
    std::filesystem::remove_all(folder);
}

TEST(RecordOutputTest, RotatedFileWithoutAnExtensionGetsTheNumberAtTheEnd) {
    const auto folder = scratchFolder("no-extension");
    RecordOutput output((folder / "rec").string(), true, header(), 1000);
    EXPECT_EQ(output.currentPath(), (folder / "rec.0001").string());
    output.close();
    std::filesystem::remove_all(folder);
}

TEST(RecordOutputTest, BytesStillInTheWritersBufferAreCounted) {
    const auto folder = scratchFolder("bytes");
    RecordOutput output((folder / "rec.jsonl").string(), false, header(), 1000);
    const uint64_t before = output.fileBytes();
    const uint8_t report[3] = {1, 2, 3};
    output.writer().writeInputReport(2000, report, sizeof report);
    const std::string line = "{\"Type\":\"InputReport\",\"Timestamp\":2000,\"Report\":\"01 02 03 \"}\n";
    EXPECT_EQ(output.fileBytes(), before + line.size());
    EXPECT_EQ(output.totalBytes(), output.fileBytes());
    output.close();
    EXPECT_EQ(std::filesystem::file_size(folder / "rec.jsonl"), before + line.size());
    std::filesystem::remove_all(folder);
}

TEST(RecordOutputTest, FileThatCannotBeCreatedIsAToolErrorNamingIt) {
    try {
        RecordOutput output("/nonexistent-folder/rec.jsonl", false, header(), 1000);
        FAIL() << "no error";
    } catch (const ToolError& error) {
        EXPECT_STREQ(error.what(), "/nonexistent-folder/rec.jsonl: No such file or directory");
    }
}

}  // namespace
}  // namespace TolkaTouch::Tools

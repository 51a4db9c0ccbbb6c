#include "daemon/SimulationFeeder.h"

#include <gtest/gtest.h>

#include "daemon/CountingHIDDevice.h"
#include "platform/SimulatedHIDDevice.h"
#include <unistd.h>

#include <condition_variable>
#include <filesystem>
#include <fstream>
#include <mutex>

namespace TolkaTouch {
namespace {

class SimulationFeederTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/tolkatouchd-feeder-XXXXXX";
        directory = ::mkdtemp(pattern);
    }
    void TearDown() override { std::filesystem::remove_all(directory); }

    std::string write(const std::string& text) {
        std::string path = directory + "/document.json";
        std::ofstream(path) << text;
        return path;
    }

    SimulationFeeder::Target target() {
        SimulationFeeder::Target result;
        result.writeReport = [this](const uint8_t* bytes, size_t length, uint64_t due) {
            std::lock_guard lock(mutex);
            calls.push_back("report " + std::to_string(length) + " " + std::to_string(bytes[0]));
            dues.push_back(due);
        };
        result.applySetting = [this](const std::string& key, const PropertyValue& value) {
            std::lock_guard lock(mutex);
            calls.push_back("set " + key + " " + value.description());
        };
        result.finished = [this] {
            std::lock_guard lock(mutex);
            finished = true;
            changed.notify_all();
        };
        result.failed = [this](const std::string& message) {
            std::lock_guard lock(mutex);
            failure = message;
            changed.notify_all();
        };
        return result;
    }

    // Plays the document at `path` to its end or its failure.
    void play(const std::string& path, float speed = 1.0f) {
        SimulationFeeder feeder(path, speed);
        feeder.start(target());
        std::unique_lock lock(mutex);
        changed.wait(lock, [this] { return finished || !failure.empty(); });
    }

    std::string directory;
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<std::string> calls;
    std::vector<uint64_t> dues;
    bool finished = false;
    std::string failure;
};

TEST_F(SimulationFeederTest, AStateValueNestedAHundredThousandDeepIsRefusedWithoutRecursion) {
    const std::string deep = std::string(100000, '[') + std::string(100000, ']');
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "State", "Timestamp": 1500, "Key": "Algs.X", "Value": )" + deep + "}]}");
    try {
        SimulationFeeder feeder(path, 1.0f);
        FAIL() << "the document was taken";
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()),
                  "the recording " + path + " cannot be played: migrateSerializedContainer failed: invalid container");
    }
}

TEST_F(SimulationFeederTest, AStateValueNestedAHundredThousandDeepPartWayEndsThePlaybackThere) {
    const std::string deep = std::string(100000, '[') + std::string(100000, ']');
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 1000, "Report": "01 02 03 "},
        {"Type": "State", "Timestamp": 1500, "Key": "Algs.X", "Value": )" + deep + "}]}");
    play(path);
    EXPECT_EQ(calls, (std::vector<std::string>{"report 3 1"}));
    EXPECT_EQ(failure, "the recording " + path + " cannot be played after 1 frame: "
                       "migrateSerializedContainer failed: invalid container (in frame 2, at byte 110: arrays and objects "
                       "nested deeper than 512 levels)");
    EXPECT_FALSE(finished);
}

TEST_F(SimulationFeederTest, FramesGoOutInOrderThenFinishedIsCalled) {
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 1000, "Report": "01 02 03 "},
        {"Type": "State", "Timestamp": 1500, "Key": "Algs.HoldTimeoutMilliseconds", "Value": 700},
        {"Type": "InputReport", "Timestamp": 2000, "Report": "02 00 "}]})");
    SimulationFeeder feeder(path, 1.0f);
    feeder.start(target());
    std::unique_lock lock(mutex);
    changed.wait(lock, [this] { return finished; });
    EXPECT_EQ(calls, (std::vector<std::string>{"report 3 1", "set Algs.HoldTimeoutMilliseconds 700", "report 2 2"}));
}

TEST_F(SimulationFeederTest, StopCutsALongPauseShortAndSkipsFinished) {
    // The second report is an hour after the first.
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 0, "Report": "01 "},
        {"Type": "InputReport", "Timestamp": 3600000000000, "Report": "01 "}]})");
    SimulationFeeder feeder(path, 1.0f);
    feeder.start(target());
    for (;;) {
        std::lock_guard lock(mutex);
        if (!calls.empty()) break;
    }
    feeder.stop();
    EXPECT_TRUE(feeder.stopRequested());
    EXPECT_FALSE(finished);
}

// As the daemon plays a document: a recorded setting waits until the service has handled the
// reports before it. Here nothing handles them (the device is scheduled nowhere), so the feeder
// is stopped in the middle of that wait, as a signal stops the daemon.
TEST_F(SimulationFeederTest, StopWhileASettingWaitsForItsReportsEndsTheWaitWithoutApplyingIt) {
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 1000, "Report": "01 02 03 "},
        {"Type": "InputReport", "Timestamp": 1100, "Report": "01 02 04 "},
        {"Type": "State", "Timestamp": 1500, "Key": "Algs.HoldTimeoutMilliseconds", "Value": 700},
        {"Type": "InputReport", "Timestamp": 2000, "Report": "02 00 "}]})");
    auto device = SimulatedHIDDevice::create();
    auto counter = std::make_shared<CountingHIDDevice>(device);
    std::vector<uint8_t> buffer(64);
    counter->registerInputReportCallback(
        buffer.data(), buffer.size(), [](void*, uint32_t, void*, HIDReportType, uint32_t, const uint8_t*, size_t, uint64_t) {},
        nullptr);
    SimulationFeeder feeder(path, 1000.0f);
    uint64_t written = 0;  // the feeder's thread only
    bool waiting = false;
    SimulationFeeder::Target playing = target();
    playing.writeReport = [&](const uint8_t* bytes, size_t length, uint64_t) {
        if (device->writeInputReport(bytes, length)) ++written;
    };
    playing.applySetting = [&](const std::string& key, const PropertyValue& value) {
        {
            std::lock_guard lock(mutex);
            waiting = true;
        }
        changed.notify_all();
        counter->waitForDelivered(written, [&] { return feeder.stopRequested(); });
        if (feeder.stopRequested()) return;
        std::lock_guard lock(mutex);
        calls.push_back("set " + key + " " + value.description());
    };
    feeder.start(std::move(playing));
    {
        std::unique_lock lock(mutex);
        changed.wait(lock, [&] { return waiting; });
    }
    feeder.requestStop();
    counter->wakeWaiters();
    feeder.stop();
    EXPECT_EQ(counter->deliveredCount(), 0u);
    std::lock_guard lock(mutex);
    EXPECT_TRUE(calls.empty());
    EXPECT_FALSE(finished);
}

TEST_F(SimulationFeederTest, DocumentThatDoesNotReadIsAClearError) {
    std::string path = write("{\"Version\": 1, \"Frames\": 5}");
    try {
        SimulationFeeder feeder(path, 1.0f);
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "the recording " + path + " cannot be played: invalid frames");
    }
}

TEST_F(SimulationFeederTest, MissingDocumentIsAClearError) {
    try {
        SimulationFeeder feeder(directory + "/none.json", 1.0f);
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()),
                  "cannot read the recording " + directory + "/none.json: No such file or directory");
    }
}

TEST_F(SimulationFeederTest, OlderLayoutPlaysItsReports) {
    std::string path = write(R"({"Version": 0, "Reports": [
        {"Timestamp": 5, "ReportData": "01 02 "}, {"Timestamp": 6, "ReportData": "02 "}]})");
    SimulationFeeder feeder(path, 1.0f);
    feeder.start(target());
    std::unique_lock lock(mutex);
    changed.wait(lock, [this] { return finished; });
    EXPECT_EQ(calls, (std::vector<std::string>{"report 2 1", "report 1 2"}));
}

TEST_F(SimulationFeederTest, VersionWrittenAfterTheFramesStillPlays) {
    std::string path = write(R"({"Frames": [{"Type": "InputReport", "Timestamp": 1, "Report": "07 "}], "Version": 1})");
    SimulationFeeder feeder(path, 1.0f);
    feeder.start(target());
    std::unique_lock lock(mutex);
    changed.wait(lock, [this] { return finished; });
    EXPECT_EQ(calls, (std::vector<std::string>{"report 1 7"}));
}

TEST_F(SimulationFeederTest, EmptyRecordingFinishesAtOnce) {
    SimulationFeeder feeder(write(R"({"Version": 1, "Frames": []})"), 1.0f);
    feeder.start(target());
    std::unique_lock lock(mutex);
    changed.wait(lock, [this] { return finished; });
    EXPECT_TRUE(calls.empty());
}

TEST_F(SimulationFeederTest, BadFirstFrameGivesTheReadersMessage) {
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "state", "Timestamp": 2, "Key": "Algs.X"},
        {"Type": "InputReport", "Timestamp": 1, "Report": "01 "}]})");
    try {
        SimulationFeeder feeder(path, 1.0f);
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "the recording " + path + " cannot be played: invalid frame type");
    }
}

TEST_F(SimulationFeederTest, BadFrameAfterGoodOnesIsPlayedUpToAndNamedWithTheReadersMessage) {
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 1, "Report": "01 "},
        {"Type": "InputReport", "Timestamp": 2, "Report": "02 "},
        {"Type": "state", "Timestamp": 3, "Key": "Algs.X"},
        {"Type": "InputReport", "Timestamp": 4, "Report": "03 "}]})");
    play(path);
    EXPECT_EQ(calls, (std::vector<std::string>{"report 1 1", "report 1 2"}));
    EXPECT_EQ(failure, "the recording " + path + " cannot be played after 2 frames: invalid frame type (in frame 3, at byte 167)");
    EXPECT_FALSE(finished);
}

TEST_F(SimulationFeederTest, BadLinePartWayInTheLineFormIsNamedByItsLineNumber) {
    std::string path = write(R"({"Version": 1, "Format": "lines"}
{"Type": "InputReport", "Timestamp": 1, "Report": "01 "}
{"Type": "InputReport", "Timestamp": 2, "Report": "02 
{"Type": "InputReport", "Timestamp": 3, "Report": "03 "}
)");
    play(path);
    EXPECT_EQ(calls, (std::vector<std::string>{"report 1 1"}));
    EXPECT_EQ(failure, "the recording " + path + " cannot be played after 1 frame: migrateSerializedContainer failed: "
                       "invalid container (line 3, column 55: syntax error while parsing value - invalid string: missing "
                       "closing quote, last read: '\"02 ')");
}

TEST_F(SimulationFeederTest, LineFormPlaysItsReportsAndSettings) {
    std::string path = write(R"({"Version": 1, "Format": "lines"}
{"Type": "InputReport", "Timestamp": 1000, "Report": "01 02 "}
{"Type": "State", "Timestamp": 1500, "Key": "Algs.HoldTimeoutMilliseconds", "Value": 650}
{"Type": "InputReport", "Timestamp": 2000, "Report": "02 "}
)");
    play(path);
    EXPECT_EQ(calls, (std::vector<std::string>{"report 2 1", "set Algs.HoldTimeoutMilliseconds 650", "report 1 2"}));
    EXPECT_TRUE(finished);
}

// Only the first frame is read before playing: a document whose frame far on does not read is
// taken, and plays up to that frame.
TEST_F(SimulationFeederTest, OnlyTheFirstFrameIsReadBeforeThePlaybackStarts) {
    std::string text = "{\"Version\": 1, \"Frames\": [\n";
    for (int frame = 0; frame < 5000; ++frame) {
        text += "{\"Type\": \"InputReport\", \"Timestamp\": " + std::to_string(frame) + ", \"Report\": \"01 \"},\n";
    }
    text += "{\"Type\": \"Nothing\", \"Timestamp\": 5000}]}";
    const std::string path = write(text);
    SimulationFeeder feeder(path, 1000.0f);
    feeder.start(target());
    std::unique_lock lock(mutex);
    changed.wait(lock, [this] { return finished || !failure.empty(); });
    EXPECT_EQ(calls.size(), 5000u);
    EXPECT_EQ(failure, "the recording " + path + " cannot be played after 5000 frames: invalid frame type "
                       "(in frame 5001, at byte " + std::to_string(text.rfind('{')) + ")");
}

// The device hands each report out at its due time: the recorded gaps, divided by the speed.
TEST_F(SimulationFeederTest, ReportsAreDueAtTheRecordedGapsDividedByTheSpeed) {
    std::string path = write(R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 1000000, "Report": "01 "},
        {"Type": "State", "Timestamp": 1500000, "Key": "Algs.HoldTimeoutMilliseconds", "Value": 700},
        {"Type": "InputReport", "Timestamp": 9000000, "Report": "02 "},
        {"Type": "InputReport", "Timestamp": 9000000, "Report": "03 "},
        {"Type": "InputReport", "Timestamp": 13000500, "Report": "04 "}]})");
    play(path, 2.0f);
    ASSERT_EQ(dues.size(), 4u);
    EXPECT_EQ(dues[1] - dues[0], 4'000'000u);
    EXPECT_EQ(dues[2] - dues[1], 0u);
    EXPECT_EQ(dues[3] - dues[2], 2'000'000u);  // 2000.25 microseconds, cut to whole ones
}

TEST_F(SimulationFeederTest, TextThatIsNotJsonGivesTheReadersMessage) {
    std::string path = write("{\"Version\": 1, \"Frames\": [");
    try {
        SimulationFeeder feeder(path, 1.0f);
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()),
                  "the recording " + path + " cannot be played: migrateSerializedContainer failed: invalid container");
    }
}

}  // namespace
}  // namespace TolkaTouch

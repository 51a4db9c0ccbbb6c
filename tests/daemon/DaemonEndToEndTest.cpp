// tolkatouchd end to end: the daemon binary with the plug-in library, fed by recording documents
// through --simulate, observed through --print, --key-log and the control socket.

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <functional>
#include <fstream>
#include <nlohmann/json.hpp>
#include <string>
#include <thread>
#include <vector>

#include "tests/daemon/Subprocess.h"
#include "tolkatouch/Settings.h"

namespace TolkaTouch {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;
using Testing::runToCompletion;
using Testing::Subprocess;

std::vector<std::string> lines(const std::string& text) {
    std::vector<std::string> result;
    size_t start = 0;
    while (start < text.size()) {
        size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        result.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return result;
}

// Event lines without their time stamps, which differ from run to run.
std::vector<std::string> withoutTimestamps(const std::string& text) {
    std::vector<std::string> result;
    for (const auto& line : lines(text)) {
        auto event = nlohmann::ordered_json::parse(line);
        event.erase("timestamp");
        result.push_back(event.dump());
    }
    return result;
}

class DaemonEndToEndTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/tolkatouchd-e2e-XXXXXX";
        directory = ::mkdtemp(pattern);
        socket = directory + "/tolkatouchd.sock";
    }
    void TearDown() override { fs::remove_all(directory); }

    std::string file(const std::string& name) const { return directory + "/" + name; }

    // A recording document made from one of the gesture scripts beside the tests.
    std::string synthesize(const std::string& script) {
        std::string document = file(script + ".json");
        int status = runToCompletion({TOLKATOUCH_PATH, "synth", std::string(TOLKA_TEST_DATA_DIR) + "/" + script,
                                      "-o", document},
                                     file("synth.out"), file("synth.err"));
        EXPECT_EQ(status, 0) << Testing::readWholeFile(file("synth.err"));
        return document;
    }

    std::vector<std::string> daemonArguments(const std::string& document, std::vector<std::string> extra) const {
        std::vector<std::string> arguments{TOLKATOUCHD_PATH, "--plugin", TOLKA_PLUGIN_PATH, "--socket", socket,
                                           "--simulate", document};
        arguments.insert(arguments.end(), extra.begin(), extra.end());
        return arguments;
    }

    std::unique_ptr<Subprocess> startDaemon(const std::string& document, std::vector<std::string> extra,
                                            const std::string& name = "daemon") {
        return std::make_unique<Subprocess>(daemonArguments(document, std::move(extra)), file(name + ".out"),
                                            file(name + ".err"));
    }

    // Connects to the control socket, waiting for the daemon to open it.
    int connectControl() {
        auto deadline = std::chrono::steady_clock::now() + 10s;
        while (std::chrono::steady_clock::now() < deadline) {
            int fd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
            sockaddr_un address{};
            address.sun_family = AF_UNIX;
            std::strcpy(address.sun_path, socket.c_str());
            if (::connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0) return fd;
            ::close(fd);
            std::this_thread::sleep_for(10ms);
        }
        ADD_FAILURE() << "the control socket never opened";
        return -1;
    }

    // One request line out, one reply line back.
    static std::string exchange(int fd, const std::string& request) {
        ::send(fd, request.data(), request.size(), MSG_NOSIGNAL);
        std::string reply;
        auto deadline = std::chrono::steady_clock::now() + 10s;
        while (reply.find('\n') == std::string::npos && std::chrono::steady_clock::now() < deadline) {
            pollfd ready{fd, POLLIN, 0};
            if (::poll(&ready, 1, 100) <= 0) continue;
            char buffer[4096];
            ssize_t got = ::recv(fd, buffer, sizeof(buffer), 0);
            if (got <= 0) break;
            reply.append(buffer, static_cast<size_t>(got));
        }
        return reply;
    }

    // Runs the tolkatouch tool against the daemon's socket; answers its status, output in *out.
    int tool(std::vector<std::string> arguments, std::string* out = nullptr, std::string* err = nullptr) {
        arguments.insert(arguments.begin(), TOLKATOUCH_PATH);
        arguments.push_back("--socket");
        arguments.push_back(socket);
        int status = runToCompletion(arguments, file("tool.out"), file("tool.err"), 30s);
        if (out) *out = Testing::readWholeFile(file("tool.out"));
        if (err) *err = Testing::readWholeFile(file("tool.err"));
        return status;
    }

    std::string directory;
    std::string socket;
};

void expectDaemonPrintsWhatReplayPrints(DaemonEndToEndTest& test, const std::string& document,
                                        const std::string& outputDirectory) {
    SCOPED_TRACE(document);
    int replayStatus = runToCompletion({TOLKATOUCH_PATH, "replay", "--json", "--fast", document},
                                       outputDirectory + "/replay.out", outputDirectory + "/replay.err");
    ASSERT_EQ(replayStatus, 0) << Testing::readWholeFile(outputDirectory + "/replay.err");
    auto expected = withoutTimestamps(Testing::readWholeFile(outputDirectory + "/replay.out"));

    Subprocess daemon({TOLKATOUCHD_PATH, "--plugin", TOLKA_PLUGIN_PATH, "--socket", outputDirectory + "/d.sock",
                       "--simulate", document, "--speed", "25", "--print", "--no-keys"},
                      outputDirectory + "/daemon.out", outputDirectory + "/daemon.err");
    auto status = daemon.wait(120s);
    ASSERT_EQ(status, 0) << daemon.standardError().substr(0, 2000);
    EXPECT_EQ(withoutTimestamps(daemon.standardOutput()), expected);
    (void)test;
}

TEST_F(DaemonEndToEndTest, EveryExampleRecordingYieldsExactlyTheEventsOfTheReplayTool) {
    std::vector<std::string> documents;
    for (const auto& entry : fs::directory_iterator(TOLKA_EXAMPLES_DIR)) {
        if (entry.path().extension() == ".json") documents.push_back(entry.path());
    }
    std::sort(documents.begin(), documents.end());
    for (const auto& script : {"everyday.gestures", "long-hold.gestures", "steady-flow.gestures"}) {
        documents.push_back(synthesize(script));
    }
    for (const auto& document : documents) expectDaemonPrintsWhatReplayPrints(*this, document, directory);
}

TEST_F(DaemonEndToEndTest, PropertiesCanBeReadAndWrittenWhileReportsFlow) {
    auto daemon = startDaemon(synthesize("steady-flow.gestures"), {"--no-keys"});
    ::close(connectControl());

    std::string out, err;
    ASSERT_EQ(tool({"prop", "get", "Version"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "[28,0,0]\n");
    ASSERT_EQ(tool({"prop", "set", "Pipeline.Algs.HoldTimeoutMilliseconds", "700"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "");
    ASSERT_EQ(tool({"prop", "get", "Pipeline.Algs.HoldTimeoutMilliseconds"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "700\n");
    ASSERT_EQ(tool({"devices"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "service 1  1209:0001  simulated:" + file("steady-flow.gestures.json") + "\n");

    // The recording, fetched and saved, is a document the replay tool plays; it holds the setting.
    ASSERT_EQ(tool({"prop", "get", "Recording"}, &out, &err), 0) << err;
    Testing::readWholeFile(file("tool.out"));
    fs::copy_file(file("tool.out"), file("fetched.json"));
    auto fetched = nlohmann::json::parse(out);
    bool hasSetting = false;
    size_t reports = 0;
    for (const auto& frame : fetched["Frames"]) {
        if (frame["Type"] == "State" && frame["Key"] == "Algs.HoldTimeoutMilliseconds" && frame["Value"] == 700) {
            hasSetting = true;
        }
        if (frame["Type"] == "InputReport") ++reports;
    }
    EXPECT_TRUE(hasSetting);
    EXPECT_GT(reports, 0u);
    int replayStatus = runToCompletion({TOLKATOUCH_PATH, "replay", "--json", "--fast", file("fetched.json")},
                                       file("replay.out"), file("replay.err"));
    EXPECT_EQ(replayStatus, 0) << Testing::readWholeFile(file("replay.err"));

    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, ALiveSubscriberGetsFrameSnapshotsInFrameOrderAndABadRequestOneErrorLine) {
    auto daemon = startDaemon(synthesize("steady-flow.gestures"), {"--no-keys"});
    const int fd = connectControl();
    EXPECT_EQ(exchange(fd, "{\"live\": 60}\n"), "{\"error\":\"malformed request: \\\"live\\\" takes true\"}\n");
    EXPECT_EQ(exchange(fd, "{\"live\": true}\n"), "{\"ok\":true}\n");
    std::vector<uint64_t> frames;
    std::string text;
    auto deadline = std::chrono::steady_clock::now() + 10s;
    while (frames.size() < 20 && std::chrono::steady_clock::now() < deadline) {
        pollfd ready{fd, POLLIN, 0};
        if (::poll(&ready, 1, 100) <= 0) continue;
        char buffer[4096];
        const ssize_t got = ::recv(fd, buffer, sizeof(buffer), 0);
        if (got <= 0) break;
        text.append(buffer, static_cast<size_t>(got));
        for (size_t end; (end = text.find('\n')) != std::string::npos; text.erase(0, end + 1)) {
            const auto frame = nlohmann::json::parse(text.substr(0, end)).at("frame");
            EXPECT_EQ(frame.at("service"), 1);
            EXPECT_EQ(frame.at("readings").size(), 15u);
            EXPECT_EQ(frame.at("virtual_normalized").size(), 23u);
            frames.push_back(frame.at("frame").get<uint64_t>());
        }
    }
    ::close(fd);
    ASSERT_GE(frames.size(), 20u);
    // Frames come at 125 a second, snapshots at most 60: never the same frame twice, never back.
    EXPECT_TRUE(std::adjacent_find(frames.begin(), frames.end(), std::greater_equal<>()) == frames.end());
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, TheSimulatedSurfaceAnswersFeatureReportsAsARealOneDoes) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    std::string out, err;
    ASSERT_EQ(tool({"prop", "get", "FactoryResetHoldDuration"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "5000\n");
    ASSERT_EQ(tool({"prop", "get", "FirmwareDebugReports"}, &out, &err), 0) << err;
    EXPECT_EQ(out.find("null"), std::string::npos) << out;
    EXPECT_EQ(out.find("Failed"), std::string::npos) << out;
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, PropListShowsEverySettingAndPropSetRefusesAMisspeltOne) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    std::string out, err;
    ASSERT_EQ(tool({"prop", "set", "HoldTimeoutMilliseconds", "700"}, &out, &err), 0) << err;
    ASSERT_EQ(tool({"prop", "list"}, &out, &err), 0) << err;
    const auto rows = lines(out);
    ASSERT_EQ(rows.size(), 1 + settingsTable().size());
    EXPECT_EQ(rows[0], "setting                                       type           value  default");
    EXPECT_EQ(rows[2], "Pipeline.Algs.HoldTimeoutMilliseconds         milliseconds     700      500");
    EXPECT_EQ(rows[5], "Pipeline.Algs.VirtualNormalizationFactors.0   number        0.6667   0.6667");

    EXPECT_EQ(tool({"prop", "set", "Pipeline.Algs.HoldTimeoutMiliseconds", "700"}, &out, &err), 2);
    EXPECT_EQ(err, "tolkatouch: unknown setting \"Pipeline.Algs.HoldTimeoutMiliseconds\" (did you mean "
                   "\"Pipeline.Algs.HoldTimeoutMilliseconds\"?)\n");
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, PropApplyWritesEverySettingOfAFileAndNoneWhenOneIsBad) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    std::string out, err;
    std::ofstream(file("best.settings")) << "Algs.ActivationThreshold=173.5\nAlgs.HoldTimeoutMilliseconds=584\n";
    ASSERT_EQ(tool({"prop", "apply", file("best.settings")}, &out, &err), 0) << err;
    ASSERT_EQ(tool({"prop", "get", "Pipeline.Algs.HoldTimeoutMilliseconds"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "584\n");
    ASSERT_EQ(tool({"prop", "get", "Pipeline.Algs.ActivationThreshold"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "173.5\n");

    std::ofstream(file("bad.settings")) << "Algs.HoldTimeoutMilliseconds=900\nAlgs.ActivationThreshold=0\n";
    EXPECT_EQ(tool({"prop", "apply", file("bad.settings")}, &out, &err), 2);
    EXPECT_EQ(err, "tolkatouch: setting \"Algs.ActivationThreshold\" takes a number from 1 to 10000, not \"0\"\n");
    ASSERT_EQ(tool({"prop", "get", "Pipeline.Algs.HoldTimeoutMilliseconds"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "584\n");
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, TolkatouchLogTurnsTheDescriptionLinesOnAndOffOnTheRunningService) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    const auto descriptions = [&] {
        const std::string err = daemon->standardError();
        size_t count = 0;
        for (size_t at = err.find("Touch State Description"); at != std::string::npos;
             at = err.find("Touch State Description", at + 1)) {
            ++count;
        }
        return count;
    };
    EXPECT_EQ(descriptions(), 0u);
    std::string out, err;
    ASSERT_EQ(tool({"log", "Algs", "debug"}, &out, &err), 0) << err;
    auto deadline = std::chrono::steady_clock::now() + 5s;
    while (descriptions() == 0 && std::chrono::steady_clock::now() < deadline) std::this_thread::sleep_for(5ms);
    EXPECT_GT(descriptions(), 0u);
    ASSERT_EQ(tool({"log"}, &out, &err), 0) << err;
    EXPECT_NE(out.find("Algs         debug\n"), std::string::npos) << out;
    ASSERT_EQ(tool({"log", "Algs", "default"}, &out, &err), 0) << err;
    std::this_thread::sleep_for(100ms);  // a frame in flight may still finish its lines
    const size_t stopped = descriptions();
    std::this_thread::sleep_for(300ms);
    EXPECT_EQ(descriptions(), stopped);
    EXPECT_EQ(tool({"log", "Algs", "loud"}, &out, &err), 1);
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, UnknownPropertyReadsNullAndToolReportsDaemonErrors) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    std::string out, err;
    ASSERT_EQ(tool({"prop", "get", "NoSuchKey"}, &out, &err), 0) << err;
    EXPECT_EQ(out, "null\n");
    EXPECT_EQ(tool({"prop", "get", "Version", "--device", "9"}, &out, &err), 1);
    EXPECT_EQ(err, "tolkatouch: Version: no device with service 9\n");
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, SigtermInTheMiddleOfAHoldExitsWithinOneSecondWithTheKeyReleased) {
    std::string keyLog = file("keys.log");
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--key-log", keyLog});
    auto deadline = std::chrono::steady_clock::now() + 20s;
    while (Testing::readWholeFile(keyLog).find("KEY_VOLUMEUP 1") == std::string::npos &&
           std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(5ms);
    }
    ASSERT_NE(Testing::readWholeFile(keyLog).find("KEY_VOLUMEUP 1"), std::string::npos) << daemon->standardError();

    daemon->signal(SIGTERM);
    auto status = daemon->wait(1000ms);
    ASSERT_TRUE(status) << "still running one second after SIGTERM";
    EXPECT_EQ(*status, 0);
    auto writes = lines(Testing::readWholeFile(keyLog));
    ASSERT_FALSE(writes.empty());
    EXPECT_EQ(writes.front(), "KEY_VOLUMEUP 1");
    EXPECT_EQ(writes.back(), "KEY_VOLUMEUP 0");
}

TEST_F(DaemonEndToEndTest, SigintStopsTheDaemonToo) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    daemon->signal(SIGINT);
    EXPECT_EQ(daemon->wait(1000ms), 0);
}

TEST_F(DaemonEndToEndTest, EveryOtherTerminatingSignalStopsTheDaemonCleanlyWithTheKeyReleased) {
    for (int signal : {SIGQUIT, SIGUSR1, SIGUSR2}) {
        std::string keyLog = file("keys-" + std::to_string(signal) + ".log");
        auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--key-log", keyLog});
        auto deadline = std::chrono::steady_clock::now() + 20s;
        while (Testing::readWholeFile(keyLog).find("KEY_VOLUMEUP 1") == std::string::npos &&
               std::chrono::steady_clock::now() < deadline) {
            std::this_thread::sleep_for(5ms);
        }
        daemon->signal(signal);
        auto status = daemon->wait(1000ms);
        ASSERT_TRUE(status) << "still running one second after signal " << signal;
        EXPECT_EQ(*status, 0) << "signal " << signal;
        EXPECT_EQ(lines(Testing::readWholeFile(keyLog)).back(), "KEY_VOLUMEUP 0") << "signal " << signal;
        EXPECT_FALSE(std::filesystem::exists(socket)) << "signal " << signal;
    }
}

TEST_F(DaemonEndToEndTest, SighupDoesNotStopTheDaemon) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    ::close(connectControl());
    daemon->signal(SIGHUP);
    EXPECT_FALSE(daemon->wait(300ms)) << "the daemon stopped on SIGHUP";
    ::close(connectControl());  // still answering
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(1000ms), 0);
}

TEST_F(DaemonEndToEndTest, SighupReadsTheLogConfigurationAgainAndABrokenOneChangesNothing) {
    const std::string configuration = file("log.conf");
    std::ofstream(configuration) << "Algs error\n";
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys", "--log-config", configuration});
    const int control = connectControl();
    const auto algsLevel = [&] {
        return nlohmann::json::parse(exchange(control, "{\"log\": true}\n"))["levels"].value("Algs", "?");
    };
    EXPECT_EQ(algsLevel(), "error");

    std::ofstream(configuration) << "Algs info\n";
    daemon->signal(SIGHUP);
    auto deadline = std::chrono::steady_clock::now() + 5s;
    while (algsLevel() != "info" && std::chrono::steady_clock::now() < deadline) std::this_thread::sleep_for(5ms);
    EXPECT_EQ(algsLevel(), "info");

    std::ofstream(configuration) << "Algs loud\n";
    daemon->signal(SIGHUP);
    deadline = std::chrono::steady_clock::now() + 5s;
    while (daemon->standardError().find("SIGHUP: " + configuration + ": line 1") == std::string::npos &&
           std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(5ms);
    }
    EXPECT_NE(daemon->standardError().find("SIGHUP: " + configuration + ": line 1"), std::string::npos);
    EXPECT_EQ(algsLevel(), "info");
    ::close(control);
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, SigtermWhileEventsStreamLeavesEveryPrintedEventWholeAndInTheReplaysOrder) {
    const std::string document = synthesize("everyday.gestures");
    ASSERT_EQ(runToCompletion({TOLKATOUCH_PATH, "replay", "--json", "--fast", document}, file("replay.out"),
                              file("replay.err")),
              0);
    const auto expected = withoutTimestamps(Testing::readWholeFile(file("replay.out")));
    ASSERT_GT(expected.size(), 4u);
    auto daemon = startDaemon(document, {"--no-keys", "--print", "--speed", "20"});
    auto deadline = std::chrono::steady_clock::now() + 20s;
    while (lines(daemon->standardOutput()).size() < 2 && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(1ms);
    }
    daemon->signal(SIGTERM);  // events are being handed over: some still queued
    auto status = daemon->wait(10s);
    ASSERT_TRUE(status) << "still running after SIGTERM";
    EXPECT_EQ(*status, 0) << daemon->standardError().substr(0, 2000);
    const std::string out = daemon->standardOutput();
    ASSERT_TRUE(out.empty() || out.back() == '\n') << "an event line was cut short";
    const auto printed = withoutTimestamps(out);
    ASSERT_LE(printed.size(), expected.size());
    EXPECT_EQ(printed, std::vector<std::string>(expected.begin(), expected.begin() + printed.size()));
    EXPECT_FALSE(std::filesystem::exists(socket));
}

TEST_F(DaemonEndToEndTest, SecondDaemonOnTheSameSocketRefusesToStart) {
    std::string document = synthesize("long-hold.gestures");
    auto first = startDaemon(document, {"--no-keys"});
    ::close(connectControl());
    auto second = startDaemon(document, {"--no-keys"}, "second");
    EXPECT_EQ(second->wait(10s), 1);
    EXPECT_EQ(second->standardError(), "tolkatouchd: another tolkatouchd is already running on " + socket + "\n");

    int control = connectControl();  // the first one still answers
    EXPECT_EQ(exchange(control, "{\"get\": \"Version\"}\n"), "{\"value\":[28,0,0]}\n");
    ::close(control);
    first->signal(SIGTERM);
    EXPECT_EQ(first->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, MalformedOversizedAndUnknownRequestsGetErrorRepliesAndNothingBlocks) {
    auto daemon = startDaemon(synthesize("long-hold.gestures"), {"--no-keys"});
    int silent = connectControl();  // connects and never writes
    int halfLine = connectControl();
    ::send(halfLine, "{\"get\": \"Ver", 12, MSG_NOSIGNAL);
    ::close(halfLine);  // leaves mid-line

    int control = connectControl();
    EXPECT_EQ(exchange(control, "not json\n"), "{\"error\":\"malformed request\"}\n");
    EXPECT_EQ(exchange(control, "[1, 2]\n"), "{\"error\":\"malformed request\"}\n");
    EXPECT_EQ(exchange(control, "{\"get\": 7}\n"), "{\"error\":\"malformed request: \\\"get\\\" takes a key string\"}\n");
    EXPECT_EQ(exchange(control, "{\"frobnicate\": true}\n"), "{\"error\":\"unknown request\"}\n");
    std::thread writer([control] {
        std::string huge = "{\"get\": \"" + std::string(70000, 'k') + "\"}\n";
        ::send(control, huge.data(), huge.size(), MSG_NOSIGNAL);
    });
    std::string reply = exchange(control, "");
    writer.join();
    EXPECT_EQ(reply, "{\"error\":\"request too long (over 65536 bytes)\"}\n");
    EXPECT_EQ(exchange(control, "{\"get\": \"Version\"}\n"), "{\"value\":[28,0,0]}\n");
    EXPECT_EQ(exchange(control, "{\"devices\": true}\n"),
              "{\"devices\":[{\"node\":\"simulated:" + file("long-hold.gestures.json") +
                  "\",\"product\":1,\"service\":1,\"vendor\":4617}]}\n");
    ::close(control);
    ::close(silent);
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(10s), 0);
}

TEST_F(DaemonEndToEndTest, MissingUinputIsOneClearErrorLineAndStatusOne) {
    auto daemon = std::make_unique<Subprocess>(
        std::vector<std::string>{TOLKATOUCHD_PATH, "--plugin", TOLKA_PLUGIN_PATH, "--socket", socket, "--uinput",
                                 directory + "/no-uinput"},
        file("daemon.out"), file("daemon.err"));
    EXPECT_EQ(daemon->wait(10s), 1);
    EXPECT_EQ(daemon->standardError(), "tolkatouchd: cannot open " + directory +
                                           "/no-uinput for the virtual keyboard: No such file or directory "
                                           "(--print shows events without it)\n");
}

TEST_F(DaemonEndToEndTest, DocumentThatIsNotARecordingIsOneClearErrorLine) {
    std::ofstream(file("bad.json")) << "{\"Version\": 2}";
    auto daemon = startDaemon(file("bad.json"), {"--no-keys"});
    EXPECT_EQ(daemon->wait(10s), 1);
    EXPECT_EQ(daemon->standardError(), "tolkatouchd: the recording " + file("bad.json") +
                                           " cannot be played: migrateSerializedContainer failed: invalid "
                                           "container version: 2\n");
}

TEST_F(DaemonEndToEndTest, DocumentThatStopsReadingPartWayIsPlayedUpToThereThenEndsWithOneErrorLineAndStatusOne) {
    std::ofstream(file("cut.json")) << "{\"Version\": 1, \"Frames\": [\n"
                                       "{\"Type\": \"InputReport\", \"Timestamp\": 1, \"Report\": \"01 \"},\n"
                                       "{\"Type\": \"InputReport\", \"Timestamp\": 2, \"Report\": \"01 \"},\n"
                                       "{\"Type\": \"state\", \"Timestamp\": 3}]}\n";
    auto daemon = startDaemon(file("cut.json"), {"--no-keys"});
    EXPECT_EQ(daemon->wait(10s), 1);
    const std::string err = daemon->standardError();
    const std::string line = "[error] Daemon: the recording " + file("cut.json") +
                             " cannot be played after 2 frames: invalid frame type (in frame 3, at byte 143)\n";
    EXPECT_NE(err.find(line), std::string::npos) << err;
    EXPECT_NE(err.find("stopped serving simulated:" + file("cut.json")), std::string::npos) << err;
}

TEST_F(DaemonEndToEndTest, PluginThatCannotBeLoadedIsOneClearErrorLine) {
    auto daemon = std::make_unique<Subprocess>(
        std::vector<std::string>{TOLKATOUCHD_PATH, "--plugin", directory + "/none.so", "--socket", socket,
                                 "--no-keys", "--print"},
        file("daemon.out"), file("daemon.err"));
    EXPECT_EQ(daemon->wait(10s), 1);
    EXPECT_EQ(daemon->standardError(), "tolkatouchd: cannot load the plug-in " + directory + "/none.so: " +
                                           directory + "/none.so: cannot open shared object file: No such file "
                                                       "or directory\n");
}

TEST_F(DaemonEndToEndTest, VendorIdThatIsNotHexadecimalIsOneClearErrorLine) {
    auto daemon = std::make_unique<Subprocess>(
        std::vector<std::string>{TOLKATOUCHD_PATH, "--vendor", "12g9", "--socket", socket}, file("daemon.out"),
        file("daemon.err"));
    EXPECT_EQ(daemon->wait(10s), 1);
    EXPECT_EQ(daemon->standardError(),
              "tolkatouchd: --vendor: expected a hexadecimal ID of at most four digits, got \"12g9\"\n");
}

}  // namespace
}  // namespace TolkaTouch

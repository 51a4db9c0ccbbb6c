#include "daemon/ControlServer.h"

#include <gtest/gtest.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <future>
#include <mutex>
#include <stdexcept>
#include <thread>

namespace TolkaTouch {
namespace {

class ControlServerTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/tolkatouchd-control-XXXXXX";
        directory = ::mkdtemp(pattern);
        path = directory + "/control.sock";
    }
    void TearDown() override {
        for (int fd : clients) ::close(fd);
        server.reset();
        std::filesystem::remove_all(directory);
    }

    // The handler runs on the server's workers: what it saw is kept under a lock.
    void startServer() {
        server = std::make_unique<ControlServer>(
            path,
            [this](const std::string& line) {
                {
                    std::lock_guard lock(handledMutex);
                    handled.push_back(line);
                }
                return respond ? respond(line) : "reply:" + line;
            },
            [] { return std::string("too long"); });
    }

    std::vector<std::string> handledLines() {
        std::lock_guard lock(handledMutex);
        return handled;
    }

    int connectClient() {
        int fd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strcpy(address.sun_path, path.c_str());
        if (::connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
            throw std::runtime_error("connect failed");
        }
        clients.push_back(fd);
        return fd;
    }

    void send(int fd, const std::string& text) {
        ASSERT_EQ(::send(fd, text.data(), text.size(), MSG_NOSIGNAL), static_cast<ssize_t>(text.size()));
    }

    // Serves until `fd` has `lines` complete lines to read (or two seconds pass), then reads them.
    std::string receiveLines(int fd, size_t lines) {
        std::string text;
        auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(2);
        while (static_cast<size_t>(std::count(text.begin(), text.end(), '\n')) < lines &&
               std::chrono::steady_clock::now() < deadline) {
            serveFor(10);
            char buffer[4096];
            ssize_t got = ::recv(fd, buffer, sizeof(buffer), MSG_DONTWAIT);
            if (got > 0) text.append(buffer, static_cast<size_t>(got));
        }
        return text;
    }

    // A socket file at the path, as another program leaves or serves it.
    int bindSocketAtPath() {
        int fd = ::socket(AF_UNIX, SOCK_STREAM, 0);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strcpy(address.sun_path, path.c_str());
        if (::bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
            throw std::runtime_error("bind failed");
        }
        return fd;
    }

    void serveFor(int milliseconds) {
        pollfd ready{server->pollFd(), POLLIN, 0};
        if (::poll(&ready, 1, milliseconds) > 0) server->handleReady();
    }

    std::string directory;
    std::string path;
    std::unique_ptr<ControlServer> server;
    std::function<std::string(const std::string&)> respond;  // the reply; "reply:LINE" when unset
    std::mutex handledMutex;
    std::vector<std::string> handled;
    std::vector<int> clients;
};

TEST_F(ControlServerTest, EachLineGetsTheHandlersReplyOnItsOwnLine) {
    startServer();
    int client = connectClient();
    send(client, "first\nsecond\n");
    EXPECT_EQ(receiveLines(client, 2), "reply:first\nreply:second\n");
}

TEST_F(ControlServerTest, LineSplitAcrossWritesIsAnsweredOnceComplete) {
    startServer();
    int client = connectClient();
    send(client, "hal");
    serveFor(50);
    EXPECT_TRUE(handledLines().empty());
    send(client, "f\n");
    EXPECT_EQ(receiveLines(client, 1), "reply:half\n");
}

TEST_F(ControlServerTest, OversizedLineGetsTheErrorReplyAndTheNextLineIsServed) {
    startServer();
    int client = connectClient();
    std::string huge(ControlServer::kMaxLineLength + 10, 'x');
    std::thread writer([&] { send(client, huge + "\nnext\n"); });
    std::string replies = receiveLines(client, 2);
    writer.join();
    EXPECT_EQ(replies, "too long\nreply:next\n");
    EXPECT_EQ(handledLines(), (std::vector<std::string>{"next"}));
}

TEST_F(ControlServerTest, LineOfExactlyTheLimitIsServed) {
    startServer();
    int client = connectClient();
    std::string line(ControlServer::kMaxLineLength, 'y');
    std::thread writer([&] { send(client, line + "\n"); });
    std::string replies = receiveLines(client, 1);
    writer.join();
    EXPECT_EQ(replies, "reply:" + line + "\n");
}

TEST_F(ControlServerTest, SilentClientDoesNotHoldUpAnother) {
    startServer();
    connectClient();  // connects and never writes
    int talker = connectClient();
    send(talker, "hello\n");
    EXPECT_EQ(receiveLines(talker, 1), "reply:hello\n");
}

TEST_F(ControlServerTest, ClientLeavingMidLineIsDroppedUnanswered) {
    startServer();
    int client = connectClient();
    send(client, "unfinished");
    serveFor(50);
    EXPECT_EQ(server->clientCount(), 1u);
    ::close(client);
    clients.clear();
    for (int i = 0; i < 20 && server->clientCount() > 0; ++i) serveFor(10);
    EXPECT_EQ(server->clientCount(), 0u);
    EXPECT_TRUE(handledLines().empty());
}

TEST_F(ControlServerTest, ClientThatSendsAndLeavesStillHasItsLineAnswered) {
    startServer();
    int client = connectClient();
    send(client, "bye\n");
    ::shutdown(client, SHUT_WR);
    EXPECT_EQ(receiveLines(client, 1), "reply:bye\n");
}

TEST_F(ControlServerTest, SecondServerOnTheSameSocketRefusesWithAClearMessage) {
    startServer();
    try {
        ControlServer second(path, [](const std::string&) { return std::string(); }, [] { return std::string(); });
        FAIL() << "a second server started";
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "another tolkatouchd is already running on " + path);
    }
    int client = connectClient();  // the first one still serves
    send(client, "still\n");
    EXPECT_EQ(receiveLines(client, 1), "reply:still\n");
}

TEST_F(ControlServerTest, StaleSocketFileOfAGoneDaemonIsReplaced) {
    ::close(bindSocketAtPath());
    startServer();
    int client = connectClient();
    send(client, "fresh\n");
    EXPECT_EQ(receiveLines(client, 1), "reply:fresh\n");
}

TEST_F(ControlServerTest, SocketHasMode0660AndGoesWithTheServer) {
    startServer();
    struct stat info {};
    ASSERT_EQ(::stat(path.c_str(), &info), 0);
    EXPECT_TRUE(S_ISSOCK(info.st_mode));
    EXPECT_EQ(info.st_mode & 0777, 0660u);
    server.reset();
    EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(ControlServerTest, ARegularFileAtTheSocketPathIsNeverDeleted) {
    std::ofstream(path) << "notes";
    try {
        startServer();
        FAIL() << "the server took the path";
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), path + " exists and is not a socket; not replacing it");
    }
    std::ifstream kept(path);
    std::string text;
    kept >> text;
    EXPECT_EQ(text, "notes");
}

TEST_F(ControlServerTest, ASocketSomethingElseListensOnIsLeftAlone) {
    int other = bindSocketAtPath();
    ASSERT_EQ(::listen(other, 1), 0);
    EXPECT_THROW(startServer(), std::runtime_error);
    EXPECT_TRUE(std::filesystem::exists(path));
    ::close(other);
}

TEST_F(ControlServerTest, ASocketFileReplacedAfterStartIsNotRemovedByTheServer) {
    startServer();
    std::filesystem::remove(path);
    std::ofstream(path) << "someone else's";
    server.reset();
    EXPECT_TRUE(std::filesystem::exists(path));
}

TEST_F(ControlServerTest, ClientsBeyondTheLimitAreToldAndClosed) {
    startServer();
    for (size_t i = 0; i < ControlServer::kMaxClients; ++i) connectClient();
    serveFor(50);
    EXPECT_EQ(server->clientCount(), ControlServer::kMaxClients);
    int extra = connectClient();
    EXPECT_EQ(receiveLines(extra, 1), "{\"error\":\"too many clients (at most 64)\"}\n");
    EXPECT_EQ(server->clientCount(), ControlServer::kMaxClients);
}

TEST_F(ControlServerTest, WithTheDescriptorTableFullAWaitingClientIsRefusedAndTheLoopGoesQuiet) {
    startServer();
    int waiting = connectClient();
    // Fill the table: every descriptor up to the limit is taken, the reserve aside.
    rlimit limit{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &limit), 0);
    const rlimit saved = limit;
    limit.rlim_cur = 256;
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &limit), 0);
    std::vector<int> fillers;
    for (int fd = ::open("/dev/null", O_RDONLY); fd >= 0; fd = ::open("/dev/null", O_RDONLY)) fillers.push_back(fd);
    serveFor(50);
    std::string reply = receiveLines(waiting, 1);
    for (int fd : fillers) ::close(fd);
    ::setrlimit(RLIMIT_NOFILE, &saved);
    EXPECT_EQ(reply, "{\"error\":\"the daemon has no file descriptors left\"}\n");
    // Nothing is left waiting, so the socket is no longer ready: no busy loop.
    pollfd ready{server->pollFd(), POLLIN, 0};
    EXPECT_EQ(::poll(&ready, 1, 0), 0);
}

TEST_F(ControlServerTest, AFloodingClientCannotHoldUpAQuietOne) {
    startServer();
    int flooder = connectClient();
    int quiet = connectClient();
    constexpr long kFloodLines = 1000;
    std::string flood;
    for (long i = 0; i < kFloodLines; ++i) flood += "f\n";
    send(flooder, flood);
    serveFor(50);  // the flooder is taken first
    send(quiet, "q\n");
    // The quiet client is answered long before the flooder's backlog is through. The flooder's
    // turns go on on the other workers while the quiet one is answered, so how many of its lines
    // are done by then depends on the scheduler (a few turns; seven under the thread sanitizer on
    // a busy machine): the bound is a quarter of the flood, where serving a client until its input
    // is drained would have answered all of it.
    const std::string reply = receiveLines(quiet, 1);
    EXPECT_EQ(reply, "reply:q\n");
    const std::vector<std::string> seen = handledLines();
    const auto answeredFlood = std::count(seen.begin(), seen.end(), "f");
    EXPECT_LE(answeredFlood, kFloodLines / 4);
    // ... and the flooder still gets every one of its replies in the end.
    EXPECT_EQ(std::count(seen.begin(), seen.end(), "q"), 1);
    std::string floodReplies = receiveLines(flooder, kFloodLines);
    EXPECT_EQ(std::count(floodReplies.begin(), floodReplies.end(), '\n'), kFloodLines);
}

TEST_F(ControlServerTest, RepliesComeInTheOrderOfTheRequestsAcrossManyTurns) {
    startServer();
    int client = connectClient();
    std::string requests, expected;
    for (int i = 0; i < 5 * static_cast<int>(ControlServer::kLinesPerTurn) + 3; ++i) {
        requests += std::to_string(i) + "\n";
        expected += "reply:" + std::to_string(i) + "\n";
    }
    send(client, requests);
    EXPECT_EQ(receiveLines(client, 43), expected);
}

TEST_F(ControlServerTest, AReplyBeingBuiltHoldsUpNeitherTheLoopNorAnotherClient) {
    std::promise<void> release;
    std::shared_future<void> released = release.get_future().share();
    respond = [released](const std::string& line) {
        if (line == "slow") released.wait();  // a whole recording being written out
        return "reply:" + line;
    };
    startServer();
    int slow = connectClient();
    int quick = connectClient();
    send(slow, "slow\n");
    serveFor(50);
    send(quick, "quick\n");
    EXPECT_EQ(receiveLines(quick, 1), "reply:quick\n");
    release.set_value();
    EXPECT_EQ(receiveLines(slow, 1), "reply:slow\n");
}

TEST_F(ControlServerTest, AReplyTooLongToSendGetsAnErrorReplyAndTheNextRequestIsServed) {
    respond = [](const std::string& line) {
        return line == "huge" ? std::string(ControlServer::kMaxReplyLength + 1, 'r') : "reply:" + line;
    };
    startServer();
    int client = connectClient();
    send(client, "huge\nnext\n");
    EXPECT_EQ(receiveLines(client, 2),
              "{\"error\":\"reply too long to send (16777217 bytes, at most 16777216)\"}\nreply:next\n");
}

TEST_F(ControlServerTest, AClientThatNeverReadsGetsNoMoreAnswersThanOneTurnsWorth) {
    respond = [](const std::string& line) { return line + std::string(64 * 1024, '.'); };
    startServer();
    int client = connectClient();
    int buffer = 4096;
    ::setsockopt(client, SOL_SOCKET, SO_RCVBUF, &buffer, sizeof(buffer));
    std::string requests;
    for (int i = 0; i < 200; ++i) requests += "r\n";
    send(client, requests);
    for (int i = 0; i < 30; ++i) serveFor(10);
    // The first turn's replies do not fit the socket, so no second turn is answered.
    EXPECT_EQ(handledLines().size(), ControlServer::kLinesPerTurn);
    EXPECT_EQ(server->clientCount(), 1u);
}

TEST_F(ControlServerTest, SocketPathTooLongIsRefused) {
    std::string longPath = directory + "/" + std::string(200, 'p');
    EXPECT_THROW(ControlServer(longPath, [](const std::string&) { return std::string(); },
                               [] { return std::string(); }),
                 std::runtime_error);
}

TEST_F(ControlServerTest, OnlyASubscribedClientGetsPushedLinesAfterItsReply) {
    server = std::make_unique<ControlServer>(
        path,
        [this](const std::string& line) {
            if (line == "watch") server->subscribe(server->currentClient());
            return "reply:" + line;
        },
        [] { return std::string("too long"); });
    const int watcher = connectClient();
    const int other = connectClient();
    send(watcher, "watch\n");
    EXPECT_EQ(receiveLines(watcher, 1), "reply:watch\n");
    EXPECT_EQ(server->subscriberCount(), 1u);
    server->push({"one", "two"});
    EXPECT_EQ(receiveLines(watcher, 2), "one\ntwo\n");
    send(other, "ask\n");
    EXPECT_EQ(receiveLines(other, 1), "reply:ask\n");
}

TEST_F(ControlServerTest, ASubscriberThatDoesNotReadLosesLinesAndIsToldHowMany) {
    server = std::make_unique<ControlServer>(
        path,
        [this](const std::string& line) {
            server->subscribe(server->currentClient());
            return "reply:" + line;
        },
        [] { return std::string("too long"); });
    const int watcher = connectClient();
    send(watcher, "watch\n");
    EXPECT_EQ(receiveLines(watcher, 1), "reply:watch\n");
    // Far more than the socket buffer and the backlog together: the rest is counted, not kept.
    const std::string line(64 * 1024, 'x');
    const size_t pushed = 2 * ControlServer::kMaxSubscriberBacklog / line.size() + 64;
    for (size_t i = 0; i < pushed; ++i) server->push({line});
    std::string text;
    for (int turn = 0; turn < 400 && text.find("{\"dropped\":") == std::string::npos; ++turn) {
        text += receiveLines(watcher, 1);
        server->push({"after"});
    }
    EXPECT_NE(text.find("{\"dropped\":"), std::string::npos);
}

TEST_F(ControlServerTest, AFrameSubscriberGetsFramesButNotTheLinesOfWatchers) {
    server = std::make_unique<ControlServer>(
        path,
        [this](const std::string& line) {
            server->subscribe(server->currentClient(),
                              line == "live" ? ControlServer::Channel::Frames : ControlServer::Channel::Lines);
            return "reply:" + line;
        },
        [] { return std::string("too long"); });
    const int live = connectClient();
    const int watcher = connectClient();
    send(live, "live\n");
    send(watcher, "watch\n");
    EXPECT_EQ(receiveLines(live, 1), "reply:live\n");
    EXPECT_EQ(receiveLines(watcher, 1), "reply:watch\n");
    EXPECT_EQ(server->subscriberCount(ControlServer::Channel::Frames), 1u);
    EXPECT_EQ(server->subscriberCount(ControlServer::Channel::Lines), 1u);
    server->push({"log"});
    server->pushNewest("frame 1");
    EXPECT_EQ(receiveLines(live, 1), "frame 1\n");
    EXPECT_EQ(receiveLines(watcher, 1), "log\n");
}

TEST_F(ControlServerTest, AFrameSubscriberThatReadsSlowlyGetsTheNewestFrameNotABacklog) {
    server = std::make_unique<ControlServer>(
        path,
        [this](const std::string& line) {
            server->subscribe(server->currentClient(), ControlServer::Channel::Frames);
            return "reply:" + line;
        },
        [] { return std::string("too long"); });
    const int live = connectClient();
    send(live, "live\n");
    EXPECT_EQ(receiveLines(live, 1), "reply:live\n");
    // A snapshot's size, many times over what the cut send buffer holds, while the client reads
    // nothing.
    const size_t pushed = 2000;
    const std::string padding(1500, 'x');
    for (size_t i = 0; i < pushed; ++i) server->pushNewest(std::to_string(i) + " " + padding);
    // Then it reads everything there is, and the server goes on writing as it reads.
    std::vector<size_t> numbers;
    std::string text;
    for (int quiet = 0; quiet < 20;) {
        serveFor(5);
        char buffer[4096];
        const ssize_t got = ::recv(live, buffer, sizeof(buffer), MSG_DONTWAIT);
        if (got <= 0) {
            ++quiet;
            continue;
        }
        quiet = 0;
        text.append(buffer, static_cast<size_t>(got));
        for (size_t end; (end = text.find('\n')) != std::string::npos; text.erase(0, end + 1)) {
            const std::string line = text.substr(0, end);
            ASSERT_EQ(line.size(), std::to_string(std::stoul(line)).size() + 1 + padding.size()) << "a torn line";
            numbers.push_back(std::stoul(line));
        }
    }
    ASSERT_FALSE(numbers.empty());
    EXPECT_TRUE(std::is_sorted(numbers.begin(), numbers.end()));
    EXPECT_EQ(numbers.back(), pushed - 1);  // the newest always arrives
    // What was on its way when it stopped reading, and the newest: a few lines, never the lot.
    EXPECT_LT(numbers.size(), 64u);
}

}  // namespace
}  // namespace TolkaTouch

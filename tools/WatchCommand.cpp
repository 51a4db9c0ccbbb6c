// tolkatouch watch: follows the running service live through the control socket: its
// description lines, each frame drawn on the pixel layout, and its events. The daemon turns the
// recognizer's debug level on while anyone watches and back when the last watcher leaves, also
// when a watcher is killed, so an interrupted watch leaves the service as it was.

#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

#include "tools/Commands.h"
#include "tools/ControlClient.h"
#include "tools/DocumentFile.h"
#include "tools/WatchPrinter.h"

namespace TolkaTouch::Tools {

namespace {

struct WatchArguments {
    std::string socket = defaultControlSocketPath();
    bool json = false;
};

volatile std::sig_atomic_t interrupted = 0;
void onInterrupt(int) { interrupted = 1; }

class Descriptor {
public:
    explicit Descriptor(int fd) : _fd(fd) {}
    ~Descriptor() { ::close(_fd); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int fd() const { return _fd; }

private:
    int _fd;
};

void sendAll(int fd, const std::string& text, const std::string& socketPath) {
    for (size_t sent = 0; sent < text.size();) {
        const ssize_t count = ::send(fd, text.data() + sent, text.size() - sent, MSG_NOSIGNAL);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) throw ToolError(socketPath, std::string("cannot send the request: ") + std::strerror(errno));
        sent += static_cast<size_t>(count);
    }
}

void runWatch(const WatchArguments& arguments) {
    Descriptor socket(connectControlSocket(arguments.socket));
    sendAll(socket.fd(), "{\"watch\":true}\n", arguments.socket);

    struct sigaction action{};
    action.sa_handler = onInterrupt;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);

    std::string received;
    bool answered = false;
    while (!interrupted) {
        pollfd ready{socket.fd(), POLLIN, 0};
        const int polled = ::poll(&ready, 1, 250);
        if (polled <= 0) continue;  // an interruption or the quarter second: look at the flag again
        char buffer[64 * 1024];
        const ssize_t got = ::recv(socket.fd(), buffer, sizeof buffer, 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) throw ToolError(arguments.socket, "tolkatouchd closed the connection");
        received.append(buffer, static_cast<size_t>(got));
        for (size_t end; (end = received.find('\n')) != std::string::npos;) {
            const std::string line = received.substr(0, end);
            received.erase(0, end + 1);
            if (!answered) {
                // The reply to the request comes first: an error ends the watch.
                answered = true;
                const nlohmann::json reply = nlohmann::json::parse(line, nullptr, false);
                if (reply.is_object() && reply.contains("error")) {
                    const auto& error = reply["error"];
                    throw ToolError(arguments.socket, error.is_string() ? error.get<std::string>() : error.dump());
                }
                continue;
            }
            const std::string text = arguments.json ? line + "\n" : watchLineText(line);
            std::fputs(text.c_str(), stdout);
        }
        std::fflush(stdout);
    }
    // Leaving closes the connection; the daemon then turns the debug level back.
}

}  // namespace

void addWatchCommand(CLI::App& app) {
    auto arguments = std::make_shared<WatchArguments>();
    CLI::App* command = app.add_subcommand(
        "watch",
        "Follow the running service live: its description lines, each frame drawn on the pixel layout, and its "
        "events, until interrupted. The debug level of Algs is on meanwhile and back as it was afterwards.");
    command->add_option("--socket", arguments->socket, "tolkatouchd's control socket")->capture_default_str();
    command->add_flag("--json", arguments->json, "Print the service's lines as they come, one JSON object each");
    command->callback([arguments] { runWatch(*arguments); });
}

}  // namespace TolkaTouch::Tools

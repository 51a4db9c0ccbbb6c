#include "tools/ControlClient.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>

#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {
class Socket {
public:
    explicit Socket(int fd) : _fd(fd) {}
    ~Socket() {
        if (_fd >= 0) ::close(_fd);
    }
    Socket(const Socket&) = delete;
    Socket& operator=(const Socket&) = delete;
    int fd() const { return _fd; }

private:
    int _fd;
};
}  // namespace

std::string defaultControlSocketPath() {
    std::string directory = "/run/tolkatouch";
    if (const char* runtime = std::getenv("RUNTIME_DIRECTORY"); runtime && *runtime) {
        directory = runtime;
        directory = directory.substr(0, directory.find(':'));
    }
    return directory + "/tolkatouchd.sock";
}

int connectControlSocket(const std::string& socketPath) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (socketPath.size() >= sizeof(address.sun_path)) throw ToolError(socketPath, "socket path too long");
    std::memcpy(address.sun_path, socketPath.c_str(), socketPath.size() + 1);

    const int fd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) throw ToolError(socketPath, std::strerror(errno));
    if (::connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
        const int error = errno;
        ::close(fd);
        throw ToolError(socketPath, std::string("cannot reach tolkatouchd: ") + std::strerror(error));
    }
    return fd;
}

nlohmann::json controlRequest(const std::string& socketPath, const nlohmann::json& request,
                              const std::string& subject, double timeoutSeconds) {
    Socket socket(connectControlSocket(socketPath));

    std::string line = request.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + "\n";
    for (size_t sent = 0; sent < line.size();) {
        ssize_t count = ::send(socket.fd(), line.data() + sent, line.size() - sent, MSG_NOSIGNAL);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) throw ToolError(socketPath, std::string("cannot send the request: ") + std::strerror(errno));
        sent += static_cast<size_t>(count);
    }

    auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(timeoutSeconds);
    std::string reply;
    for (;;) {
        if (auto end = reply.find('\n'); end != std::string::npos) {
            reply.resize(end);
            break;
        }
        auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
        if (left.count() <= 0) throw ToolError(socketPath, "tolkatouchd did not reply");
        pollfd ready{socket.fd(), POLLIN, 0};
        int polled = ::poll(&ready, 1, static_cast<int>(left.count()));
        if (polled < 0 && errno == EINTR) continue;
        if (polled <= 0) continue;
        char buffer[64 * 1024];
        ssize_t got = ::recv(socket.fd(), buffer, sizeof(buffer), 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) throw ToolError(socketPath, "tolkatouchd closed the connection without a reply");
        reply.append(buffer, static_cast<size_t>(got));
    }

    nlohmann::json answer = nlohmann::json::parse(reply, nullptr, false);
    if (answer.is_discarded() || !answer.is_object()) throw ToolError(socketPath, "tolkatouchd's reply is not JSON");
    if (auto error = answer.find("error"); error != answer.end()) {
        throw ToolError(subject, error->is_string() ? error->get<std::string>() : error->dump());
    }
    return answer;
}

}  // namespace TolkaTouch::Tools

#include "daemon/ControlServer.h"

#include <fcntl.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <vector>

namespace TolkaTouch {

struct ControlServer::Client {
    int fd = -1;
    uint64_t id = 0;
    std::string received;       // bytes read and not yet looked at
    std::string input;          // bytes of the line being read
    bool discarding = false;    // inside an oversized line: drop bytes up to its newline
    std::deque<Request> requests;  // complete lines, not yet answered
    bool inTurn = false;        // some of its requests are with the workers
    std::string output;         // replies not yet written
    std::size_t outputOffset = 0;
    bool closing = false;  // the peer stopped writing; leave once the replies are out
    uint8_t channels = 0;     // the Channel bits it subscribes to
    uint64_t dropped = 0;     // pushed lines it had no room for, not yet told
    std::string newest;       // the newest frame line, not yet in output (Frames)
    bool subscribed(Channel channel) const { return channels & static_cast<uint8_t>(channel); }
};

namespace {
// The client a worker is answering, for the handler's subscribe().
thread_local uint64_t tCurrentClient = 0;

std::runtime_error systemError(const std::string& what) {
    return std::runtime_error(what + ": " + std::strerror(errno));
}

// A socket file at the path that nothing listens on is removed; a missing path is fine; any other
// file, or a socket that answers, is an error and is left as it is.
void removeStaleSocket(const std::string& path, const sockaddr_un& address, int lockFd) {
    struct stat existing {};
    if (::lstat(path.c_str(), &existing) != 0) return;
    auto refuse = [&](const std::string& message) {
        ::close(lockFd);
        return std::runtime_error(message);
    };
    if (!S_ISSOCK(existing.st_mode)) throw refuse(path + " exists and is not a socket; not replacing it");
    const int probe = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const bool answered =
        probe >= 0 && ::connect(probe, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0;
    if (probe >= 0) ::close(probe);
    if (answered) throw refuse("something else listens on " + path + "; not replacing it");
    ::unlink(path.c_str());
}

sockaddr_un socketAddress(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof(address.sun_path)) {
        throw std::runtime_error("control socket path too long: " + path);
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    return address;
}
}  // namespace

ControlServer::ControlServer(std::string path, Handler handler, OversizeReply oversizeReply)
    : _path(std::move(path)), _handler(std::move(handler)), _oversizeReply(std::move(oversizeReply)) {
    sockaddr_un address = socketAddress(_path);
    std::string lockPath = _path + ".lock";
    _lockFd = ::open(lockPath.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0660);
    if (_lockFd < 0) throw systemError("cannot create the control socket lock " + lockPath);
    if (::flock(_lockFd, LOCK_EX | LOCK_NB) != 0) {
        int error = errno;
        ::close(_lockFd);
        _lockFd = -1;
        if (error == EWOULDBLOCK) {
            throw std::runtime_error("another tolkatouchd is already running on " + _path);
        }
        errno = error;
        throw systemError("cannot lock " + lockPath);
    }
    // Holding the lock, a socket file left at the path belongs to a daemon that is gone; anything
    // else there (a file given by mistake, a socket something else listens on) is left alone.
    removeStaleSocket(_path, address, _lockFd);

    auto fail = [this](const std::string& what) {
        auto error = systemError(what);
        for (int fd : {_listenFd, _epollFd, _wakeFd, _reserveFd}) {
            if (fd >= 0) ::close(fd);
        }
        ::close(_lockFd);
        return error;
    };
    _listenFd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (_listenFd < 0) throw fail("cannot create the control socket");
    // The socket file is born with mode 0660: no moment in which others could connect.
    const mode_t previousMask = ::umask(0117);
    const int bound = ::bind(_listenFd, reinterpret_cast<sockaddr*>(&address), sizeof(address));
    ::umask(previousMask);
    if (bound != 0) throw fail("cannot bind the control socket " + _path);
    struct stat made {};
    if (::lstat(_path.c_str(), &made) == 0) _socketInode = made.st_ino;
    if (::listen(_listenFd, kListenBacklog) != 0) throw fail("cannot listen on " + _path);
    _reserveFd = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
    _epollFd = ::epoll_create1(EPOLL_CLOEXEC);
    if (_epollFd < 0) throw fail("cannot create the control socket's epoll set");
    epoll_event event{};
    event.events = EPOLLIN;
    event.data.fd = _listenFd;
    if (::epoll_ctl(_epollFd, EPOLL_CTL_ADD, _listenFd, &event) != 0) {
        throw fail("cannot watch the control socket");
    }
    _wakeFd = ::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC);
    event.data.fd = _wakeFd;
    if (_wakeFd < 0 || ::epoll_ctl(_epollFd, EPOLL_CTL_ADD, _wakeFd, &event) != 0) {
        throw fail("cannot make the control socket's wake-up");
    }
    for (std::size_t i = 0; i < kWorkers; ++i) _workers.emplace_back([this] { work(); });
}

ControlServer::~ControlServer() {
    {
        std::lock_guard lock(_turnsMutex);
        _stopping = true;
    }
    _turnsReady.notify_all();
    for (auto& worker : _workers) worker.join();
    for (auto& [fd, client] : _clients) ::close(fd);
    _clients.clear();
    ::close(_epollFd);
    ::close(_listenFd);
    ::close(_wakeFd);
    if (_reserveFd >= 0) ::close(_reserveFd);
    // Only the socket this server made: the path may have been given to something else since.
    struct stat now {};
    if (::lstat(_path.c_str(), &now) == 0 && S_ISSOCK(now.st_mode) && now.st_ino == _socketInode) {
        ::unlink(_path.c_str());
    }
    ::close(_lockFd);
}

std::string ControlServer::replyTooLong(std::size_t length) {
    return "{\"error\":\"reply too long to send (" + std::to_string(length) + " bytes, at most " +
           std::to_string(kMaxReplyLength) + ")\"}";
}

void ControlServer::handleReady() {
    epoll_event events[32];
    int count = ::epoll_wait(_epollFd, events, 32, 0);
    for (int i = 0; i < count; ++i) {
        int fd = events[i].data.fd;
        if (fd == _listenFd) {
            accept();
            continue;
        }
        if (fd == _wakeFd) {
            takeFinishedTurns();
            continue;
        }
        auto it = _clients.find(fd);
        if (it != _clients.end()) serve(*it->second);
    }
}

void ControlServer::accept() {
    for (;;) {
        int fd = ::accept4(_listenFd, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
        if (fd < 0 && (errno == EMFILE || errno == ENFILE)) {
            acceptWithoutDescriptors();
            return;
        }
        if (fd < 0 && errno == EINTR) continue;
        if (fd < 0) return;  // EAGAIN, or a client that left before we took it
        if (_clients.size() >= kMaxClients) {
            refuse(fd, "too many clients (at most " + std::to_string(kMaxClients) + ")");
            continue;
        }
        auto client = std::make_unique<Client>();
        client->fd = fd;
        client->id = _nextClientId++;
        // Edge-triggered: the server reads and writes until the socket would block, or until the
        // client's buffers are full, and comes back for the rest when the client's turn is over.
        epoll_event event{};
        event.events = EPOLLIN | EPOLLOUT | EPOLLRDHUP | EPOLLET;
        event.data.fd = fd;
        if (::epoll_ctl(_epollFd, EPOLL_CTL_ADD, fd, &event) != 0) {
            ::close(fd);
            continue;
        }
        _clients.emplace(fd, std::move(client));
    }
}

void ControlServer::refuse(int fd, const std::string& reply) {
    // One line, best effort: the client is closed whether or not it reads it.
    const std::string line = "{\"error\":\"" + reply + "\"}\n";
    [[maybe_unused]] ssize_t sent = ::send(fd, line.data(), line.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
    ::close(fd);
}

void ControlServer::acceptWithoutDescriptors() {
    // The reserve descriptor makes room for one: the waiting client learns why and is closed,
    // so the listening socket stops being readable for it.
    if (_reserveFd < 0) return;
    ::close(_reserveFd);
    _reserveFd = -1;
    int fd = ::accept4(_listenFd, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
    if (fd >= 0) refuse(fd, "the daemon has no file descriptors left");
    _reserveFd = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
}

void ControlServer::readFrom(Client& client) {
    // Only while the bytes and requests already taken are few: a client that floods the socket
    // waits for its own replies, and the others are not held up by its input.
    while (!client.closing && client.received.size() < kMaxLineLength && client.requests.size() < kLinesPerTurn) {
        char buffer[16 * 1024];
        const ssize_t got = ::recv(client.fd, buffer, sizeof(buffer), 0);
        if (got > 0) {
            client.received.append(buffer, static_cast<size_t>(got));
            splitLines(client);
        } else if (got < 0 && errno == EINTR) {
            continue;
        } else if (got < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) {
            return;
        } else {
            // The peer is done (or broken): its complete lines are still answered, a half line
            // it leaves behind is dropped unanswered.
            client.closing = true;
        }
    }
}

void ControlServer::splitLines(Client& client) {
    size_t at = 0;
    for (; at < client.received.size() && client.requests.size() < kLinesPerTurn; ++at) {
        const char c = client.received[at];
        if (c == '\n') {
            if (client.discarding) {
                client.discarding = false;
            } else {
                client.requests.push_back({std::move(client.input), false});
            }
            client.input.clear();
        } else if (!client.discarding) {
            client.input += c;
            if (client.input.size() > kMaxLineLength) {
                client.requests.push_back({{}, true});
                client.input.clear();
                client.discarding = true;
            }
        }
    }
    client.received.erase(0, at);
}

void ControlServer::serve(Client& client) {
    const int fd = client.fd;
    splitLines(client);
    readFrom(client);
    writeTo(client);
    if (!_clients.count(fd)) return;
    // The next turn once the replies of the last one are out: a client that does not read its
    // replies gets no more answers, and its output stays within one turn's.
    if (!client.inTurn && client.output.empty() && !client.requests.empty()) {
        Turn turn;
        turn.client = client.id;
        while (!client.requests.empty() && turn.requests.size() < kLinesPerTurn) {
            turn.requests.push_back(std::move(client.requests.front()));
            client.requests.pop_front();
        }
        client.inTurn = true;
        {
            std::lock_guard lock(_turnsMutex);
            _waitingTurns.push_back(std::move(turn));
        }
        _turnsReady.notify_one();
        splitLines(client);
        readFrom(client);
    }
    if (client.closing && !client.inTurn && client.requests.empty() && client.output.empty()) drop(fd);
}

void ControlServer::takeFinishedTurns() {
    uint64_t count;
    [[maybe_unused]] ssize_t got = ::read(_wakeFd, &count, sizeof(count));
    std::vector<Turn> finished;
    std::map<uint64_t, uint8_t> subscribers;
    {
        std::lock_guard lock(_turnsMutex);
        finished.swap(_finishedTurns);
        subscribers.swap(_newSubscribers);
    }
    for (Turn& turn : finished) {
        auto it = std::find_if(_clients.begin(), _clients.end(),
                               [&](const auto& entry) { return entry.second->id == turn.client; });
        if (it == _clients.end()) continue;  // it left while its requests were answered
        Client& client = *it->second;
        // The reply that subscribed comes before the first pushed line.
        client.output += turn.replies;
        if (auto asked = subscribers.find(client.id); asked != subscribers.end()) {
            // A small send buffer keeps what a slow frame reader has not read yet to a few lines.
            if ((asked->second & ~client.channels) & static_cast<uint8_t>(Channel::Frames)) {
                const int size = kFrameSendBuffer;
                ::setsockopt(client.fd, SOL_SOCKET, SO_SNDBUF, &size, sizeof(size));
            }
            client.channels |= asked->second;
        }
        client.inTurn = false;
        serve(client);
    }
}

void ControlServer::work() {
    for (;;) {
        Turn turn;
        {
            std::unique_lock lock(_turnsMutex);
            _turnsReady.wait(lock, [this] { return _stopping || !_waitingTurns.empty(); });
            if (_stopping) return;
            turn = std::move(_waitingTurns.front());
            _waitingTurns.pop_front();
        }
        tCurrentClient = turn.client;
        for (const Request& request : turn.requests) {
            turn.replies += answer(request);
            turn.replies += '\n';
        }
        tCurrentClient = 0;
        {
            std::lock_guard lock(_turnsMutex);
            _finishedTurns.push_back(std::move(turn));
        }
        const uint64_t one = 1;
        [[maybe_unused]] ssize_t written = ::write(_wakeFd, &one, sizeof(one));
    }
}

std::string ControlServer::answer(const Request& request) const {
    if (request.oversized) return _oversizeReply();
    std::string reply;
    try {
        reply = _handler(request.line);
    } catch (const std::exception&) {
        return "{\"error\":\"the request failed\"}";
    }
    if (reply.size() > kMaxReplyLength) return replyTooLong(reply.size());
    return reply;
}

uint64_t ControlServer::currentClient() { return tCurrentClient; }

void ControlServer::subscribe(uint64_t client, Channel channel) {
    if (client == 0) return;
    std::lock_guard lock(_turnsMutex);
    _newSubscribers[client] |= static_cast<uint8_t>(channel);
}

std::size_t ControlServer::subscriberCount(Channel channel) const {
    std::size_t count = 0;
    for (const auto& [fd, client] : _clients) count += client->subscribed(channel) && !client->closing;
    return count;
}

void ControlServer::pushNewest(const std::string& line) {
    std::vector<int> subscribers;
    for (const auto& [fd, client] : _clients) {
        if (client->subscribed(Channel::Frames)) subscribers.push_back(fd);
    }
    for (int fd : subscribers) {
        Client& client = *_clients.at(fd);
        // Replaces a line the client had no room for: it gets the newest, never a backlog.
        client.newest = line;
        client.newest += '\n';
        writeTo(client);
    }
}

void ControlServer::push(const std::vector<std::string>& lines) {
    std::vector<int> subscribers;
    for (const auto& [fd, client] : _clients) {
        if (client->subscribed(Channel::Lines)) subscribers.push_back(fd);
    }
    for (int fd : subscribers) {
        Client& client = *_clients.at(fd);
        for (const std::string& line : lines) {
            // A subscriber that reads slowly loses lines, never holds up the daemon: it is told
            // how many once it has room again.
            if (client.output.size() - client.outputOffset + line.size() > kMaxSubscriberBacklog) {
                ++client.dropped;
                continue;
            }
            if (client.dropped > 0) {
                client.output += "{\"dropped\":" + std::to_string(client.dropped) + "}\n";
                client.dropped = 0;
            }
            client.output += line;
            client.output += '\n';
        }
        writeTo(client);
    }
}

void ControlServer::writeTo(Client& client) {
    for (;;) {
        while (client.outputOffset < client.output.size()) {
            ssize_t sent = ::send(client.fd, client.output.data() + client.outputOffset,
                                  client.output.size() - client.outputOffset, MSG_NOSIGNAL);
            if (sent < 0 && errno == EINTR) continue;
            if (sent < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) return;
            if (sent < 0) {
                drop(client.fd);
                return;
            }
            client.outputOffset += static_cast<std::size_t>(sent);
        }
        client.output.clear();
        client.outputOffset = 0;
        // The newest frame goes out only behind everything already on its way, so that a line
        // being written is never replaced halfway.
        if (client.newest.empty()) return;
        client.output.swap(client.newest);
    }
}

void ControlServer::drop(int fd) {
    ::epoll_ctl(_epollFd, EPOLL_CTL_DEL, fd, nullptr);
    ::close(fd);
    _clients.erase(fd);
}

}  // namespace TolkaTouch

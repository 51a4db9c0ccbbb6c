#pragma once
// ControlServer: the daemon's Unix-domain control socket. Clients write one request per line and
// read one reply per line. Everything is non-blocking behind one epoll descriptor of its own,
// which the daemon's event loop watches: a client that connects and never writes, writes half a
// line and leaves, or never reads its replies, costs a descriptor and a bounded buffer, and never
// holds up the daemon. Lines longer than kMaxLineLength get an error reply.

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace TolkaTouch {

class ControlServer {
public:
    static constexpr std::size_t kMaxLineLength = 64 * 1024;
    // A client whose unread replies grow past this is disconnected.
    static constexpr std::size_t kMaxPendingOutput = 16 * 1024 * 1024;
    // Clients beyond this many get a refusal line and are closed.
    static constexpr std::size_t kMaxClients = 64;
    static constexpr int kListenBacklog = 128;
    // Requests answered for one client before the others get their turn.
    static constexpr std::size_t kLinesPerTurn = 8;

    // Answers one request line (without its newline) with one reply line (without newline).
    using Handler = std::function<std::string(const std::string& line)>;
    // The reply given, without calling the handler, to a line over kMaxLineLength.
    using OversizeReply = std::function<std::string()>;

    // Takes the lock beside the socket path (PATH.lock), replaces a stale socket file, binds,
    // sets mode 0660 and listens. Throws std::runtime_error with a one-line message when another
    // daemon holds the socket or the socket cannot be made.
    ControlServer(std::string path, Handler handler, OversizeReply oversizeReply);
    ~ControlServer();  // closes every client, removes the socket file and releases the lock
    ControlServer(const ControlServer&) = delete;
    ControlServer& operator=(const ControlServer&) = delete;

    const std::string& path() const { return _path; }

    // The descriptor to watch for readability; then call handleReady().
    int pollFd() const { return _epollFd; }

    // Does all the work that is ready now without waiting: accepts, reads, answers, writes.
    void handleReady();

    std::size_t clientCount() const { return _clients.size(); }

    // Subscribers: clients that, after their replies, get every line the daemon pushes (what
    // `tolkatouch watch` follows). A subscriber whose unread lines pass kMaxSubscriberBacklog bytes
    // loses the next ones, and is told how many ({"dropped": N}) before the first it gets again.
    static constexpr std::size_t kMaxSubscriberBacklog = 1024 * 1024;
    // The client whose request the handler is answering; -1 outside the handler.
    int currentClient() const { return _current; }
    void subscribe(int client);
    std::size_t subscriberCount() const;
    void push(const std::vector<std::string>& lines);

private:
    struct Client;
    void accept();
    void readFrom(Client& client);
    void serve(Client& client);
    void servePending();
    void writeTo(Client& client);
    void updateInterest(Client& client);
    void drop(int fd);
    void refuse(int fd, const std::string& reply);
    void acceptWithoutDescriptors();

    std::string _path;
    int _current = -1;
    Handler _handler;
    OversizeReply _oversizeReply;
    int _lockFd = -1;
    int _listenFd = -1;
    int _epollFd = -1;
    // Kept open so that, with the descriptor table full, a waiting client can still be taken off
    // the queue and told why: otherwise the listening socket stays readable and the loop spins.
    int _reserveFd = -1;
    // Clients with requests read and not yet answered, and the descriptor that keeps the loop
    // coming back for them.
    std::set<int> _pending;
    int _wakeFd = -1;
    ino_t _socketInode = 0;  // the socket file this server made, so that only it is removed
    std::map<int, std::unique_ptr<Client>> _clients;
};

}  // namespace TolkaTouch

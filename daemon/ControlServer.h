#pragma once
// ControlServer: the daemon's Unix-domain control socket. Clients write one request per line and
// read one reply per line. The socket work is non-blocking behind one epoll descriptor of its own,
// which the daemon's event loop watches; the requests are answered on the server's own worker
// threads, so that a reply that takes long to build (a whole recording) holds up neither the loop
// (and the key output on it) nor the other clients. A client that connects and never writes,
// writes half a line and leaves, or never reads its replies, costs a descriptor and a bounded
// buffer, and never holds up the daemon. Lines longer than kMaxLineLength get an error reply, and
// so does a request whose reply would be longer than kMaxReplyLength. Clients may subscribe to the
// lines the daemon pushes (what `tolkatouch watch` follows), or to the newest of a stream of
// frames (what `tolkatouch view --live` follows), where a slow reader skips to the newest.

#include <sys/types.h>

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace TolkaTouch {

class ControlServer {
public:
    static constexpr std::size_t kMaxLineLength = 64 * 1024;
    // A reply longer than this is not sent: the request gets an error reply naming the length.
    static constexpr std::size_t kMaxReplyLength = 16 * 1024 * 1024;
    // Clients beyond this many get a refusal line and are closed.
    static constexpr std::size_t kMaxClients = 64;
    static constexpr int kListenBacklog = 128;
    // Requests answered for one client before the others get their turn.
    static constexpr std::size_t kLinesPerTurn = 8;
    // Threads that answer requests. Each client has at most one turn with them at a time, so a
    // slow reply holds up only its own client while fewer than this many are being built.
    static constexpr std::size_t kWorkers = 4;

    // Answers one request line (without its newline) with one reply line (without newline).
    // Called on the worker threads, several at once for different clients.
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

    // Does all the socket work that is ready now without waiting: accepts, reads, hands requests
    // to the workers, writes the replies they have finished.
    void handleReady();

    std::size_t clientCount() const { return _clients.size(); }

    // The one-line reply that stands in for one longer than kMaxReplyLength.
    static std::string replyTooLong(std::size_t length);

    // Subscribers: clients that, after their replies, get what the daemon pushes on a channel.
    // On Lines, every line: a subscriber whose unread lines pass kMaxSubscriberBacklog bytes loses
    // the next ones, and is told how many ({"dropped": N}) before the first it gets again.
    // On Frames, the newest line only: a line not yet on its way replaces the one before it, and
    // the socket's send buffer is cut to kFrameSendBuffer, so a slow reader is never more than a
    // few lines behind and gets the newest as soon as it reads again.
    enum class Channel : uint8_t { Lines = 1, Frames = 2 };
    static constexpr std::size_t kMaxSubscriberBacklog = 1024 * 1024;
    static constexpr int kFrameSendBuffer = 16 * 1024;
    // The client whose request this thread's handler is answering; 0 outside the handler.
    static uint64_t currentClient();
    // From the handler: the client becomes a subscriber once its reply is out (any thread).
    void subscribe(uint64_t client, Channel channel = Channel::Lines);
    // From here on, the loop's side: who subscribes, and the lines they get.
    std::size_t subscriberCount(Channel channel = Channel::Lines) const;
    void push(const std::vector<std::string>& lines);
    void pushNewest(const std::string& line);

private:
    struct Client;
    struct Request {
        std::string line;
        bool oversized = false;  // longer than kMaxLineLength: answered without the handler
    };
    // One client's turn with the workers: its next requests, and then their replies.
    struct Turn {
        uint64_t client = 0;
        std::vector<Request> requests;
        std::string replies;
    };
    void accept();
    void readFrom(Client& client);
    void splitLines(Client& client);
    void serve(Client& client);
    void takeFinishedTurns();
    void work();
    std::string answer(const Request& request) const;
    void writeTo(Client& client);
    void drop(int fd);
    void refuse(int fd, const std::string& reply);
    void acceptWithoutDescriptors();

    std::string _path;
    Handler _handler;
    OversizeReply _oversizeReply;
    int _lockFd = -1;
    int _listenFd = -1;
    int _epollFd = -1;
    // Kept open so that, with the descriptor table full, a waiting client can still be taken off
    // the queue and told why: otherwise the listening socket stays readable and the loop spins.
    int _reserveFd = -1;
    // Signalled by a worker that has finished a turn, so that the loop comes back for it.
    int _wakeFd = -1;
    ino_t _socketInode = 0;  // the socket file this server made, so that only it is removed
    std::map<int, std::unique_ptr<Client>> _clients;
    uint64_t _nextClientId = 1;  // a descriptor is reused; a turn names its client by this

    std::mutex _turnsMutex;
    std::condition_variable _turnsReady;
    std::deque<Turn> _waitingTurns;   // in the order the clients became ready: round robin
    std::vector<Turn> _finishedTurns;
    // Asked for by the handler (client, channels), taken with the finished turns.
    std::map<uint64_t, uint8_t> _newSubscribers;
    bool _stopping = false;
    std::vector<std::thread> _workers;
};

}  // namespace TolkaTouch

#pragma once
// WatchHub: what `tolkatouch watch` follows, gathered from any thread for the daemon's loop to
// send to the control socket's subscribers. The plug-in's report thread hands over its log lines
// and reports without ever waiting for a reader: lines go into a bounded queue (past kMaxQueued
// they are counted as dropped) and an eventfd wakes the loop. Costs one atomic load per line while
// nobody watches.
//
// The lines, one JSON object each:
//   {"log": {"category": C, "level": L, "message": M, "frame": N}}   ("frame" when known)
//   {"report": {"service": S, "bytes": "01 e8 03 ..."}}                (an input report)
//   {"event": {...}}                                                   (as tolkatouchd --print)
//   {"dropped": N}                                                     (lines lost before the next)

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "platform/Log.h"

namespace TolkaTouch {

class WatchHub final : public LogSink {
public:
    static constexpr std::size_t kMaxQueued = 4096;

    WatchHub();  // throws std::runtime_error when the eventfd cannot be made
    ~WatchHub() override;
    WatchHub(const WatchHub&) = delete;
    WatchHub& operator=(const WatchHub&) = delete;

    // Readable when lines wait; take() them.
    int pollFd() const { return _wakeFd; }

    // Whether anyone watches: lines are gathered only then.
    void setActive(bool active) { _active.store(active, std::memory_order_relaxed); }
    bool active() const { return _active.load(std::memory_order_relaxed); }

    void write(const LogRecord& record) override;  // the log's observer
    void report(uint32_t service, const uint8_t* bytes, std::size_t length);
    void event(const std::string& jsonObject);

    // Every line gathered, oldest first, with {"dropped": N} first when the queue overflowed.
    std::vector<std::string> take();

private:
    void add(std::string line);

    int _wakeFd = -1;
    std::atomic<bool> _active{false};
    std::mutex _mutex;
    std::vector<std::string> _queued;
    uint64_t _dropped = 0;
};

}  // namespace TolkaTouch

#include "daemon/WatchHub.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include <nlohmann/json.hpp>

#include "platform/Hex.h"

namespace TolkaTouch {

namespace {
std::string dump(const nlohmann::json& object) {
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}
}  // namespace

WatchHub::WatchHub() {
    _wakeFd = ::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC);
    if (_wakeFd < 0) throw std::runtime_error(std::string("cannot create the watch queue: ") + std::strerror(errno));
}

WatchHub::~WatchHub() {
    if (_wakeFd >= 0) ::close(_wakeFd);
}

void WatchHub::write(const LogRecord& record) {
    if (!active()) return;
    nlohmann::json line{{"category", record.category}, {"level", logLevelName(record.level)}, {"message", record.message}};
    if (record.context.frame) line["frame"] = *record.context.frame;
    add(dump(nlohmann::json{{"log", std::move(line)}}));
}

void WatchHub::report(uint32_t service, const uint8_t* bytes, std::size_t length) {
    if (!active()) return;
    add(dump(nlohmann::json{{"report", {{"service", service}, {"bytes", Hex::text({bytes, length}, Hex::Spacing::Between)}}}}));
}

void WatchHub::event(const std::string& jsonObject) {
    if (!active()) return;
    add("{\"event\":" + jsonObject + "}");
}

void WatchHub::add(std::string line) {
    {
        std::lock_guard lock(_mutex);
        if (_queued.size() >= kMaxQueued) {
            ++_dropped;
            return;
        }
        _queued.push_back(std::move(line));
    }
    const uint64_t one = 1;
    [[maybe_unused]] ssize_t written = ::write(_wakeFd, &one, sizeof one);
}

std::vector<std::string> WatchHub::take() {
    uint64_t count;
    [[maybe_unused]] ssize_t got = ::read(_wakeFd, &count, sizeof count);
    std::vector<std::string> lines;
    std::lock_guard lock(_mutex);
    if (_dropped > 0) {
        lines.push_back("{\"dropped\":" + std::to_string(_dropped) + "}");
        _dropped = 0;
    }
    for (std::string& line : _queued) lines.push_back(std::move(line));
    _queued.clear();
    return lines;
}

}  // namespace TolkaTouch

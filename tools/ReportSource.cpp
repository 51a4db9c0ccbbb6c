#include "tools/ReportSource.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <linux/hidraw.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include "common/Reports.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

constexpr size_t kLargestReport = 4096;

// The length of a report by its ID; nothing for an ID the surface never sends.
std::optional<size_t> reportLength(uint8_t id) {
    if (id == InputReport::kImageReportID) return InputReport::Image::kReportLength;
    if (id == InputReport::kFirmwareEventReportID) return InputReport::FirmwareEvent::kReportLength;
    return std::nullopt;
}

}  // namespace

ReportSource::ReportSource(const std::string& path) {
    _fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (_fd < 0) throw ToolError(path, std::strerror(errno));
    int size = 0;
    _hidraw = ::ioctl(_fd, HIDIOCGRDESCSIZE, &size) == 0;
}

ReportSource::~ReportSource() {
    if (_fd >= 0) ::close(_fd);
}

std::optional<std::vector<uint8_t>> ReportSource::cutReport(std::string& reason) {
    if (_pending.empty()) return std::nullopt;
    const std::optional<size_t> length = reportLength(_pending.front());
    if (!length) {
        reason = "a report with the unknown ID " + std::to_string(_pending.front());
        return std::nullopt;
    }
    if (_pending.size() < *length) return std::nullopt;
    std::vector<uint8_t> report(_pending.begin(), _pending.begin() + static_cast<std::ptrdiff_t>(*length));
    _pending.erase(_pending.begin(), _pending.begin() + static_cast<std::ptrdiff_t>(*length));
    return report;
}

ReportSource::Outcome ReportSource::next(int timeoutMs) {
    Outcome outcome;
    for (;;) {
        if (!_hidraw) {
            std::string reason;
            if (auto report = cutReport(reason)) {
                outcome.status = Status::Report;
                outcome.report = std::move(*report);
                return outcome;
            }
            if (!reason.empty() || _ended) {
                outcome.status = Status::Gone;
                outcome.reason = !reason.empty() ? reason : _pending.empty() ? "no more reports" : "it ended in the middle of a report";
                return outcome;
            }
        }
        pollfd fd{_fd, POLLIN, 0};
        const int ready = ::poll(&fd, 1, timeoutMs);
        if (ready < 0) {
            if (errno == EINTR) {
                outcome.status = Status::Interrupted;
                return outcome;
            }
            outcome.status = Status::Gone;
            outcome.reason = std::strerror(errno);
            return outcome;
        }
        if (ready == 0) {
            outcome.status = Status::Timeout;
            return outcome;
        }
        uint8_t buffer[kLargestReport];
        const ssize_t length = ::read(_fd, buffer, sizeof buffer);
        if (length < 0) {
            if (errno == EAGAIN || errno == EINTR) continue;
            outcome.status = Status::Gone;
            // A hidraw node whose device was unplugged fails its reads with EIO or ENODEV.
            outcome.reason = _hidraw && (errno == EIO || errno == ENODEV) ? "the device is gone" : std::strerror(errno);
            return outcome;
        }
        if (length == 0) {
            // A hidraw node reads 0 bytes once its device is gone; a stream has ended.
            if (_hidraw) {
                outcome.status = Status::Gone;
                outcome.reason = "the device is gone";
                return outcome;
            }
            _ended = true;
            continue;
        }
        if (_hidraw) {
            outcome.status = Status::Report;
            outcome.report.assign(buffer, buffer + length);
            return outcome;
        }
        _pending.insert(_pending.end(), buffer, buffer + length);
    }
}

}  // namespace TolkaTouch::Tools

#include "tools/VirtualSurface.h"

#include "common/FeatureReports.h"
#include "platform/Hex.h"

#include <fcntl.h>
#include <linux/input.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "common/ReportDescriptor.h"

namespace TolkaTouch {

namespace {

void writeEvent(int fd, const uhid_event& event) {
    ssize_t written;
    do {
        written = ::write(fd, &event, sizeof event);
    } while (written < 0 && errno == EINTR);
    if (written < 0) throw std::runtime_error(std::string("uhid: write failed: ") + std::strerror(errno));
    if (static_cast<size_t>(written) != sizeof event) throw std::runtime_error("uhid: short write");
}

}  // namespace

std::map<uint8_t, std::vector<uint8_t>> VirtualSurface::defaultFeatureReports() {
    return TolkaTouch::defaultFeatureReports();
}

uint8_t VirtualSurface::reportIDFromText(const std::string& text) {
    const bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    const std::string digits = hex ? text.substr(2) : text;
    size_t used = 0;
    unsigned long value = 0;
    try {
        if (!digits.empty() && std::isxdigit(static_cast<unsigned char>(digits[0]))) {
            value = std::stoul(digits, &used, hex ? 16 : 10);
        }
    } catch (const std::exception&) {
        used = 0;
    }
    if (digits.empty() || used != digits.size() || value == 0 || value > 255) {
        throw std::invalid_argument("not a report ID from 1 to 255: " + text);
    }
    return static_cast<uint8_t>(value);
}

std::map<uint8_t, std::vector<uint8_t>> VirtualSurface::featureReportsWith(const std::vector<std::string>& options) {
    auto reports = defaultFeatureReports();
    for (const auto& option : options) {
        auto [id, bytes] = featureFromOption(option);
        reports[id] = std::move(bytes);
    }
    return reports;
}

std::pair<uint8_t, std::vector<uint8_t>> VirtualSurface::featureFromOption(const std::string& option) {
    auto equals = option.find('=');
    if (equals == std::string::npos) throw std::invalid_argument("expected ID=HEX, got " + option);
    uint8_t id = reportIDFromText(option.substr(0, equals));
    std::vector<uint8_t> bytes{id};
    try {
        const std::vector<uint8_t> payload = Hex::bytesFromPairs(std::string_view(option).substr(equals + 1), " :");
        bytes.insert(bytes.end(), payload.begin(), payload.end());
    } catch (const std::invalid_argument& error) {
        throw std::invalid_argument(std::string(error.what()) + ": " + option);
    }
    if (bytes.size() > 128) throw std::invalid_argument("longer than 127 bytes after the ID: " + option);
    return {id, bytes};
}

uhid_event VirtualSurface::createRequest(const Options& options) {
    uhid_event event{};
    event.type = UHID_CREATE2;
    auto& create = event.u.create2;
    std::strncpy(reinterpret_cast<char*>(create.name), options.name.c_str(), sizeof create.name - 1);
    std::strncpy(reinterpret_cast<char*>(create.phys), "tolkatouch-uhid", sizeof create.phys - 1);
    static_assert(ReportDescriptor::kBytes.size() <= sizeof create.rd_data);
    std::copy(ReportDescriptor::kBytes.begin(), ReportDescriptor::kBytes.end(), create.rd_data);
    create.rd_size = ReportDescriptor::kBytes.size();
    create.bus = BUS_USB;
    create.vendor = options.vendor;
    create.product = options.product;
    create.version = 0x0100;
    create.country = 0;
    return event;
}

VirtualSurface::VirtualSurface(Options options, const std::string& uhidPath) : _options(std::move(options)) {
    _fd = ::open(uhidPath.c_str(), O_RDWR | O_CLOEXEC | O_NONBLOCK);
    if (_fd < 0) throw std::runtime_error("cannot open " + uhidPath + ": " + std::strerror(errno));

    const uhid_event event = createRequest(_options);
    try {
        writeEvent(_fd, event);
    } catch (const std::exception&) {
        ::close(_fd);
        _fd = -1;
        throw std::runtime_error("uhid refused the device (" + uhidPath + ")");
    }
    _created = true;
}

VirtualSurface::~VirtualSurface() {
    destroy();
    if (_fd >= 0) ::close(_fd);
}

void VirtualSurface::destroy() {
    if (!_created) return;
    _created = false;
    uhid_event event{};
    event.type = UHID_DESTROY;
    try {
        writeEvent(_fd, event);
    } catch (const std::exception&) {
        // Closing the node unplugs the device as well.
    }
}

void VirtualSurface::sendInputReport(const std::vector<uint8_t>& report) {
    uhid_event event{};
    event.type = UHID_INPUT2;
    if (report.size() > sizeof event.u.input2.data) throw std::runtime_error("uhid: input report too long");
    event.u.input2.size = static_cast<uint16_t>(report.size());
    std::copy(report.begin(), report.end(), event.u.input2.data);
    writeEvent(_fd, event);
}

void VirtualSurface::serviceUntil(std::chrono::steady_clock::time_point deadline) {
    for (;;) {
        auto now = std::chrono::steady_clock::now();
        int timeoutMs = 0;
        if (deadline > now) {
            auto left = std::chrono::duration_cast<std::chrono::microseconds>(deadline - now).count();
            timeoutMs = static_cast<int>(std::min<int64_t>((left + 999) / 1000, 1000));
        }
        pollfd pfd{_fd, POLLIN, 0};
        int ready = ::poll(&pfd, 1, timeoutMs);
        if (ready < 0 && errno != EINTR) throw std::runtime_error(std::string("uhid: poll failed: ") + std::strerror(errno));
        if (ready > 0) {
            handleOneRequest();
            continue;
        }
        if (std::chrono::steady_clock::now() >= deadline) return;
    }
}

void VirtualSurface::handleOneRequest() {
    uhid_event event{};
    ssize_t got = ::read(_fd, &event, sizeof event);
    if (got < 0) {
        if (errno == EAGAIN || errno == EINTR) return;
        throw std::runtime_error(std::string("uhid: read failed: ") + std::strerror(errno));
    }
    if (auto reply = answer(event, _options, _status)) writeEvent(_fd, *reply);
}

std::optional<uhid_event> VirtualSurface::answer(const uhid_event& request, const Options& options, Status& status) {
    switch (request.type) {
    case UHID_START: status.started = true; return std::nullopt;
    case UHID_STOP: status.started = false; return std::nullopt;
    case UHID_OPEN:
        ++status.openCount;
        status.everOpened = true;
        return std::nullopt;
    case UHID_CLOSE: status.openCount = std::max(0, status.openCount - 1); return std::nullopt;
    case UHID_GET_REPORT: {
        ++status.featureRequests;
        const auto& get = request.u.get_report;
        uhid_event reply{};
        reply.type = UHID_GET_REPORT_REPLY;
        reply.u.get_report_reply.id = get.id;
        auto found = options.featureReports.find(get.rnum);
        if (get.rtype != UHID_FEATURE_REPORT || found == options.featureReports.end()) {
            reply.u.get_report_reply.err = EINVAL;
        } else if (options.failingReports.count(get.rnum) != 0) {
            reply.u.get_report_reply.err = EIO;
        } else {
            const auto& bytes = found->second;
            size_t size = std::min(bytes.size(), sizeof reply.u.get_report_reply.data);
            reply.u.get_report_reply.size = static_cast<uint16_t>(size);
            std::copy_n(bytes.begin(), size, reply.u.get_report_reply.data);
        }
        return reply;
    }
    case UHID_SET_REPORT: {
        // The surface takes no settings; acknowledge so that the writer does not wait.
        uhid_event reply{};
        reply.type = UHID_SET_REPORT_REPLY;
        reply.u.set_report_reply.id = request.u.set_report.id;
        reply.u.set_report_reply.err = 0;
        return reply;
    }
    default: return std::nullopt;  // output reports: the surface has none
    }
}

}  // namespace TolkaTouch

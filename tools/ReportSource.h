#pragma once
// ReportSource: the input reports of a surface as they arrive. A hidraw node gives one report
// per read; anything else (a pipe, a file: what tests and fakes feed) is a byte stream, cut into
// reports by the length of each report ID (image 73 bytes, firmware event 10).

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace TolkaTouch::Tools {

class ReportSource {
public:
    // Opens the path for reading; ToolError naming it when it cannot be opened.
    explicit ReportSource(const std::string& path);
    ~ReportSource();
    ReportSource(const ReportSource&) = delete;
    ReportSource& operator=(const ReportSource&) = delete;

    enum class Status { Report, Timeout, Interrupted, Gone };
    struct Outcome {
        Status status = Status::Timeout;
        std::vector<uint8_t> report;
        std::string reason;  // why the source is gone
    };
    // Waits up to timeoutMs for the next report. A signal ends the wait as Interrupted.
    Outcome next(int timeoutMs);

    bool isHidraw() const { return _hidraw; }

private:
    std::optional<std::vector<uint8_t>> cutReport(std::string& reason);

    int _fd = -1;
    bool _hidraw = false;
    bool _ended = false;
    std::vector<uint8_t> _pending;  // stream bytes not yet cut into a report
};

}  // namespace TolkaTouch::Tools

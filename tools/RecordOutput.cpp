#include "tools/RecordOutput.h"

#include <cctype>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstring>
#include <system_error>

#include "platform/PropertyValueJson.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

std::optional<Rotation> rotationFromText(const std::string& text) {
    size_t end = 0;
    while (end < text.size() && (std::isdigit(static_cast<unsigned char>(text[end])) != 0 || text[end] == '.')) ++end;
    if (end == 0) return std::nullopt;
    double value = 0.0;
    const auto [stop, error] = std::from_chars(text.data(), text.data() + end, value);
    if (error != std::errc() || stop != text.data() + end) return std::nullopt;
    const std::string unit = text.substr(end);
    Rotation rotation;
    const auto bytes = [&](double scale) { rotation.bytes = static_cast<uint64_t>(std::llround(value * scale)); };
    const auto seconds = [&](double scale) { rotation.nanoseconds = static_cast<uint64_t>(std::llround(value * scale * 1e9)); };
    if (unit.empty() || unit == "B") {
        bytes(1.0);
    } else if (unit == "K" || unit == "KB") {
        bytes(1024.0);
    } else if (unit == "M" || unit == "MB") {
        bytes(1024.0 * 1024.0);
    } else if (unit == "G" || unit == "GB") {
        bytes(1024.0 * 1024.0 * 1024.0);
    } else if (unit == "s") {
        seconds(1.0);
    } else if (unit == "min") {
        seconds(60.0);
    } else if (unit == "h") {
        seconds(3600.0);
    } else {
        return std::nullopt;
    }
    if ((rotation.bytes && *rotation.bytes < 4096) || (rotation.nanoseconds && *rotation.nanoseconds < 1'000'000'000)) return std::nullopt;
    return rotation;
}

RecordOutput::RecordOutput(std::string path, bool rotating, RecordingLinesHeader header, uint64_t startNs)
    : _path(std::move(path)), _rotating(rotating), _header(std::move(header)) {
    open(startNs);
}

RecordOutput::~RecordOutput() {
    try {
        close();
    } catch (const std::exception&) {
    }
}

std::string RecordOutput::numberedPath() const {
    char number[16];
    std::snprintf(number, sizeof number, ".%04u", _number);
    const size_t slash = _path.rfind('/');
    const size_t dot = _path.rfind('.');
    if (dot == std::string::npos || (slash != std::string::npos && dot < slash) || dot == slash + 1) return _path + number;
    return _path.substr(0, dot) + number + _path.substr(dot);
}

void RecordOutput::open(uint64_t nowNs) {
    ++_number;
    _currentPath = _path == "-" ? "-" : _rotating ? numberedPath() : _path;
    _file = _path == "-" ? stdout : std::fopen(_currentPath.c_str(), "wb");
    if (_file == nullptr) throw ToolError(_currentPath, std::strerror(errno));
    _fileStartNs = nowNs;
    _fileBytes = 0;
    RecordingLinesWriter::Sink file = RecordingLinesWriter::fileSink(_file);
    _writer = std::make_unique<RecordingLinesWriter>(
        [this, file](std::string_view bytes) {
            file(bytes);
            _fileBytes += bytes.size();
            _totalBytes += bytes.size();
        },
        _header);
    // The settings again as state lines, so that every reader replays with them.
    for (const auto& [key, value] : _header.settings) _writer->writeState(nowNs, key, value);
    flush();
}

void RecordOutput::rotate(uint64_t nowNs) {
    close();
    open(nowNs);
}

void RecordOutput::flush() {
    if (!_writer) return;
    try {
        _writer->flush();
    } catch (const std::system_error& error) {
        throw ToolError(_currentPath, error.code().message());
    }
}

void RecordOutput::close() {
    if (!_writer) return;
    flush();
    _writer.reset();
    if (_file != stdout) {
        const int status = std::fclose(_file);
        _file = nullptr;
        if (status != 0) throw ToolError(_currentPath, std::strerror(errno));
    } else {
        std::fflush(stdout);
    }
}

}  // namespace TolkaTouch::Tools

#include "tools/DocumentFile.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <functional>
#include <system_error>

#include <fcntl.h>
#include <unistd.h>

#include "common/PrintableText.h"
#include "pipeline/RecordingDocumentReader.h"

namespace TolkaTouch::Tools {

namespace {

std::string systemReason(int error) { return std::strerror(error); }

std::vector<uint8_t> readAll(int fd, const std::string& path) {
    std::vector<uint8_t> bytes;
    uint8_t buffer[65536];
    for (;;) {
        const ssize_t count = ::read(fd, buffer, sizeof buffer);
        if (count == 0) return bytes;
        if (count < 0) {
            if (errno == EINTR) continue;
            throw ToolError(path, systemReason(errno));
        }
        bytes.insert(bytes.end(), buffer, buffer + count);
    }
}

void writeAll(int fd, const std::vector<uint8_t>& bytes, const std::string& path) {
    size_t written = 0;
    while (written < bytes.size()) {
        const ssize_t count = ::write(fd, bytes.data() + written, bytes.size() - written);
        if (count < 0) {
            if (errno == EINTR) continue;
            throw ToolError(path, systemReason(errno));
        }
        written += static_cast<size_t>(count);
    }
}

}  // namespace

std::vector<uint8_t> readFileBytes(const std::string& path) {
    if (path == "-") return readAll(STDIN_FILENO, path);
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) throw ToolError(path, systemReason(errno));
    try {
        std::vector<uint8_t> bytes = readAll(fd, path);
        ::close(fd);
        return bytes;
    } catch (...) {
        ::close(fd);
        throw;
    }
}

void writeFileBytes(const std::string& path, const std::vector<uint8_t>& bytes) {
    if (path == "-") {
        std::fflush(stdout);
        writeAll(STDOUT_FILENO, bytes, path);
        return;
    }
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (fd < 0) throw ToolError(path, systemReason(errno));
    try {
        writeAll(fd, bytes, path);
    } catch (...) {
        ::close(fd);
        throw;
    }
    if (::close(fd) != 0) throw ToolError(path, systemReason(errno));
}

namespace {

std::function<void(const std::string&)> warningsTo(const std::string& subject) {
    return [subject](const std::string& message) {
        std::fflush(stdout);
        std::fprintf(stderr, "tolkatouch: %s: warning: %s\n", printableText(subject).c_str(),
                     printableText(message).c_str());
    };
}

[[noreturn]] void rethrowAsToolError(const std::string& subject) {
    try {
        throw;
    } catch (const RecordingReadError& error) {
        throw ToolError(subject, error.what(), error.detail());
    } catch (const std::system_error& error) {
        throw ToolError(subject, systemReason(error.code().value()));
    } catch (const std::exception& error) {
        throw ToolError(subject, error.what());
    }
}

}  // namespace

PipelineRecording recordingFromDocument(const std::vector<uint8_t>& document, const std::string& subject) {
    PipelineRecording recording;
    try {
        auto reader = RecordingFrameReader::fromBytes(document, warningsTo(subject));
        PipelineRecording::Frame frame;
        while (reader->next(frame)) recording.appendFrame(std::move(frame));
    } catch (...) {
        rethrowAsToolError(subject);
    }
    return recording;
}

RecordingFile::RecordingFile(const std::string& path) : _path(path) {
    try {
        _reader = RecordingFrameReader::openFile(path, warningsTo(path));
    } catch (...) {
        rethrowAsToolError(path);
    }
}

bool RecordingFile::next(PipelineRecording::Frame& frame) {
    try {
        return _reader->next(frame);
    } catch (...) {
        rethrowAsToolError(_path);
    }
}

PipelineRecording loadRecording(const std::string& path) {
    RecordingFile file(path);
    PipelineRecording recording;
    PipelineRecording::Frame frame;
    while (file.next(frame)) recording.appendFrame(std::move(frame));
    return recording;
}

}  // namespace TolkaTouch::Tools

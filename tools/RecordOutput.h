#pragma once
// RecordOutput: where `tolkatouch record` writes: one line-form recording file, or a numbered
// series of them when rotating (rec.jsonl becomes rec.0001.jsonl, rec.0002.jsonl, ...), each a
// whole recording with the header, the settings as state lines and then its reports; or standard
// output for "-". Counts the bytes written, for rotation by size and the status line.

#include <cstdint>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>

#include "pipeline/RecordingLines.h"

namespace TolkaTouch::Tools {

// --rotate: a size ("100M", "512K", "2G", bytes without a unit) or a duration ("30s", "10min", "1h").
struct Rotation {
    std::optional<uint64_t> bytes;
    std::optional<uint64_t> nanoseconds;
};
// Nothing when the text is neither.
std::optional<Rotation> rotationFromText(const std::string& text);

class RecordOutput {
public:
    // Opens the first file; ToolError naming it when it cannot be created.
    RecordOutput(std::string path, bool rotating, RecordingLinesHeader header, uint64_t startNs);
    ~RecordOutput();

    RecordingLinesWriter& writer() { return *_writer; }
    // Bytes written to the current file and in all, flushed or still in the writer's buffer.
    uint64_t fileBytes() const { return _fileBytes + bufferedBytes(); }
    uint64_t totalBytes() const { return _totalBytes + bufferedBytes(); }
    uint64_t fileStartNs() const { return _fileStartNs; }
    const std::string& currentPath() const { return _currentPath; }

    // Flushes the current file and starts the next numbered one.
    void rotate(uint64_t nowNs);
    void flush();
    // Flushes and closes; ToolError when the data could not be written.
    void close();

private:
    void open(uint64_t nowNs);
    std::string numberedPath() const;
    uint64_t bufferedBytes() const { return _writer ? _writer->bufferedBytes() : 0; }

    std::string _path;
    bool _rotating = false;
    RecordingLinesHeader _header;
    std::FILE* _file = nullptr;
    std::unique_ptr<RecordingLinesWriter> _writer;
    std::string _currentPath;
    unsigned _number = 0;
    uint64_t _fileStartNs = 0;
    uint64_t _fileBytes = 0;
    uint64_t _totalBytes = 0;
};

}  // namespace TolkaTouch::Tools

#include "pipeline/RecordingFrameReader.h"

#include <cerrno>
#include <cstring>
#include <optional>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include <simdjson.h>

#include "pipeline/RecordingDocumentReader.h"
#include "pipeline/RecordingFrameJson.h"
#include "platform/PropertyValueJson.h"

namespace TolkaTouch {

namespace {

using Frame = PipelineRecording::Frame;

constexpr size_t kChunk = 1 << 20;

RecordingReadError::Kind kindOf(const std::exception& error) {
    return dynamic_cast<const std::invalid_argument*>(&error) != nullptr ? RecordingReadError::Kind::InvalidArgument
                                                                        : RecordingReadError::Kind::Runtime;
}

bool isBlank(std::string_view line) { return line.find_first_not_of(" \t\r") == std::string_view::npos; }

}  // namespace

void RecordingReadError::rethrowPlain() const {
    if (_kind == Kind::InvalidArgument) throw std::invalid_argument(what());
    throw std::runtime_error(what());
}

// Bytes from a file descriptor or from memory, in pieces.
class RecordingFrameReader::Source {
public:
    explicit Source(int fd, bool owned) : _fd(fd), _owned(owned) {}
    explicit Source(std::vector<uint8_t> bytes) : _bytes(std::move(bytes)) {}
    ~Source() {
        if (_owned) ::close(_fd);
    }

    // Up to `capacity` bytes into `into`; 0 at the end.
    size_t read(char* into, size_t capacity) {
        if (_fd < 0) {
            const size_t count = std::min(capacity, _bytes.size() - _at);
            std::memcpy(into, _bytes.data() + _at, count);
            _at += count;
            return count;
        }
        for (;;) {
            const ssize_t count = ::read(_fd, into, capacity);
            if (count >= 0) return static_cast<size_t>(count);
            if (errno != EINTR) throw std::system_error(errno, std::generic_category());
        }
    }

private:
    int _fd = -1;
    bool _owned = false;
    std::vector<uint8_t> _bytes;
    size_t _at = 0;
};

// Reserved for reading a large document's frames as they come; documents are read whole for now.
class RecordingFrameReader::DocumentStream {};

std::unique_ptr<RecordingFrameReader> RecordingFrameReader::openFile(const std::string& path, Warning onWarning) {
    std::unique_ptr<Source> source;
    if (path == "-") {
        source = std::make_unique<Source>(STDIN_FILENO, false);
    } else {
        const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        if (fd < 0) throw std::system_error(errno, std::generic_category());
        source = std::make_unique<Source>(fd, true);
    }
    std::unique_ptr<RecordingFrameReader> reader(new RecordingFrameReader(std::move(source), std::move(onWarning)));
    reader->start();
    return reader;
}

std::unique_ptr<RecordingFrameReader> RecordingFrameReader::fromBytes(std::vector<uint8_t> bytes, Warning onWarning) {
    std::unique_ptr<RecordingFrameReader> reader(
        new RecordingFrameReader(std::make_unique<Source>(std::move(bytes)), std::move(onWarning)));
    reader->start();
    return reader;
}

RecordingFrameReader::RecordingFrameReader(std::unique_ptr<Source> source, Warning onWarning)
    : _source(std::move(source)), _onWarning(std::move(onWarning)) {}

RecordingFrameReader::~RecordingFrameReader() = default;

// Reads the first line (or the first chunk) to tell the forms apart.
void RecordingFrameReader::start() {
    _buffer.resize(kChunk + simdjson::SIMDJSON_PADDING);
    while (!_eof && _end < kChunk && std::memchr(_buffer.data(), '\n', _end) == nullptr) {
        const size_t count = _source->read(_buffer.data() + _end, kChunk - _end);
        if (count == 0) _eof = true;
        _end += count;
    }
    const auto* data = reinterpret_cast<const uint8_t*>(_buffer.data());
    if (RecordingDocumentReader::isLinesForm(data, _end)) {
        _form = Form::Lines;
        std::string_view line;
        bool complete = false;
        readLine(line, complete);
        const std::optional<PropertyValue> header =
            PropertyValueJson::parse(reinterpret_cast<const uint8_t*>(line.data()), line.size());
        const PropertyValue* version = header->find("Version");
        const std::string wrapper = "migrateSerializedContainer failed: ";
        if (version == nullptr || !version->isNumber()) {
            throw RecordingReadError(RecordingReadError::Kind::Runtime, wrapper + "invalid version", "in the header line");
        }
        if (version->toUInt64() != 1) {
            throw RecordingReadError(RecordingReadError::Kind::Runtime,
                                     wrapper + "invalid container version: " + std::to_string(version->toUInt64()),
                                     "in the header line");
        }
        _header = RecordingLinesHeader::fromJson(*header);
        return;
    }

    // The document form: the whole text, then its frames.
    std::vector<uint8_t> document(_buffer.begin(), _buffer.begin() + static_cast<long>(_end));
    std::vector<char>().swap(_buffer);
    while (!_eof) {
        const size_t at = document.size();
        document.resize(at + kChunk);
        const size_t count = _source->read(reinterpret_cast<char*>(document.data() + at), kChunk);
        document.resize(at + count);
        if (count == 0) _eof = true;
    }
    std::string detail;
    try {
        _frames = RecordingDocumentReader::read(document.data(), document.size(), detail);
    } catch (const std::exception& error) {
        throw RecordingReadError(kindOf(error), error.what(), detail);
    }
}

bool RecordingFrameReader::next(Frame& frame) {
    if (_form == Form::Lines) return nextLine(frame);
    if (_frames.empty()) return false;
    frame = std::move(_frames.front());
    _frames.pop_front();
    return true;
}

std::list<Frame> RecordingFrameReader::readAll() {
    std::list<Frame> frames;
    if (_form == Form::Document) {
        frames.swap(_frames);
        return frames;
    }
    Frame frame;
    while (nextLine(frame)) frames.push_back(std::move(frame));
    return frames;
}

// The next line, without its newline, from the buffer; reads more as needed. `complete` is
// false for a last line that has no newline. False at the end.
bool RecordingFrameReader::readLine(std::string_view& line, bool& complete) {
    size_t scanned = _begin;
    for (;;) {
        if (const void* newline = std::memchr(_buffer.data() + scanned, '\n', _end - scanned)) {
            const size_t at = static_cast<size_t>(static_cast<const char*>(newline) - _buffer.data());
            line = std::string_view(_buffer.data() + _begin, at - _begin);
            _begin = at + 1;
            complete = true;
            ++_lineNumber;
            return true;
        }
        scanned = _end;
        if (_eof) {
            if (_begin == _end) return false;
            line = std::string_view(_buffer.data() + _begin, _end - _begin);
            _begin = _end;
            complete = false;
            ++_lineNumber;
            return true;
        }
        // Keep the unfinished line, at the front; grow when one line fills the buffer.
        if (_begin > 0) {
            std::memmove(_buffer.data(), _buffer.data() + _begin, _end - _begin);
            _end -= _begin;
            scanned -= _begin;
            _begin = 0;
        }
        const size_t capacity = _buffer.size() - simdjson::SIMDJSON_PADDING;
        if (_end == capacity) _buffer.resize(2 * capacity + simdjson::SIMDJSON_PADDING);
        const size_t count = _source->read(_buffer.data() + _end, _buffer.size() - simdjson::SIMDJSON_PADDING - _end);
        if (count == 0) _eof = true;
        _end += count;
    }
}

bool RecordingFrameReader::nextLine(Frame& frame) {
    static thread_local simdjson::ondemand::parser parser;
    std::string_view line;
    bool complete = false;
    for (;;) {
        if (!readLine(line, complete)) return false;
        if (isBlank(line)) continue;

        // The buffer holds simdjson's padding after every line.
        const size_t room = _buffer.size() - static_cast<size_t>(line.data() - _buffer.data());
        simdjson::ondemand::document document;
        simdjson::ondemand::object object;
        std::string event;
        RecordingFrameJson::Read read = RecordingFrameJson::Read::Undecided;
        if (!parser.iterate(simdjson::padded_string_view(line.data(), line.size(), room)).get(document) &&
            !document.get_object().get(object)) {
            read = RecordingFrameJson::readFrame(object, frame, &event);
            if (read != RecordingFrameJson::Read::Undecided && !RecordingFrameJson::atEnd(document)) read = RecordingFrameJson::Read::Undecided;
        }
        if (read == RecordingFrameJson::Read::Frame) return true;
        if (read == RecordingFrameJson::Read::Event) {
            _events.push_back(Event{frame.timestamp, std::move(event)});
            continue;
        }

        // Undecided: the general reader, on the line as a one-frame document, decides.
        const auto* bytes = reinterpret_cast<const uint8_t*>(line.data());
        const RecordingDocumentReader::SyntaxProblem problem = RecordingDocumentReader::findSyntaxProblem(bytes, line.size());
        const std::string where = "line " + std::to_string(_lineNumber);
        if (!problem.reason.empty()) {
            if (!complete) {
                if (_onWarning) {
                    _onWarning("the last line (" + where + ") is cut off and is left out: " + problem.reason);
                }
                return false;
            }
            const std::string at = problem.offset ? where + ", column " + std::to_string(*problem.offset + 1) : where;
            throw RecordingReadError(RecordingReadError::Kind::Runtime, "migrateSerializedContainer failed: invalid container",
                                     at + ": " + problem.reason);
        }
        const std::optional<PropertyValue> parsed = PropertyValueJson::parse(bytes, line.size());
        if (const PropertyValue* type = parsed ? parsed->find("Type") : nullptr;
            type != nullptr && type->isString() && *type->string() == "Event") {
            throw RecordingReadError(RecordingReadError::Kind::InvalidArgument, "invalid event",
                                     where + ": an event line needs a number \"Timestamp\" and an object \"Event\"");
        }
        std::string wrapped = "{\"Version\":1,\"Frames\":[";
        wrapped.append(line).append("]}");
        try {
            std::list<Frame> frames =
                RecordingDocumentReader::readGeneral(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
            if (frames.size() != 1) continue;
            frame = std::move(frames.front());
            return true;
        } catch (const std::exception& error) {
            throw RecordingReadError(kindOf(error), error.what(), where);
        }
    }
}

}  // namespace TolkaTouch

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
// Read as it comes: the pieces, and so the windows, are this long (a longer line or frame grows them).
constexpr size_t kSmallChunk = 64 << 10;
// Documents up to this size are read whole (unless read as they come); longer ones as their
// frames are asked for.
constexpr size_t kWholeDocument = 8 << 20;

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
            if (count == 0) return 0;  // an empty vector's data() may be null, which memcpy may not take
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

// A large document's frames as they come, with memory bounded by the longest stretch of text
// without a line end. The text is parsed a window at a time: a window runs from one frame to the
// last line end read so far (no string can hold a raw line end, so a window never cuts a token),
// with the byte before its first frame made a '[' so that simdjson sees an array. A frame that does
// not read in the window is looked at alone: cut off by the window's end, the window moves on to
// it; complete, the general reader decides it, as it does for a whole document.
class RecordingFrameReader::DocumentStream {
public:
    // `buffer` holds `end` bytes of the document (with simdjson's padding after its capacity), the
    // frames' array opening at `arrayStart`.
    DocumentStream(Source& source, std::vector<char> buffer, size_t end, size_t arrayStart)
        : _source(source), _buffer(std::move(buffer)), _end(end), _pos(arrayStart + 1) {}

    bool next(Frame& frame) {
        for (;;) {
            if (_done) return false;
            if (!_windowOpen) {
                size_t start = frameStart();
                if (_buffer[start] == ']') {
                    if (_afterComma) syntaxError(start, "a comma before the end of the frames");
                    finish(start + 1);
                    return false;
                }
                if (!openWindow(start)) return decideAlone(start, frame);
            }
            if (_iterator != _iteratorEnd) {
                simdjson::ondemand::value element;
                simdjson::ondemand::object object;
                if (!(*_iterator).get(element) && !element.get_object().get(object) &&
                    RecordingFrameJson::readFrame(object, frame) == RecordingFrameJson::Read::Frame) {
                    const char* after = nullptr;
                    if (_document.current_location().get(after)) after = _buffer.data() + _cut;
                    _pos = static_cast<size_t>(after - _buffer.data());
                    _expectComma = true;
                    _afterComma = false;
                    _progress = true;
                    ++_iterator;
                    ++_frameCount;
                    return true;
                }
            }
            // The window is used up, or a frame in it did not read: the frame alone decides.
            closeWindow();
            if (_progress) continue;
            return decideAlone(frameStart(), frame);
        }
    }

private:
    static bool isSpace(char c) { return c == ' ' || c == '\n' || c == '\r' || c == '\t'; }

    [[noreturn]] void syntaxError(size_t at, const std::string& reason) const {
        throw RecordingReadError(RecordingReadError::Kind::Runtime, "migrateSerializedContainer failed: invalid container",
                                 "byte " + std::to_string(_offset + at) + ": " + reason);
    }

    // Where the next frame (or the array's end) starts: past white space and the comma after the
    // last frame read. Reads on as needed.
    size_t frameStart() {
        for (;;) {
            while (_pos < _end && isSpace(_buffer[_pos])) ++_pos;
            if (_pos == _end) {
                if (_eof) syntaxError(_pos, "the document ends inside the frames");
                keepFrom(_pos);
                continue;
            }
            if (_expectComma) {
                if (_buffer[_pos] == ']') return _pos;
                if (_buffer[_pos] != ',') syntaxError(_pos, "a frame is not followed by a comma");
                ++_pos;
                _expectComma = false;
                _afterComma = true;
                continue;
            }
            return _pos;
        }
    }

    // Keeps the text from `start` and the one byte before it (the window's '['); reads more.
    void keepFrom(size_t start) {
        const size_t keep = start - 1;
        if (keep > 0) {
            std::memmove(_buffer.data(), _buffer.data() + keep, _end - keep);
            _offset += keep;
            _end -= keep;
            _pos -= keep;
        } else if (_end == _buffer.size() - simdjson::SIMDJSON_PADDING) {
            // A stretch without line ends as long as the buffer: the buffer grows for it.
            _buffer.resize(2 * (_buffer.size() - simdjson::SIMDJSON_PADDING) + simdjson::SIMDJSON_PADDING);
        }
        while (!_eof && _end < _buffer.size() - simdjson::SIMDJSON_PADDING) {
            const size_t count = _source.read(_buffer.data() + _end, _buffer.size() - simdjson::SIMDJSON_PADDING - _end);
            if (count == 0) _eof = true;
            _end += count;
        }
    }

    // A window from the frame at `start` to the last line end read, that line end made the
    // array's closing ']' (simdjson wants the array closed; the byte is put back when the window
    // closes). False when there is no such window (the frame alone then decides).
    bool openWindow(size_t& start) {
        // Windows start at the buffer's front, so that each is as long as the buffer allows.
        if (start > 1 && !_eof) {
            keepFrom(start);
            start = 1;
        }
        const void* last = nullptr;
        for (;;) {
            last = memrchr(_buffer.data() + start, '\n', _end - start);
            if (last != nullptr || _eof) break;
            keepFrom(start);
            start = 1;
        }
        if (last == nullptr) return false;
        const size_t cut = static_cast<size_t>(static_cast<const char*>(last) - _buffer.data()) + 1;
        _cut = cut;
        _buffer[start - 1] = '[';
        _buffer[cut - 1] = ']';
        _progress = false;
        _windowOpen = true;
        const simdjson::padded_string_view text(_buffer.data() + start - 1, cut - start + 1, _buffer.size() - start + 1);
        if (_parser.iterate(text).get(_document) || _document.get_array().get(_array) ||
            _array.begin().get(_iterator) || _array.end().get(_iteratorEnd)) {
            closeWindow();
            return false;
        }
        return true;
    }

    void closeWindow() {
        if (!_windowOpen) return;
        _buffer[_cut - 1] = '\n';
        _windowOpen = false;
    }

    // One frame that no window could read: complete, the general reader decides it, as it does
    // frames of a whole document; cut off by the end of the document, it is a syntax error.
    bool decideAlone(size_t start, Frame& frame) {
        size_t end = valueEnd(start);
        while (end == 0) {
            keepFrom(start);
            start = 1;
            end = valueEnd(start);
        }
        const std::string where = "in frame " + std::to_string(_frameCount + 1) + ", at byte " + std::to_string(_offset + start);
        std::string wrapped = "{\"Version\":1,\"Frames\":[";
        wrapped.append(_buffer.data() + start, end - start).append("]}");
        std::list<Frame> frames;
        try {
            frames = RecordingDocumentReader::readGeneral(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
        } catch (const std::exception& error) {
            std::string detail = where;
            const auto problem =
                RecordingDocumentReader::findSyntaxProblem(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
            if (!problem.reason.empty()) detail += ": " + problem.reason;
            throw RecordingReadError(kindOf(error), error.what(), detail);
        }
        _pos = end;
        _expectComma = true;
        _afterComma = false;
        ++_frameCount;
        if (frames.size() != 1) syntaxError(start, "a frame is not one value");
        frame = std::move(frames.front());
        return true;
    }

    // One past the end of the value at `start`, found by brackets and quotes alone (the general
    // reader judges the value afterwards); 0 when the buffer ends first and there is more to read.
    size_t valueEnd(size_t start) const {
        size_t depth = 0;
        for (size_t at = start; at < _end; ++at) {
            const char c = _buffer[at];
            if (c == '"') {
                for (++at; at < _end && _buffer[at] != '"'; ++at) {
                    if (_buffer[at] == '\\') ++at;
                }
                if (at >= _end) break;
                if (depth == 0) return at + 1;
            } else if (c == '{' || c == '[') {
                ++depth;
            } else if (c == '}' || c == ']') {
                if (depth <= 1) return depth == 0 ? at : at + 1;
                --depth;
            } else if (depth == 0 && (c == ',' || isSpace(c))) {
                return at;
            }
        }
        return _eof ? _end : 0;
    }

    // After the array: the rest must close the document, as the whole reader would see it.
    void finish(size_t after) {
        _done = true;
        std::string tail(_buffer.data() + after, _end - after);
        constexpr size_t kLongestTail = 1 << 20;
        while (!_eof && tail.size() <= kLongestTail) {
            char piece[65536];
            const size_t count = _source.read(piece, sizeof piece);
            if (count == 0) _eof = true;
            tail.append(piece, count);
        }
        const size_t first = tail.find_first_not_of(" \n\r\t");
        if (first != std::string::npos && tail[first] == '}' &&
            tail.find_first_not_of(" \n\r\t", first + 1) == std::string::npos) {
            return;
        }
        // Members after the frames, or text that is not JSON: the general reader decides.
        const std::string rest = "{\"Version\":1,\"Frames\":[]" + tail;
        try {
            RecordingDocumentReader::readGeneral(reinterpret_cast<const uint8_t*>(rest.data()), rest.size());
        } catch (const std::exception& error) {
            throw RecordingReadError(kindOf(error), error.what(), "after the frames, at byte " + std::to_string(_offset + after));
        }
    }

    Source& _source;
    std::vector<char> _buffer;
    size_t _end = 0;
    size_t _offset = 0;  // the document offset of _buffer[0]
    size_t _pos = 0;     // where the text not yet read as frames starts
    size_t _cut = 0;     // the open window's end
    bool _expectComma = false;
    bool _afterComma = false;
    bool _eof = false;
    bool _done = false;
    bool _windowOpen = false;
    bool _progress = false;  // the open window gave a frame
    uint64_t _frameCount = 0;
    simdjson::ondemand::parser _parser;
    simdjson::ondemand::document _document;
    simdjson::ondemand::array _array;
    simdjson::ondemand::array_iterator _iterator;
    simdjson::ondemand::array_iterator _iteratorEnd;
};

namespace {

// The opening the writer makes, in any spacing: {"Version": 1, "Frames": [ ; the index of the
// '[', or 0 when the document opens otherwise (it is then read whole).
size_t framesArrayStart(const char* text, size_t size) {
    size_t at = 0;
    const auto space = [&] {
        while (at < size && (text[at] == ' ' || text[at] == '\n' || text[at] == '\r' || text[at] == '\t')) ++at;
    };
    const auto literal = [&](std::string_view word) {
        space();
        if (size - at < word.size() || std::string_view(text + at, word.size()) != word) return false;
        at += word.size();
        return true;
    };
    if (!literal("{") || !literal("\"Version\"") || !literal(":") || !literal("1") || !literal(",") ||
        !literal("\"Frames\"") || !literal(":") || !literal("[")) {
        return 0;
    }
    return at - 1;
}

}  // namespace

std::unique_ptr<RecordingFrameReader> RecordingFrameReader::openFile(const std::string& path, Warning onWarning,
                                                                    Reading reading) {
    std::unique_ptr<Source> source;
    if (path == "-") {
        source = std::make_unique<Source>(STDIN_FILENO, false);
    } else {
        const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        if (fd < 0) throw std::system_error(errno, std::generic_category());
        source = std::make_unique<Source>(fd, true);
    }
    std::unique_ptr<RecordingFrameReader> reader(new RecordingFrameReader(std::move(source), std::move(onWarning)));
    reader->start(reading);
    return reader;
}

std::unique_ptr<RecordingFrameReader> RecordingFrameReader::fromBytes(std::vector<uint8_t> bytes, Warning onWarning,
                                                                     Reading reading) {
    std::unique_ptr<RecordingFrameReader> reader(
        new RecordingFrameReader(std::make_unique<Source>(std::move(bytes)), std::move(onWarning)));
    reader->start(reading);
    return reader;
}

RecordingFrameReader::RecordingFrameReader(std::unique_ptr<Source> source, Warning onWarning)
    : _source(std::move(source)), _onWarning(std::move(onWarning)) {}

RecordingFrameReader::~RecordingFrameReader() = default;

// Reads the first line (or the first chunk) to tell the forms apart.
void RecordingFrameReader::start(Reading reading) {
    const size_t chunk = reading == Reading::AsItComes ? kSmallChunk : kChunk;
    _buffer.resize(chunk + simdjson::SIMDJSON_PADDING);
    while (!_eof && _end < chunk && std::memchr(_buffer.data(), '\n', _end) == nullptr) {
        const size_t count = _source->read(_buffer.data() + _end, chunk - _end);
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

    // The document form. Up to kWholeDocument it is read whole, so an error anywhere in it is
    // found before any frame is handed out; a longer one in the writer's layout is read as it is
    // asked for, and so is any one read as it comes, however short (its first piece shows the layout).
    const size_t whole = reading == Reading::AsItComes ? chunk : kWholeDocument;
    while (!_eof && _end < whole) {
        if (_end == _buffer.size() - simdjson::SIMDJSON_PADDING) _buffer.resize(2 * _end + simdjson::SIMDJSON_PADDING);
        const size_t count = _source->read(_buffer.data() + _end, _buffer.size() - simdjson::SIMDJSON_PADDING - _end);
        if (count == 0) _eof = true;
        _end += count;
    }
    if (!_eof || reading == Reading::AsItComes) {
        if (const size_t arrayStart = framesArrayStart(_buffer.data(), _end); arrayStart != 0) {
            _stream = std::make_unique<DocumentStream>(*_source, std::move(_buffer), _end, arrayStart);
            return;
        }
    }
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
    if (_stream) return _stream->next(frame);
    if (_frames.empty()) return false;
    frame = std::move(_frames.front());
    _frames.pop_front();
    return true;
}

std::list<Frame> RecordingFrameReader::readAll() {
    std::list<Frame> frames;
    if (_form == Form::Document && !_stream) {
        frames.swap(_frames);
        return frames;
    }
    Frame frame;
    while (next(frame)) frames.push_back(std::move(frame));
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

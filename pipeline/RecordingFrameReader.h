#pragma once
// RecordingFrameReader: the frames of a recording one at a time, from a file, standard input or
// bytes, in either form (the JSON document or the line-per-report form, told apart by the
// header line's "Format":"lines"). Replay, show, convert and the daemon's feeder read through it.
//
// How much is read ahead is the caller's choice (Reading): a document up to 8 MB whole, so that an
// error anywhere in it is found before the first frame is handed out, or every document in the
// writer's layout a frame at a time through a 64 KB window, however short, so that memory does not
// grow with the document and the first frame comes at once (another layout is still read whole).
//
// The line form is read a line at a time. A last line without its newline that does not parse
// (a recording cut off by a crash) is dropped with a warning; every complete line before it is
// read. "Event" lines are kept apart (events()) for tools that compare, never played.

#include <cstdint>
#include <functional>
#include <list>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingLines.h"

namespace TolkaTouch {

// A reading's error: what() is the reader's message ("invalid frame type", ...), kind() the kind
// the recording's own reader raises it as, detail() the parser's reason and the position.
class RecordingReadError : public std::runtime_error {
public:
    enum class Kind { InvalidArgument, Runtime };
    RecordingReadError(Kind kind, const std::string& message, std::string detail)
        : std::runtime_error(message), _kind(kind), _detail(std::move(detail)) {}
    Kind kind() const { return _kind; }
    const std::string& detail() const { return _detail; }
    // Throws the error as the recording's reader raises it (std::invalid_argument or std::runtime_error).
    [[noreturn]] void rethrowPlain() const;

private:
    Kind _kind;
    std::string _detail;
};

class RecordingFrameReader {
public:
    enum class Form { Document, Lines };
    struct Event {
        uint64_t timestamp = 0;
        std::string json;  // the event object's JSON text
    };
    enum class Reading {
        WholeWhenSmall,  // documents up to 8 MB are checked whole before their first frame
        AsItComes,       // a frame at a time from the start, in small pieces
    };
    using Warning = std::function<void(const std::string& message)>;

    // "-" reads standard input. Throws std::system_error when the file cannot be opened or read.
    static std::unique_ptr<RecordingFrameReader> openFile(const std::string& path, Warning onWarning = {},
                                                          Reading reading = Reading::WholeWhenSmall);
    static std::unique_ptr<RecordingFrameReader> fromBytes(std::vector<uint8_t> bytes, Warning onWarning = {},
                                                           Reading reading = Reading::WholeWhenSmall);
    ~RecordingFrameReader();
    RecordingFrameReader(const RecordingFrameReader&) = delete;
    RecordingFrameReader& operator=(const RecordingFrameReader&) = delete;

    Form form() const { return _form; }
    // The line form's header; empty for a document.
    const RecordingLinesHeader& header() const { return _header; }
    // The next frame into `frame`; false at the end. Throws RecordingReadError for a frame that
    // does not read, std::system_error when reading fails.
    bool next(PipelineRecording::Frame& frame);
    // The "Event" lines read so far.
    const std::vector<Event>& events() const { return _events; }

    // Every frame that is left.
    std::list<PipelineRecording::Frame> readAll();

private:
    class Source;
    class DocumentStream;
    RecordingFrameReader(std::unique_ptr<Source> source, Warning onWarning);
    void start(Reading reading);
    bool nextLine(PipelineRecording::Frame& frame);
    bool readLine(std::string_view& line, bool& complete);

    std::unique_ptr<Source> _source;
    Warning _onWarning;
    Form _form = Form::Document;
    RecordingLinesHeader _header;
    std::vector<Event> _events;
    // The document form: frames read whole, or a stream of its "Frames" array.
    std::list<PipelineRecording::Frame> _frames;
    std::unique_ptr<DocumentStream> _stream;
    // The line form: the buffer (with simdjson's padding after its end) and the line count.
    std::vector<char> _buffer;
    size_t _begin = 0;
    size_t _end = 0;
    bool _eof = false;
    uint64_t _lineNumber = 0;
};

}  // namespace TolkaTouch

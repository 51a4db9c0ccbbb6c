#pragma once
// The line-per-report form of a recording: a header line, then one compact frame object per
// line, so a recording can be written while it happens (a crash loses at most the line being
// written) and read a line at a time. RecordingLinesWriter writes it; RecordingFrameReader
// reads it and the document form alike.
//
//   {"Version":1,"Format":"lines","Device":{...},"Settings":{...},"Recorder":{...}}
//   {"Type":"State","Timestamp":1000,"Key":"Algs.HoldTimeoutMilliseconds","Value":400}
//   {"Type":"InputReport","Timestamp":2000,"Report":"01 05 00 ","WallTime":1795000000000000000}
//   {"Type":"Event","Timestamp":2000,"Event":{...}}
//
// "WallTime" (wall-clock nanoseconds since the epoch) and "Event" lines are optional; readers
// ignore header members they do not know.

#include <cstdint>
#include <cstdio>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

struct RecordingLinesHeader {
    struct Device {
        uint32_t vendorId = 0;
        uint32_t productId = 0;
        std::vector<uint8_t> reportDescriptor;
        std::map<uint32_t, std::vector<uint8_t>> featureReports;  // report id → bytes
    };
    std::optional<Device> device;
    std::map<std::string, PropertyValue> settings;  // full state keys, "Algs.HoldTimeoutMilliseconds"
    std::map<std::string, std::string> recorder;    // free text: program version, start time, ...

    // The header line's JSON text, without the newline.
    std::string jsonLine() const;
    // The header of a parsed header line; members of the wrong kind are left out.
    static RecordingLinesHeader fromJson(const PropertyValue& header);
};

// Writes the line form to a sink. Lines collect in a small buffer that goes to the sink when
// flush() is called or the buffer fills; frames are never kept beyond that.
class RecordingLinesWriter {
public:
    using Sink = std::function<void(std::string_view bytes)>;

    // Writes the header line at once (into the buffer).
    RecordingLinesWriter(Sink sink, const RecordingLinesHeader& header);
    // A sink that writes to a stdio stream and flushes it; throws std::system_error on failure.
    static Sink fileSink(std::FILE* file);
    ~RecordingLinesWriter();  // flushes; errors then are dropped
    RecordingLinesWriter(const RecordingLinesWriter&) = delete;
    RecordingLinesWriter& operator=(const RecordingLinesWriter&) = delete;

    void writeFrame(const PipelineRecording::Frame& frame);
    void writeInputReport(uint64_t timestamp, const uint8_t* bytes, size_t length,
                          std::optional<uint64_t> wallTime = std::nullopt);
    void writeState(uint64_t timestamp, const std::string& key, const std::optional<PropertyValue>& value);
    // `eventJson` is one JSON object on one line (the form replay --json prints).
    void writeEvent(uint64_t timestamp, std::string_view eventJson);
    void flush();
    // Bytes written but still in the buffer, not yet given to the sink.
    size_t bufferedBytes() const { return _buffer.size(); }

private:
    void endLine();

    Sink _sink;
    std::string _buffer;
};

}  // namespace TolkaTouch

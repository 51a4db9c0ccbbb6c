#pragma once
// PipelineRecording: stands in front of the pipeline, keeps a bounded history of the reports and
// settings that pass through it, and forwards each call unchanged. The history can be written as
// a JSON document, rebuilt from one, and played back into a pipeline at a chosen speed.
//
// Public API (single-threaded; the owner serialises every call with its pipeline lock):
//   PipelineRecording();                                        // no pipeline, no frames, no bound
//   explicit PipelineRecording(const std::vector<uint8_t>* data); // from a document; nullptr = none;
//                                                               // throws std::invalid_argument / std::runtime_error
//   copy and move: a copy shares `pipeline`, `clock` and the frame values, duplicates the frame
//   list, the bound and the playback cursor.
//   std::shared_ptr<PipelineInput> pipeline;                     // where calls are forwarded; may be empty
//   HostClock clock;                                             // host clock reading and sleep; tests replace it
//   void setTime(uint64_t ticks);                                // ignored: the recording reads its own clock
//   void setState(const std::string& key, PropertyValue value);  // record a State frame, forward
//   void handleInputReport(const uint8_t* bytes, size_t length); // record an InputReport frame, forward
//   void appendFrame(Frame frame) noexcept;                      // append, trim at twice the bound, end playback
//                                                               // (frames the bound drops are kept as room for
//                                                               // later reports: a report allocates nothing then)
//   static void trimFrames(std::list<Frame>& frames, uint64_t maxInputReports);
//   void setMaxFrameCount(uint64_t count);                       // 0 = no bound; trims at once otherwise
//   uint64_t maxFrameCount() const;  const std::list<Frame>& frames() const;
//   std::vector<uint8_t> json();                                 // trims, then the pretty-printed UTF-8 document
//   static PropertyValue migrateSerializedContainer(const std::optional<PropertyValue>& container);
//   static std::list<Frame> framesFromContainer(const PropertyValue& container); // a version-1 container's frames
//   void playReset();  bool playCanContinue() const;  void playNextFrame(float speed); // throws std::runtime_error
//   void playFrame(const Frame& frame, float speed);            // after playReset: one frame from elsewhere
//
// Document (version 1), timestamps in host clock nanoseconds:
//   { "Version": 1, "Frames": [ { "Type": "State", "Timestamp": 1000, "Key": "Algs.HoldTimeoutMilliseconds",
//     "Value": 400 }, { "Type": "InputReport", "Timestamp": 2000, "Report": "01 05 00 00 00 ... " } ] }
// A state value of byte data, which JSON cannot hold, is written as its hex text. The older
// version 0 ({ "Version": 0, "Reports": [ { "Timestamp": ..., "ReportData": "..." } ] }) is read
// and migrated, never written. json() returns the document's bytes, the same form the reading
// constructor takes; since it trims the recording, the service calls it on a copy made under its
// lock. A state frame without a value (only documents have those) is replayed as null.
//
// Typical owner: recording.pipeline = pipeline; recording.setMaxFrameCount(1350); then every
// report and "Pipeline." setting goes to the recording instead of the pipeline.

#include <cstddef>
#include <cstdint>
#include <list>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "pipeline/PipelineInput.h"
#include "platform/HostClock.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

class PipelineRecording final : public PipelineInput {
public:
    enum class FrameType : uint32_t {
        State = 0,        // a key and a value were set
        InputReport = 1,  // one raw input report from the device
    };

    // One recorded call. `value` is absent for input reports, and for a state frame read from a
    // document without a "Value"; a value of the null kind is a value, not an absence.
    struct Frame {
        FrameType type = FrameType::State;
        uint64_t timestamp = 0;  // host clock nanoseconds
        std::string key;         // full state key, domain included; empty for input reports
        std::optional<PropertyValue> value;
        std::vector<uint8_t> report;  // the report bytes; empty for state frames

        static Frame state(uint64_t timestamp, std::string key, std::optional<PropertyValue> value);
        static Frame inputReport(uint64_t timestamp, std::vector<uint8_t> report);
    };

    PipelineRecording() = default;
    explicit PipelineRecording(const std::vector<uint8_t>* data);
    PipelineRecording(const PipelineRecording& other);
    PipelineRecording& operator=(const PipelineRecording& other);
    PipelineRecording(PipelineRecording&& other) noexcept;
    PipelineRecording& operator=(PipelineRecording&& other) noexcept;
    ~PipelineRecording() = default;

    // PipelineInput
    void setTime(uint64_t time) override;
    void setState(const std::string& key, PropertyValue value) override;
    void handleInputReport(const uint8_t* bytes, size_t length) override;

    // Appends and enforces the bound; ends a playback in progress. Out of memory is fatal.
    void appendFrame(Frame frame) noexcept;
    // Keeps the newest maxInputReports input reports and, before each kept report and before the
    // oldest one, only the newest State frame of each key; order is kept.
    static void trimFrames(std::list<Frame>& frames, uint64_t maxInputReports);
    void setMaxFrameCount(uint64_t count);
    uint64_t maxFrameCount() const { return _maxFrameCount; }
    const std::list<Frame>& frames() const { return _frames; }

    // Document (PipelineRecordingDocument.cpp).
    std::vector<uint8_t> json();
    static PropertyValue migrateSerializedContainer(const std::optional<PropertyValue>& container);
    static std::list<Frame> framesFromContainer(const PropertyValue& container);

    // Playback (PipelineRecordingPlayback.cpp).
    void playReset();
    bool playCanContinue() const;
    void playNextFrame(float speed);
    // Plays a frame that is not in the list (one a reader hands out), paced and timed as if it
    // were the list's next: the first frame played after playReset sets the replay clock's origin.
    // A recording that streams its frames this way keeps none of them.
    void playFrame(const Frame& frame, float speed);

    std::shared_ptr<PipelineInput> pipeline;
    HostClock clock;

private:
    struct PlayCursor {
        bool valid = false;
        std::list<Frame>::iterator iterator;  // next frame to deliver
        uint64_t startTimeMach = 0;           // host clock ticks at playReset: the replay clock's origin
        std::optional<uint64_t> lastInputReportTimeNs;
        std::optional<uint64_t> firstTimestampNs;  // the first played frame's: the recorded clock's origin
    };

    void recordState(uint64_t timestamp, const std::string& key, const PropertyValue& value) noexcept;
    void recordInputReport(uint64_t timestamp, const uint8_t* bytes, size_t length) noexcept;
    // Frames dropped go to the end of `dropped` while it holds fewer than `spareAtMost`, else are freed.
    static void trimFrames(std::list<Frame>& frames, uint64_t maxInputReports, std::list<Frame>::iterator* cursor,
                           std::list<Frame>* dropped = nullptr, size_t spareAtMost = 0);
    void trim(uint64_t maxInputReports);
    void appended() noexcept;
    void adoptCursor(const PlayCursor& cursor, const std::list<Frame>& from);
    void deliver(const Frame& frame, float speed);

    std::list<Frame> _frames;
    // Frames the bound dropped, at most as many as the bound: their list nodes and report storage
    // are taken by the next input reports, so that a report thread allocates nothing for them.
    // Not part of the recording: copies and moves leave it.
    std::list<Frame> _spare;
    uint64_t _maxFrameCount = 0;  // input reports to keep; 0 = no bound
    PlayCursor _play{false, _frames.end(), 0, std::nullopt, std::nullopt};
};

}  // namespace TolkaTouch

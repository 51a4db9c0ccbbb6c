#include "pipeline/PipelineRecording.h"

#include <iterator>
#include <unordered_set>
#include <utility>

#include "common/Util.h"

namespace TolkaTouch {

PipelineRecording::Frame PipelineRecording::Frame::state(uint64_t timestamp, std::string key,
                                                         std::optional<PropertyValue> value) {
    return Frame{FrameType::State, timestamp, std::move(key), std::move(value), {}};
}

PipelineRecording::Frame PipelineRecording::Frame::inputReport(uint64_t timestamp, std::vector<uint8_t> report) {
    return Frame{FrameType::InputReport, timestamp, {}, std::nullopt, std::move(report)};
}

// A copy duplicates the list, so the playback cursor is carried over by position.
PipelineRecording::PipelineRecording(const PipelineRecording& other)
    : PipelineInput(other),
      pipeline(other.pipeline),
      clock(other.clock),
      _frames(other._frames),
      _maxFrameCount(other._maxFrameCount) {
    adoptCursor(other._play, other._frames);
}

PipelineRecording& PipelineRecording::operator=(const PipelineRecording& other) {
    if (this == &other) return *this;
    pipeline = other.pipeline;
    clock = other.clock;
    _frames = other._frames;
    _maxFrameCount = other._maxFrameCount;
    adoptCursor(other._play, other._frames);
    return *this;
}

PipelineRecording::PipelineRecording(PipelineRecording&& other) noexcept : PipelineInput(other) {
    *this = std::move(other);
}

// Moving a list keeps iterators to its elements valid, but not its end.
PipelineRecording& PipelineRecording::operator=(PipelineRecording&& other) noexcept {
    if (this == &other) return *this;
    pipeline = std::move(other.pipeline);
    clock = std::move(other.clock);
    _maxFrameCount = other._maxFrameCount;
    const bool atEnd = other._play.iterator == other._frames.end();
    _frames = std::move(other._frames);
    _play = other._play;
    if (atEnd || !_play.valid) _play.iterator = _frames.end();
    other._frames.clear();
    other._play = PlayCursor{false, other._frames.end(), 0, std::nullopt, std::nullopt};
    return *this;
}

void PipelineRecording::adoptCursor(const PlayCursor& cursor, const std::list<Frame>& from) {
    _play = PlayCursor{cursor.valid, _frames.end(), cursor.startTimeMach, cursor.lastInputReportTimeNs,
                       cursor.firstTimestampNs};
    // An inactive cursor may point at a frame that trimming has since removed; only an active
    // one is guaranteed to point into the list.
    if (!cursor.valid) return;
    const auto position = std::distance(from.begin(), std::list<Frame>::const_iterator(cursor.iterator));
    _play.iterator = std::next(_frames.begin(), position);
}

void PipelineRecording::setTime(uint64_t) {
    // The recording stamps frames with its own clock reading and passes that on instead.
}

void PipelineRecording::setState(const std::string& key, PropertyValue value) {
    const uint64_t ticks = clock.now();
    recordState(Util::nanosecondsFromMachTime(ticks), key, value);
    if (pipeline) {
        pipeline->setTime(ticks);
        pipeline->setState(key, std::move(value));
    }
}

void PipelineRecording::handleInputReport(const uint8_t* bytes, size_t length) {
    const uint64_t ticks = clock.now();
    // Recorded before the pipeline sees it, so a report that upsets the pipeline is kept.
    recordInputReport(Util::nanosecondsFromMachTime(ticks), bytes, length);
    if (pipeline) {
        pipeline->setTime(ticks);
        pipeline->handleInputReport(bytes, length);
    }
}

// Recording runs on the report thread with nobody to hand an error to: running out of memory
// here ends the process (these functions are noexcept) rather than losing frames quietly.
void PipelineRecording::recordState(uint64_t timestamp, const std::string& key, const PropertyValue& value) noexcept {
    appendFrame(Frame::state(timestamp, key, value));
}

void PipelineRecording::recordInputReport(uint64_t timestamp, const uint8_t* bytes, size_t length) noexcept {
    if (_spare.empty()) {
        std::vector<uint8_t> report;
        if (length > 0) report.assign(bytes, bytes + length);
        appendFrame(Frame::inputReport(timestamp, std::move(report)));
        return;
    }
    // A dropped frame's node and report storage, made over into this report.
    _frames.splice(_frames.end(), _spare, _spare.begin());
    Frame& frame = _frames.back();
    frame.type = FrameType::InputReport;
    frame.timestamp = timestamp;
    frame.key.clear();
    frame.value.reset();
    frame.report.assign(bytes, bytes + (length > 0 ? length : 0));
    appended();
}

void PipelineRecording::appendFrame(Frame frame) noexcept {
    _frames.push_back(std::move(frame));
    appended();
}

void PipelineRecording::appended() noexcept {
    // Trimming waits until the list holds twice the bound, so its cost is paid once per
    // _maxFrameCount frames, not on every report.
    if (_maxFrameCount != 0 && _frames.size() / 2 >= _maxFrameCount) trim(_maxFrameCount);
    _play.valid = false;
}

void PipelineRecording::setMaxFrameCount(uint64_t count) {
    _maxFrameCount = count;
    if (count != 0) trim(count);
}

void PipelineRecording::trim(uint64_t maxInputReports) {
    trimFrames(_frames, maxInputReports, &_play.iterator, &_spare, static_cast<size_t>(_maxFrameCount));
}

void PipelineRecording::trimFrames(std::list<Frame>& frames, uint64_t maxInputReports) {
    trimFrames(frames, maxInputReports, nullptr);
}

// Walks from the newest frame back. A kept input report opens a new stretch (the key set is
// cleared); within a stretch only the newest State frame of each key survives. Reports beyond the
// bound are dropped without clearing the set, so everything older than the oldest kept report is
// one stretch: one State frame per key, the newest, which restores the settings in force.
void PipelineRecording::trimFrames(std::list<Frame>& frames, uint64_t maxInputReports,
                                   std::list<Frame>::iterator* cursor, std::list<Frame>* dropped, size_t spareAtMost) {
    if (frames.empty()) return;
    std::unordered_set<std::string> keys;
    uint64_t keptReports = 0;
    auto it = frames.end();
    while (it != frames.begin()) {
        --it;
        bool keep = true;
        switch (it->type) {
        case FrameType::InputReport:
            if (keptReports < maxInputReports) {
                ++keptReports;
                keys.clear();
            } else {
                keep = false;
            }
            break;
        case FrameType::State:
            keep = keys.insert(it->key).second;
            break;
        default:
            break;
        }
        if (keep) continue;
        // Everything after this frame is decided already, so its successor is the next frame
        // that survives: a playback cursor on the removed frame moves there.
        const bool cursorHere = cursor != nullptr && *cursor == it;
        if (dropped != nullptr && dropped->size() < spareAtMost) {
            const auto next = std::next(it);
            dropped->splice(dropped->end(), frames, it);
            it = next;
        } else {
            it = frames.erase(it);
        }
        if (cursorHere) *cursor = it;
    }
}

}  // namespace TolkaTouch

#pragma once
// tolkatouch.Recording: a recording document held in C++ (the pipeline's own PipelineRecording),
// with its image frames as numpy columns, its firmware events and setting changes as small
// objects. Replay and synthesis take and give this type.

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <pybind11/pybind11.h>

#include "pipeline/PipelineRecording.h"
#include "tools/workbench/Labels.h"

namespace TolkaTouch::Python {

namespace py = pybind11;

// One firmware event report of a recording.
struct FirmwareEventRecord {
    uint64_t hostTime = 0;  // host clock nanoseconds of the report
    uint32_t event = 0;     // 0: the firmware reset
    uint64_t context = 0;   // the context bytes, the first most significant
};

// One setting change (state frame) of a recording.
struct SettingChangeRecord {
    uint64_t hostTime = 0;
    std::string key;
    py::object value;  // None for a state frame without a value
};

class Recording {
public:
    // Reads the document (any accepted version) with the interpreter lock released; throws
    // DocumentFailure with "<subject>: <reader's message>".
    static Recording fromBytes(std::vector<uint8_t> document, const std::string& subject);
    // Also reads the labels beside the document (DOC.labels.json) when there are any; throws
    // DocumentFailure naming the labels file when they do not read.
    static Recording load(const std::string& path);
    explicit Recording(PipelineRecording recording);

    std::vector<uint8_t> toBytes() const;
    std::optional<std::string> labelsDocument() const;
    // Throws DocumentFailure "<subject>: <what is wrong>".
    void setLabelsDocument(const std::string& text, const std::string& subject);  // the document as `tolkatouch synth` and `convert` write it
    void save(const std::string& path) const;

    const PipelineRecording& recording() const { return *_recording; }
    size_t imageCount() const;

    py::object times;          // int64, firmware milliseconds of each image
    py::object frameNumbers;   // uint32
    py::object hostTimes;      // int64, host clock nanoseconds of each image
    py::object pixels;         // N x 15 uint16: the raw readings, A..O
    py::object readings;       // N x 15 int16: what the recognizer consumes, A..O
    std::vector<FirmwareEventRecord> firmwareEvents;
    std::vector<SettingChangeRecord> settingChanges;
    // What the recording was meant to contain (synthesis, or DOC.labels.json beside DOC.json).
    std::optional<std::vector<Workbench::Label>> labels;

private:
    // Shared, never changed after construction: replays read it with the lock released.
    std::shared_ptr<const PipelineRecording> _recording;
};

// A recorded value as Python sees it: None, bool, int, float, str, bytes, list or dict.
py::object pythonValue(const PropertyValue& value);

void addRecording(py::module_& module);

}  // namespace TolkaTouch::Python

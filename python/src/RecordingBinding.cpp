#include "RecordingBinding.h"

#include <cstring>
#include <filesystem>

#include <pybind11/stl.h>

#include "common/Reports.h"
#include "tools/DocumentFile.h"

#include "ArrayColumns.h"
#include "Errors.h"

namespace TolkaTouch::Python {

namespace {

struct ImageColumns {
    std::vector<int64_t> times;
    std::vector<uint32_t> frameNumbers;
    std::vector<int64_t> hostTimes;
    std::vector<uint16_t> pixels;
    std::vector<int16_t> readings;
    std::vector<FirmwareEventRecord> firmwareEvents;
    std::vector<const PipelineRecording::Frame*> settingFrames;
};

ImageColumns columnsOf(const PipelineRecording& recording) {
    ImageColumns columns;
    const size_t count = recording.frames().size();
    columns.times.reserve(count);
    columns.frameNumbers.reserve(count);
    columns.hostTimes.reserve(count);
    columns.pixels.reserve(count * kPixelCount);
    columns.readings.reserve(count * kPixelCount);
    for (const PipelineRecording::Frame& frame : recording.frames()) {
        if (frame.type == PipelineRecording::FrameType::State) {
            columns.settingFrames.push_back(&frame);
            continue;
        }
        const uint8_t* bytes = frame.report.data();
        const size_t length = frame.report.size();
        if (const auto image = InputReport::Image::parse(bytes, length)) {
            columns.times.push_back(image->timeMs);
            columns.frameNumbers.push_back(image->frameNumber);
            columns.hostTimes.push_back(static_cast<int64_t>(frame.timestamp));
            columns.pixels.insert(columns.pixels.end(), image->rawPixels, image->rawPixels + kPixelCount);
            columns.readings.insert(columns.readings.end(), image->pixels, image->pixels + kPixelCount);
        } else if (const auto event = InputReport::FirmwareEvent::parse(bytes, length)) {
            columns.firmwareEvents.push_back({frame.timestamp, event->event, event->contextValue()});
        }
    }
    return columns;
}

py::object readOnly(py::array array) {
    array.attr("flags").attr("writeable") = false;
    return array;
}

}  // namespace

py::object pythonValue(const PropertyValue& value) {
    switch (value.kind()) {
    case PropertyValue::Kind::Null:
        return py::none();
    case PropertyValue::Kind::Boolean:
        return py::bool_(*value.boolean());
    case PropertyValue::Kind::Signed:
        return py::int_(*value.signedInteger());
    case PropertyValue::Kind::Unsigned:
        return py::int_(*value.unsignedInteger());
    case PropertyValue::Kind::Floating:
        return py::float_(*value.floating());
    case PropertyValue::Kind::String:
        return py::str(*value.string());
    case PropertyValue::Kind::Data:
        return py::bytes(reinterpret_cast<const char*>(value.data()->data()), value.data()->size());
    case PropertyValue::Kind::Array: {
        py::list list;
        for (const PropertyValue& item : *value.array()) list.append(pythonValue(item));
        return list;
    }
    case PropertyValue::Kind::Dictionary: {
        py::dict dict;
        for (const auto& [key, item] : *value.dictionary()) dict[py::str(key)] = pythonValue(item);
        return dict;
    }
    }
    return py::none();
}

Recording::Recording(PipelineRecording recording)
    : _recording(std::make_shared<const PipelineRecording>(std::move(recording))) {
    ImageColumns columns;
    {
        py::gil_scoped_release unlocked;
        columns = columnsOf(*_recording);
    }
    times = readOnly(arrayFrom(std::move(columns.times)));
    frameNumbers = readOnly(arrayFrom(std::move(columns.frameNumbers)));
    hostTimes = readOnly(arrayFrom(std::move(columns.hostTimes)));
    pixels = readOnly(arrayFrom(std::move(columns.pixels), kPixelCount));
    readings = readOnly(arrayFrom(std::move(columns.readings), kPixelCount));
    firmwareEvents = std::move(columns.firmwareEvents);
    for (const PipelineRecording::Frame* frame : columns.settingFrames) {
        settingChanges.push_back(
            {frame->timestamp, frame->key, frame->value ? pythonValue(*frame->value) : py::object(py::none())});
    }
}

Recording Recording::fromBytes(std::vector<uint8_t> document, const std::string& subject) {
    std::optional<PipelineRecording> recording;
    {
        py::gil_scoped_release unlocked;
        try {
            recording.emplace(Tools::recordingFromDocument(document, subject));
        } catch (const Tools::ToolError& error) {
            // Both of the command line's lines: what failed, then the parser's reason and position.
            throw DocumentFailure(error.detail().empty() ? std::string(error.what())
                                                         : std::string(error.what()) + "\n  " + error.detail());
        }
    }
    return Recording(std::move(*recording));
}

Recording Recording::load(const std::string& path) {
    std::vector<uint8_t> document;
    std::optional<std::vector<Workbench::Label>> labels;
    {
        py::gil_scoped_release unlocked;
        try {
            document = Tools::readFileBytes(path);
        } catch (const Tools::ToolError& error) {
            throw FileFailure(error.what());
        }
        const std::string labelsPath = Workbench::labelsPathFor(path);
        std::error_code missing;
        if (path != "-" && std::filesystem::exists(labelsPath, missing)) {
            try {
                const std::vector<uint8_t> text = Tools::readFileBytes(labelsPath);
                labels = Workbench::parseLabels(std::string_view(reinterpret_cast<const char*>(text.data()), text.size()));
            } catch (const Tools::ToolError& error) {
                throw FileFailure(error.what());
            } catch (const Workbench::LabelsError& error) {
                throw DocumentFailure(labelsPath + ": " + error.what());
            }
        }
    }
    Recording recording = fromBytes(std::move(document), path);
    recording.labels = std::move(labels);
    return recording;
}

std::optional<std::string> Recording::labelsDocument() const {
    if (!labels) return std::nullopt;
    return Workbench::labelsDocument(*labels);
}

void Recording::setLabelsDocument(const std::string& text, const std::string& subject) {
    try {
        labels = Workbench::parseLabels(text);
    } catch (const Workbench::LabelsError& error) {
        throw DocumentFailure(subject + ": " + error.what());
    }
}

std::vector<uint8_t> Recording::toBytes() const {
    // json() trims to the bound, which a recording read from a document does not have; the copy
    // keeps this object unchanged all the same.
    PipelineRecording copy = *_recording;
    std::vector<uint8_t> document = copy.json();
    document.push_back('\n');
    return document;
}

void Recording::save(const std::string& path) const {
    const std::vector<uint8_t> document = toBytes();
    py::gil_scoped_release unlocked;
    try {
        Tools::writeFileBytes(path, document);
    } catch (const Tools::ToolError& error) {
        throw FileFailure(error.what());
    }
}

size_t Recording::imageCount() const { return static_cast<size_t>(py::len(frameNumbers)); }

namespace {

py::object zoneOrNone(PixelRegion zone) {
    if (zone == PixelRegion::None) return py::none();
    return py::str(std::string(Workbench::zoneName(zone)));
}

py::bytes bytesOf(const std::vector<uint8_t>& bytes) {
    return py::bytes(reinterpret_cast<const char*>(bytes.data()), bytes.size());
}

}  // namespace

void addRecording(py::module_& module) {
    py::class_<Workbench::Label>(module, "Label",
                                 "What a stretch of a recording was meant to be: a tap, hold, slide or brush in a zone, "
                                 "or none (nothing meant to happen).")
        .def_property_readonly("kind", [](const Workbench::Label& l) { return std::string(Workbench::intendedName(l.kind)); },
                               "'tap', 'hold', 'slide', 'brush' or 'none'.")
        .def_property_readonly("zone", [](const Workbench::Label& l) { return zoneOrNone(l.zone); },
                               "'play-pause', 'volume-up' or 'volume-down'; None for kind 'none'.")
        .def_property_readonly("to_zone", [](const Workbench::Label& l) { return zoneOrNone(l.toZone); },
                               "A slide's last zone; None otherwise.")
        .def_readonly("start_us", &Workbench::Label::startUs, "When the finger arrives, microseconds from the first frame.")
        .def_readonly("end_us", &Workbench::Label::endUs, "When the finger leaves, microseconds from the first frame.")
        .def("__repr__", [](const Workbench::Label& l) {
            return "Label(" + std::string(Workbench::intendedName(l.kind)) + ", " + std::string(Workbench::zoneName(l.zone)) +
                   ", " + std::to_string(l.startUs) + "-" + std::to_string(l.endUs) + " us)";
        });

    py::class_<FirmwareEventRecord>(module, "FirmwareEvent",
                                    "One firmware event report of a recording (event 0 is the firmware's reset).")
        .def_readonly("host_time", &FirmwareEventRecord::hostTime, "Host clock nanoseconds of the report.")
        .def_readonly("event", &FirmwareEventRecord::event, "The firmware's event code; 0 is a reset.")
        .def_readonly("context", &FirmwareEventRecord::context, "The eight context bytes as one number, first byte most significant.")
        .def_property_readonly("is_reset", [](const FirmwareEventRecord& r) { return r.event == InputReport::FirmwareEvent::kReset; })
        .def("__repr__", [](const FirmwareEventRecord& r) {
            return "FirmwareEvent(host_time=" + std::to_string(r.hostTime) + ", event=" + std::to_string(r.event) +
                   ", context=" + std::to_string(r.context) + ")";
        });

    py::class_<SettingChangeRecord>(module, "SettingChange", "One setting written in a recording (a state frame).")
        .def_readonly("host_time", &SettingChangeRecord::hostTime, "Host clock nanoseconds of the change.")
        .def_readonly("key", &SettingChangeRecord::key, "The full state key, e.g. 'Algs.HoldTimeoutMilliseconds'.")
        .def_readonly("value", &SettingChangeRecord::value, "The value written; None for a change recorded without one.")
        .def("__repr__", [](const SettingChangeRecord& r) {
            return "SettingChange(host_time=" + std::to_string(r.hostTime) + ", key=" + py::repr(py::str(r.key)).cast<std::string>() +
                   ", value=" + py::repr(r.value).cast<std::string>() + ")";
        });

    py::class_<Recording>(module, "Recording",
                          "A recording document: its image frames as numpy arrays, its firmware events and setting "
                          "changes. Read with Recording.load or Recording.from_bytes, made by synth().")
        .def_static("load", &Recording::load, py::arg("path"),
                    "Reads a recording document (version 0 or 1) from a file. Raises OSError when the file cannot be "
                    "read and DocumentError when it is not a recording, with the command line's message.")
        .def_static(
            "from_bytes",
            [](py::bytes document, const std::string& name) {
                const std::string_view view = document;
                return Recording::fromBytes(std::vector<uint8_t>(view.begin(), view.end()), name);
            },
            py::arg("document"), py::arg("name") = "<bytes>",
            "Reads a recording document from its bytes; `name` stands for it in error messages. Raises DocumentError.")
        .def("to_bytes", [](const Recording& r) {
            const std::vector<uint8_t> document = r.toBytes();
            return py::bytes(reinterpret_cast<const char*>(document.data()), document.size());
        }, "The document (version 1) as bytes, as `tolkatouch convert` writes it.")
        .def("save", &Recording::save, py::arg("path"), "Writes the document (version 1) to a file; raises OSError.")
        .def_readonly("times", &Recording::times, "int64 array (N,): the firmware's time of each image, milliseconds.")
        .def_readonly("frame_numbers", &Recording::frameNumbers, "uint32 array (N,): the firmware's number of each image.")
        .def_readonly("host_times", &Recording::hostTimes, "int64 array (N,): the host clock nanoseconds at which each image arrived.")
        .def_readonly("pixels", &Recording::pixels, "uint16 array (N, 15): the raw pixel readings, columns A..O.")
        .def_readonly("readings", &Recording::readings,
                      "int16 array (N, 15): the signed readings the recognizer consumes, columns A..O.")
        .def_readonly("firmware_events", &Recording::firmwareEvents, "list of FirmwareEvent, oldest first.")
        .def_readonly("setting_changes", &Recording::settingChanges, "list of SettingChange, oldest first.")
        .def_readonly("labels", &Recording::labels,
                      "list of Label, or None: what the recording was meant to contain (from synth(), or the "
                      "DOC.labels.json beside a loaded DOC.json).")
        .def("labels_document", &Recording::labelsDocument,
             "The labels as a labels document (what `tolkatouch eval` reads beside a recording), or None.")
        .def(
            "save_labels",
            [](const Recording& r, const std::string& path) {
                const std::optional<std::string> text = r.labelsDocument();
                if (!text) throw py::value_error("the recording has no labels");
                try {
                    Tools::writeFileBytes(path, std::vector<uint8_t>(text->begin(), text->end()));
                } catch (const Tools::ToolError& error) {
                    throw FileFailure(error.what());
                }
            },
            py::arg("path"), "Writes the labels document (DOC.labels.json beside DOC.json for eval); raises OSError.")
        .def("__len__", &Recording::imageCount, "The number of image frames.")
        .def("__repr__", [](const Recording& r) {
            return "<tolkatouch.Recording: " + std::to_string(r.imageCount()) + " images, " +
                   std::to_string(r.firmwareEvents.size()) + " firmware events, " +
                   std::to_string(r.settingChanges.size()) + " setting changes>";
        })
        // Pickled as the document and its labels, so that recordings travel to other processes.
        .def(py::pickle(
            [](const Recording& r) {
                const std::optional<std::string> labels = r.labelsDocument();
                return py::make_tuple(bytesOf(r.toBytes()), labels ? py::object(py::str(*labels)) : py::object(py::none()));
            },
            [](const py::tuple& state) {
                const std::string_view view = state[0].cast<py::bytes>();
                Recording recording = Recording::fromBytes(std::vector<uint8_t>(view.begin(), view.end()), "<pickle>");
                if (!state[1].is_none()) recording.setLabelsDocument(state[1].cast<std::string>(), "<pickle>");
                return recording;
            }));
}

}  // namespace TolkaTouch::Python

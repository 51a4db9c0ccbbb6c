#include "ViewBinding.h"

#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include <pybind11/stl.h>

#include "algs/Descriptions.h"
#include "algs/VirtualImage.h"
#include "tools/FingerModel.h"

#include "Errors.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

namespace {

template <typename T, size_t N>
void fill(std::array<T, N>& out, const py::dict& values, const char* name) {
    const auto items = values[name].cast<std::vector<T>>();
    if (items.size() != N) throw py::value_error(std::string(name) + " must have " + std::to_string(N) + " values");
    std::copy(items.begin(), items.end(), out.begin());
}

// A frame's snapshot from the numbers of tolkatouch.Frames at one index, under their names.
FrameSnapshot snapshotOf(const py::dict& values) {
    FrameSnapshot frame;
    frame.frameNumber = values["frame"].cast<uint32_t>();
    frame.timeMs = static_cast<uint32_t>(values["time"].cast<int64_t>());
    fill(frame.readings, values, "readings");
    fill(frame.pixelValues, values, "pixel_values");
    fill(frame.pixelNormalized, values, "normalized");
    fill(frame.pixelOn, values, "on");
    fill(frame.virtualValues, values, "virtual_values");
    fill(frame.virtualNormalized, values, "virtual_normalized");
    fill(frame.virtualOn, values, "virtual_on");
    frame.touchScore = values["touch_score"].cast<float>();
    frame.svmScore = values["svm_score"].cast<float>();
    frame.strengthRate = values["strength_rate"].cast<float>();
    frame.strengthPerDuration = values["strength_per_duration"].cast<float>();
    frame.durationRatio = values["duration_ratio"].cast<float>();
    frame.activePixelCount = values["active_pixel_count"].cast<int32_t>();
    frame.tapScore = values["tap_score"].cast<float>();
    frame.touching = values["touching"].cast<bool>();
    frame.aboveNoise = values["above_noise"].cast<bool>();
    frame.sinceTouchStartMs = values["since_touch_start_ms"].cast<int32_t>();
    frame.touchLengthMs = values["touch_length_ms"].cast<int32_t>();
    frame.verdict.transition = static_cast<Transition>(values["transition"].cast<uint8_t>());
    frame.verdict.holdSuppressed = values["hold_suppressed"].cast<bool>();
    frame.verdict.holdClock = static_cast<HoldClock>(values["hold_clock"].cast<uint8_t>());
    frame.verdict.region = static_cast<PixelRegion>(values["region"].cast<uint8_t>());
    return frame;
}

}  // namespace

void addView(py::module_& module) {
    module.def(
        "surface_pads",
        [] {
            py::list pads;
            for (const Tools::Pad& pad : Tools::FingerModel::pads()) pads.append(py::make_tuple(pad.pixel, pad.centre.x, pad.centre.y));
            return pads;
        },
        "[(pixel, x, y)]: where each pad lies on the surface, as the image drawing places it (pixels A-F, J "
        "and L have two pads); x right, y down, origin at pixel K.");

    module.def(
        "virtual_groups", [] { return VirtualImage().groups; },
        "The letters of each of the 23 virtual pixels, in the order of Frames.virtual_values' columns.");

    module.def(
        "description_lines",
        [](const py::dict& values) {
            const FrameSnapshot frame = snapshotOf(values);
            return py::make_tuple(touchStateLine(frame), virtualStateLine(frame));
        },
        py::arg("values"),
        "(touch state line, virtual state line): the frame's description lines, as the recognizer's debug log "
        "writes them, from a dict of every tolkatouch.Frames number at one index (exact float32 values).");

    module.def(
        "attach_labels",
        [](Recording& recording, const std::string& text, const std::string& subject) {
            recording.setLabelsDocument(text, subject);
        },
        py::arg("recording"), py::arg("text"), py::arg("subject"),
        "Gives the recording the labels of a labels document's text; DocumentError naming the subject otherwise.");
}

}  // namespace TolkaTouch::Python

// Any bytes as a labels document: it either reads, and then writes back to a document that reads
// as the same labels, or is refused with one line. Nothing else may happen: no crash, no hang.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "tools/workbench/Labels.h"

using namespace TolkaTouch::Workbench;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::vector<Label> labels;
    try {
        labels = parseLabels(std::string_view(reinterpret_cast<const char*>(data), size));
    } catch (const LabelsError&) {
        return 0;
    }
    // Written times are whole milliseconds: the round trip is exact once rounded.
    for (Label& label : labels) {
        label.startUs = (label.startUs + 500) / 1000 * 1000;
        label.endUs = (label.endUs + 500) / 1000 * 1000;
    }
    std::vector<Label> again = parseLabels(labelsDocument(labels));
    if (again.size() != labels.size()) std::abort();
    for (size_t i = 0; i < labels.size(); ++i) {
        if (again[i].kind != labels[i].kind || again[i].zone != labels[i].zone || again[i].toZone != labels[i].toZone) std::abort();
    }
    return 0;
}

#pragma once
// PipelineInput: what stands on the road of reports and settings into the recognizer. The
// pipeline implements it, and so does the recording that sits in front of the pipeline and
// forwards every call unchanged.
//
//   setTime(ticks)                      the host clock reading (ticks) that stamps what follows
//   setState(key, value)                a setting written under a state key ("Algs.ActivationThreshold")
//   handleInputReport(bytes, length)    one raw input report from the device
//
// Objects are owned and destroyed through their concrete type (or a shared pointer made from
// it), never through this interface, so the destructor is protected and not virtual.

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

class PipelineInput {
public:
    virtual void setTime(uint64_t time) = 0;
    virtual void setState(const std::string& key, PropertyValue value) = 0;
    virtual void handleInputReport(const uint8_t* bytes, size_t length) = 0;

protected:
    PipelineInput() = default;
    PipelineInput(const PipelineInput&) = default;
    PipelineInput& operator=(const PipelineInput&) = default;
    ~PipelineInput() = default;
};

}  // namespace TolkaTouch

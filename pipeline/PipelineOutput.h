#pragma once
// PipelineOutput: the read side of the pipeline's state keys. getState answers null for a key
// it does not know. Destroyed through the concrete type only, like PipelineInput.

#include <string>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

class PipelineOutput {
public:
    virtual PropertyValue getState(const std::string& key) const = 0;

protected:
    PipelineOutput() = default;
    PipelineOutput(const PipelineOutput&) = default;
    PipelineOutput& operator=(const PipelineOutput&) = default;
    ~PipelineOutput() = default;
};

}  // namespace TolkaTouch

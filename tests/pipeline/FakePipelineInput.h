#pragma once
// Test doubles for the recording's neighbours: a PipelineInput that writes down every call it
// receives as one line of text, and a host clock whose reading the test sets and whose sleeps
// are only noted.

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "pipeline/PipelineInput.h"
#include "common/Util.h"
#include "platform/HostClock.h"

namespace TolkaTouch::Testing {

class FakePipelineInput final : public PipelineInput {
public:
    void setTime(uint64_t time) override { calls.push_back("setTime " + std::to_string(time)); }
    void setState(const std::string& key, PropertyValue value) override {
        calls.push_back("setState " + key + " " + value.description());
        if (onSetState) onSetState(key);
    }
    void handleInputReport(const uint8_t* bytes, size_t length) override {
        calls.push_back("handleInputReport " + Util::hexStringFromBytes(std::vector<uint8_t>(bytes, bytes + length)));
        if (onInputReport) onInputReport();
    }

    std::vector<std::string> calls;
    std::function<void(const std::string& key)> onSetState;
    std::function<void()> onInputReport;
};

struct FakeClock {
    uint64_t ticks = 0;
    std::vector<uint64_t> sleeps;  // microseconds, in order

    HostClock hostClock() {
        return HostClock{[this] { return ticks; }, [this](uint64_t microseconds) { sleeps.push_back(microseconds); }};
    }
};

}  // namespace TolkaTouch::Testing

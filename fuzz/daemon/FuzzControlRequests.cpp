// Any bytes as one control socket request line, answered against a target that takes everything:
// the reply is always one line of JSON, and settings reach the target only when the settings
// table takes them.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include <nlohmann/json.hpp>

#include "daemon/ControlRequests.h"
#include "tolkatouch/Settings.h"

using namespace TolkaTouch;

namespace {

class AcceptingTarget : public ControlTarget {
public:
    std::vector<ControlDeviceInfo> devices() override { return {{1, "/dev/hidraw0", 0x1209, 0x0001}}; }
    std::optional<PropertyValue> getProperty(std::optional<uint32_t>, const std::string&) override {
        return PropertyValue(PropertyValue::Array{PropertyValue(1), PropertyValue("x")});
    }
    std::optional<bool> setProperty(std::optional<uint32_t>, const std::string& key, const PropertyValue&) override {
        if (isSettingKeyForm(key) && findSetting(key) == nullptr) std::abort();  // a made-up setting got through
        return true;
    }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    AcceptingTarget target;
    const std::string reply = answerControlRequest(std::string(reinterpret_cast<const char*>(data), size), target);
    if (reply.find('\n') != std::string::npos) std::abort();
    if (nlohmann::json::parse(reply, nullptr, false).is_discarded()) std::abort();
    return 0;
}

// Any bytes as the log configuration (log.conf, also what TOLKATOUCH_LOG and --log-level become):
// it applies, or is refused with std::invalid_argument naming the line; then a line logged goes
// through the levels and the rate guard it set. Nothing else may happen: no crash, no hang.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>

#include "platform/Log.h"

using namespace TolkaTouch;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool quiet = [] {
        SystemLog::setSink(std::make_shared<SystemLog::MemorySink>(), true);
        return true;
    }();
    (void)quiet;
    try {
        SystemLog::applyConfiguration(std::string(reinterpret_cast<const char*>(data), size));
    } catch (const std::invalid_argument&) {
    }
    static const Log log("fuzz", "Algs");
    log.log("Received image frame: %u", 1u);
    SystemLog::flushFolded(true);
    return 0;
}

#include "daemon/KeyOutput.h"

#include <libevdev/libevdev.h>
#include <linux/input-event-codes.h>

namespace TolkaTouch {

namespace {
// The input subsystem's own name of a key, as libevdev knows it; a number it does not name is
// written after "KEY_".
std::string keyName(uint16_t code) {
    const char* name = libevdev_event_code_get_name(EV_KEY, code);
    return name ? std::string(name) : "KEY_" + std::to_string(code);
}
}  // namespace

std::string describeKeyWrite(const KeyWrite& write) {
    return keyName(write.code) + " " + std::to_string(write.value);
}

}  // namespace TolkaTouch

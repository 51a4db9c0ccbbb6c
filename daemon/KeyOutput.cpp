#include "daemon/KeyOutput.h"

#include <linux/input-event-codes.h>

namespace TolkaTouch {

namespace {
std::string keyName(uint16_t code) {
    switch (code) {
    case KEY_PLAYPAUSE: return "KEY_PLAYPAUSE";
    case KEY_VOLUMEUP: return "KEY_VOLUMEUP";
    case KEY_VOLUMEDOWN: return "KEY_VOLUMEDOWN";
    case KEY_VOICECOMMAND: return "KEY_VOICECOMMAND";
    default: return "KEY_" + std::to_string(code);
    }
}
}  // namespace

std::string describeKeyWrite(const KeyWrite& write) {
    return keyName(write.code) + " " + std::to_string(write.value);
}

}  // namespace TolkaTouch

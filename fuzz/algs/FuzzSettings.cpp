// Any bytes as a KEY=VALUE setting: it is either taken, with a key of the table and a value in
// its range, or refused with one line that escapes every control character it echoes.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "tolkatouch/Settings.h"

using namespace TolkaTouch;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    try {
        const CheckedSetting checked =
            checkSettingAssignment(std::string_view(reinterpret_cast<const char*>(data), size));
        if (checked.setting == nullptr) std::abort();
    } catch (const SettingError& error) {
        for (const char* c = error.what(); *c != '\0'; ++c) {
            if (static_cast<unsigned char>(*c) < 0x20) std::abort();
        }
    }
    return 0;
}

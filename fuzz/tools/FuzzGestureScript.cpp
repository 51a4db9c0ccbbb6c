// Any bytes as a gesture script: it either parses or is refused with one line naming the line
// that does not read. Nothing else may happen: no crash, no hang.

#include <cstddef>
#include <cstdint>
#include <exception>
#include <string_view>

#include "tools/GestureScript.h"

using namespace TolkaTouch::Tools;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    try {
        (void)GestureScript::parse(std::string_view(reinterpret_cast<const char*>(data), size));
    } catch (const std::exception&) {
    }
    return 0;
}

// Any bytes as one line of the daemon's live stream, as `tolkatouch watch` shows it: it is shown,
// or shown as unreadable; the text never carries a control character other than a newline, and
// nothing throws.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "tools/WatchPrinter.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string line(reinterpret_cast<const char*>(data), size);
    const std::string text = TolkaTouch::Tools::watchLineText(line);
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if ((byte < 0x20 && c != '\n') || byte == 0x7f) std::abort();
    }
    return 0;
}

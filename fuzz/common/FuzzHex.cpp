// Any bytes as hex text, read both ways: the recording form's lenient reader either gives bytes
// or its one error, and the strict pair reader either gives bytes or one of its two errors. Bytes
// that were read write back to text that reads to the same bytes.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/Util.h"
#include "platform/Hex.h"

using namespace TolkaTouch;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    try {
        const std::vector<uint8_t> bytes = Util::bytesFromHexString(text);
        if (Util::bytesFromHexString(Util::hexStringFromBytes(bytes)) != bytes) std::abort();
    } catch (const std::invalid_argument&) {
    }
    try {
        const std::vector<uint8_t> bytes = Hex::bytesFromPairs(text, " :");
        if (Hex::bytesFromPairs(Hex::text(bytes, Hex::Spacing::Between)) != bytes) std::abort();
    } catch (const std::invalid_argument&) {
    }
    return 0;
}

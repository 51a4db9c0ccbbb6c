#pragma once
// KeyOutput: where the daemon's key presses go. One write is one key event followed by a
// SYN_REPORT; the virtual keyboard, a key log file and the in-memory recorder of the tests all
// take the same writes.

#include <cstdint>
#include <string>

namespace TolkaTouch {

// Values of a key write, as the input subsystem numbers them.
namespace KeyValue {
inline constexpr int32_t Release = 0;
inline constexpr int32_t Press = 1;
}  // namespace KeyValue

struct KeyWrite {
    uint16_t code = 0;
    int32_t value = 0;
    bool operator==(const KeyWrite&) const = default;
};

// "KEY_VOLUMEUP 1": the key's name and the value, as key logs and test failures show a write.
std::string describeKeyWrite(const KeyWrite& write);

class KeyOutput {
public:
    virtual ~KeyOutput() = default;
    virtual void write(const KeyWrite& write) = 0;
};

}  // namespace TolkaTouch

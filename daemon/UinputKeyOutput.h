#pragma once
// UinputKeyOutput: the virtual keyboard through which the daemon's keys reach the system, made
// with libevdev's uinput interface. It offers exactly the four media keys the surface can send.

#include <memory>
#include <string>

#include "daemon/KeyOutput.h"
#include "platform/Log.h"

struct libevdev_uinput;

namespace TolkaTouch {

class UinputKeyOutput : public KeyOutput {
public:
    // Creates the virtual keyboard through the uinput node (normally /dev/uinput). Throws
    // std::runtime_error with a one-line message when the node is missing or not writable.
    explicit UinputKeyOutput(const std::string& uinputPath = "/dev/uinput");
    ~UinputKeyOutput() override;
    UinputKeyOutput(const UinputKeyOutput&) = delete;
    UinputKeyOutput& operator=(const UinputKeyOutput&) = delete;

    void write(const KeyWrite& write) override;

    // The virtual keyboard's event node (/dev/input/eventN), empty when the system does not say.
    std::string devnode() const;

private:
    int _fd = -1;
    libevdev_uinput* _device = nullptr;
    Log _log{"com.zantor.hid.TolkaTouch", "Daemon"};
};

}  // namespace TolkaTouch

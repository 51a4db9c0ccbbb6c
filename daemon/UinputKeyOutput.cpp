#include "daemon/UinputKeyOutput.h"

#include <fcntl.h>
#include <libevdev/libevdev-uinput.h>
#include <libevdev/libevdev.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace TolkaTouch {

namespace {
constexpr unsigned kKeys[] = {KEY_PLAYPAUSE, KEY_VOLUMEUP, KEY_VOLUMEDOWN, KEY_VOICECOMMAND};
}

UinputKeyOutput::UinputKeyOutput(const std::string& uinputPath) {
    _fd = ::open(uinputPath.c_str(), O_RDWR | O_CLOEXEC);
    if (_fd < 0) {
        throw std::runtime_error("cannot open " + uinputPath + " for the virtual keyboard: " +
                                 std::strerror(errno));
    }
    libevdev* description = libevdev_new();
    libevdev_set_name(description, "TolkaTouch media keys");
    libevdev_set_id_bustype(description, BUS_VIRTUAL);
    libevdev_enable_event_type(description, EV_KEY);
    for (unsigned key : kKeys) libevdev_enable_event_code(description, EV_KEY, key, nullptr);
    int result = libevdev_uinput_create_from_device(description, _fd, &_device);
    libevdev_free(description);
    if (result != 0) {
        ::close(_fd);
        _fd = -1;
        throw std::runtime_error("cannot create the virtual keyboard on " + uinputPath + ": " +
                                 std::strerror(-result));
    }
}

UinputKeyOutput::~UinputKeyOutput() {
    if (_device) libevdev_uinput_destroy(_device);
    if (_fd >= 0) ::close(_fd);
}

std::string UinputKeyOutput::devnode() const {
    const char* node = libevdev_uinput_get_devnode(_device);
    return node ? node : "";
}

void UinputKeyOutput::write(const KeyWrite& write) {
    int result = libevdev_uinput_write_event(_device, EV_KEY, write.code, write.value);
    if (result == 0) result = libevdev_uinput_write_event(_device, EV_SYN, SYN_REPORT, 0);
    if (result != 0) {
        _log.error("virtual keyboard write of %s failed: %s", describeKeyWrite(write).c_str(),
                  std::strerror(-result));
    }
}

}  // namespace TolkaTouch

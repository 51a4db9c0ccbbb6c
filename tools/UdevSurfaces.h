#pragma once
// The surfaces udev knows of, without the daemon: every hidraw node whose HID device has the given
// vendor and product IDs. What `tolkatouch devices` lists when no daemon answers.

#include <cstdint>
#include <string>
#include <vector>

namespace TolkaTouch::Tools {

struct UdevSurface {
    std::string node;  // /dev/hidrawN
    uint16_t vendor = 0;
    uint16_t product = 0;
};

// Throws ToolError when udev cannot be asked.
std::vector<UdevSurface> udevSurfaces(uint16_t vendor, uint16_t product);

}  // namespace TolkaTouch::Tools

#pragma once
// DeviceDiscovery: finds the surface's hidraw nodes through udev, by the vendor and product IDs of
// the HID device above each node, both those present now and those that come and go later. The
// monitor starts before the first enumeration, so a node plugged in between the two is reported
// (possibly twice; the daemon ignores a node it already runs).

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

struct udev;
struct udev_monitor;

namespace TolkaTouch {

struct HidrawNode {
    std::string devnode;  // /dev/hidrawN
    std::string syspath;
    uint16_t vendor = 0;
    uint16_t product = 0;
};

struct HidId {
    uint32_t bus = 0;
    uint32_t vendor = 0;
    uint32_t product = 0;
    bool operator==(const HidId&) const = default;
};

// The HID_ID property of a hid device, "0003:00001209:00000001" (bus:vendor:product, hex).
std::optional<HidId> parseHidId(const char* text);

class DeviceDiscovery {
public:
    // Throws std::runtime_error with a one-line message when udev cannot be reached.
    DeviceDiscovery(uint16_t vendor, uint16_t product);
    ~DeviceDiscovery();
    DeviceDiscovery(const DeviceDiscovery&) = delete;
    DeviceDiscovery& operator=(const DeviceDiscovery&) = delete;

    // The matching hidraw nodes present now.
    std::vector<HidrawNode> enumerate();

    // The monitor's descriptor: readable when udev has news; then call handleReady().
    int pollFd() const;

    // Reports each matching node that appeared, and each hidraw node that went (by devnode: at
    // removal the IDs can no longer be read, so the caller matches the node against its own list).
    void handleReady(const std::function<void(const HidrawNode&)>& added,
                     const std::function<void(const std::string& devnode)>& removed);

private:
    uint16_t _vendor;
    uint16_t _product;
    udev* _udev = nullptr;
    udev_monitor* _monitor = nullptr;
};

}  // namespace TolkaTouch

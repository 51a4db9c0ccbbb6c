#include "daemon/DeviceDiscovery.h"

#include <libudev.h>

#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <stdexcept>

namespace TolkaTouch {

std::optional<HidId> parseHidId(const char* text) {
    if (!text) return std::nullopt;
    unsigned bus = 0, vendor = 0, product = 0;
    int consumed = 0;
    if (std::sscanf(text, "%x:%x:%x%n", &bus, &vendor, &product, &consumed) != 3 || text[consumed] != '\0') {
        return std::nullopt;
    }
    return HidId{bus, vendor, product};
}

namespace {
// The node's IDs, from the hid device it belongs to; empty for a node without one.
std::optional<HidrawNode> describe(udev_device* device) {
    const char* devnode = udev_device_get_devnode(device);
    if (!devnode) return std::nullopt;
    udev_device* hid = udev_device_get_parent_with_subsystem_devtype(device, "hid", nullptr);
    if (!hid) return std::nullopt;
    auto id = parseHidId(udev_device_get_property_value(hid, "HID_ID"));
    if (!id || id->vendor > 0xFFFF || id->product > 0xFFFF) return std::nullopt;
    HidrawNode node;
    node.devnode = devnode;
    node.syspath = udev_device_get_syspath(device);
    node.vendor = static_cast<uint16_t>(id->vendor);
    node.product = static_cast<uint16_t>(id->product);
    return node;
}
}  // namespace

DeviceDiscovery::DeviceDiscovery(uint16_t vendor, uint16_t product) : _vendor(vendor), _product(product) {
    _udev = udev_new();
    if (!_udev) throw std::runtime_error("cannot reach udev: " + std::string(std::strerror(errno)));
    _monitor = udev_monitor_new_from_netlink(_udev, "udev");
    if (!_monitor || udev_monitor_filter_add_match_subsystem_devtype(_monitor, "hidraw", nullptr) < 0 ||
        udev_monitor_enable_receiving(_monitor) < 0) {
        int error = errno;
        if (_monitor) udev_monitor_unref(_monitor);
        udev_unref(_udev);
        throw std::runtime_error("cannot watch udev for hidraw devices: " + std::string(std::strerror(error)));
    }
}

DeviceDiscovery::~DeviceDiscovery() {
    udev_monitor_unref(_monitor);
    udev_unref(_udev);
}

std::vector<HidrawNode> DeviceDiscovery::enumerate() {
    std::vector<HidrawNode> nodes;
    udev_enumerate* enumeration = udev_enumerate_new(_udev);
    if (!enumeration) return nodes;
    udev_enumerate_add_match_subsystem(enumeration, "hidraw");
    udev_enumerate_scan_devices(enumeration);
    udev_list_entry* entry;
    udev_list_entry_foreach(entry, udev_enumerate_get_list_entry(enumeration)) {
        udev_device* device = udev_device_new_from_syspath(_udev, udev_list_entry_get_name(entry));
        if (!device) continue;
        auto node = describe(device);
        if (node && node->vendor == _vendor && node->product == _product) nodes.push_back(std::move(*node));
        udev_device_unref(device);
    }
    udev_enumerate_unref(enumeration);
    return nodes;
}

int DeviceDiscovery::pollFd() const {
    return udev_monitor_get_fd(_monitor);
}

void DeviceDiscovery::handleReady(const std::function<void(const HidrawNode&)>& added,
                                  const std::function<void(const std::string& devnode)>& removed) {
    while (udev_device* device = udev_monitor_receive_device(_monitor)) {
        const char* action = udev_device_get_action(device);
        const char* devnode = udev_device_get_devnode(device);
        if (action && devnode && std::strcmp(action, "remove") == 0) {
            removed(devnode);
        } else if (action && std::strcmp(action, "add") == 0) {
            auto node = describe(device);
            if (node && node->vendor == _vendor && node->product == _product) added(*node);
        }
        udev_device_unref(device);
    }
}

}  // namespace TolkaTouch


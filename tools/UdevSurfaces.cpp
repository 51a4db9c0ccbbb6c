#include "tools/UdevSurfaces.h"

#include <libudev.h>

#include <cstdio>
#include <memory>

#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {
struct UdevDeleter {
    void operator()(udev* u) const { udev_unref(u); }
    void operator()(udev_enumerate* e) const { udev_enumerate_unref(e); }
    void operator()(udev_device* d) const { udev_device_unref(d); }
};
}  // namespace

std::vector<UdevSurface> udevSurfaces(uint16_t vendor, uint16_t product) {
    std::unique_ptr<udev, UdevDeleter> context(udev_new());
    if (!context) throw ToolError("udev", "cannot be reached");
    std::unique_ptr<udev_enumerate, UdevDeleter> enumerate(udev_enumerate_new(context.get()));
    if (!enumerate) throw ToolError("udev", "cannot list devices");
    udev_enumerate_add_match_subsystem(enumerate.get(), "hidraw");
    udev_enumerate_scan_devices(enumerate.get());

    std::vector<UdevSurface> surfaces;
    udev_list_entry* entry = nullptr;
    udev_list_entry_foreach(entry, udev_enumerate_get_list_entry(enumerate.get())) {
        std::unique_ptr<udev_device, UdevDeleter> device(
            udev_device_new_from_syspath(context.get(), udev_list_entry_get_name(entry)));
        if (!device) continue;
        // The HID device above the node says "bus:vendor:product" in hex (its parent is not
        // owned: it goes with the child).
        udev_device* hid = udev_device_get_parent_with_subsystem_devtype(device.get(), "hid", nullptr);
        const char* id = hid ? udev_device_get_property_value(hid, "HID_ID") : nullptr;
        const char* node = udev_device_get_devnode(device.get());
        unsigned bus = 0, foundVendor = 0, foundProduct = 0;
        if (!id || !node || std::sscanf(id, "%x:%x:%x", &bus, &foundVendor, &foundProduct) != 3) continue;
        if (foundVendor != vendor || foundProduct != product) continue;
        surfaces.push_back({node, static_cast<uint16_t>(foundVendor), static_cast<uint16_t>(foundProduct)});
    }
    return surfaces;
}

}  // namespace TolkaTouch::Tools

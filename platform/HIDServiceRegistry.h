#pragma once
// The host's table of matched HID services: the host registers, for each service handle it will
// hand a plug-in, how to make that service's device handle; the plug-in's start asks for it.

#include <cstdint>
#include <functional>
#include <memory>

namespace TolkaTouch {

class HIDDevice;

namespace HIDServiceRegistry {

using DeviceFactory = std::function<std::shared_ptr<HIDDevice>()>;

void registerService(uint32_t service, DeviceFactory factory);
void unregisterService(uint32_t service);

// A new device handle for the service, or null when the host knows no such service.
std::shared_ptr<HIDDevice> createDevice(uint32_t service);

}  // namespace HIDServiceRegistry
}  // namespace TolkaTouch

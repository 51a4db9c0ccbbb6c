#include "platform/HIDServiceRegistry.h"

#include <map>
#include <mutex>

namespace TolkaTouch::HIDServiceRegistry {

namespace {
struct Table {
    std::mutex mutex;
    std::map<uint32_t, DeviceFactory> factories;
};

Table& table() {
    static Table shared;
    return shared;
}
}  // namespace

void registerService(uint32_t service, DeviceFactory factory) {
    std::lock_guard lock(table().mutex);
    table().factories[service] = std::move(factory);
}

void unregisterService(uint32_t service) {
    std::lock_guard lock(table().mutex);
    table().factories.erase(service);
}

std::shared_ptr<HIDDevice> createDevice(uint32_t service) {
    DeviceFactory factory;
    {
        std::lock_guard lock(table().mutex);
        auto it = table().factories.find(service);
        if (it == table().factories.end()) return nullptr;
        factory = it->second;
    }
    return factory ? factory() : nullptr;
}

}  // namespace TolkaTouch::HIDServiceRegistry

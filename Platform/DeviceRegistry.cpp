#include "Platform/DeviceRegistry.h"

namespace ZeltoTouch::Platform {

DeviceRegistry& DeviceRegistry::shared() {
    static DeviceRegistry registry;
    return registry;
}

uint32_t DeviceRegistry::registerService(Factory factory) {
    std::lock_guard lock(_lock);
    const uint32_t handle = _nextHandle++;
    _factories.emplace(handle, std::move(factory));
    return handle;
}

void DeviceRegistry::unregisterService(uint32_t serviceHandle) {
    std::lock_guard lock(_lock);
    _factories.erase(serviceHandle);
}

std::shared_ptr<HIDDevice> DeviceRegistry::createDevice(uint32_t serviceHandle) const {
    Factory factory;
    {
        std::lock_guard lock(_lock);
        auto found = _factories.find(serviceHandle);
        if (found == _factories.end()) return nullptr;
        factory = found->second;
    }
    return factory ? factory() : nullptr;
}

}  // namespace ZeltoTouch::Platform

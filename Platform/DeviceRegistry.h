#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>

#include "Platform/HIDDevice.h"

namespace ZeltoTouch::Platform {

// The host's table of devices by service handle. The host registers a backend and hands the
// handle to the service, which creates its device object from it. Thread-safe.
//
// The registry is process-wide: a plug-in module that links the platform statically shares the
// host's registry only when the host executable exports its symbols (ENABLE_EXPORTS) and the
// module binds them dynamically (default visibility, no -Bsymbolic).
class DeviceRegistry {
public:
    using Factory = std::function<std::shared_ptr<HIDDevice>()>;

    static DeviceRegistry& shared();

    // Returns the new service handle (never 0).
    uint32_t registerService(Factory factory);
    void unregisterService(uint32_t serviceHandle);

    // A new device object for the handle, or null when the handle is unknown or the backend
    // yields nothing.
    std::shared_ptr<HIDDevice> createDevice(uint32_t serviceHandle) const;

private:
    mutable std::mutex _lock;
    std::map<uint32_t, Factory> _factories;
    uint32_t _nextHandle = 0x1000;
};

// Registers a backend for the lifetime of this object.
class ScopedDeviceService {
public:
    explicit ScopedDeviceService(DeviceRegistry::Factory factory)
        : _handle(DeviceRegistry::shared().registerService(std::move(factory))) {}
    ~ScopedDeviceService() { DeviceRegistry::shared().unregisterService(_handle); }
    ScopedDeviceService(const ScopedDeviceService&) = delete;
    ScopedDeviceService& operator=(const ScopedDeviceService&) = delete;

    uint32_t handle() const noexcept { return _handle; }

private:
    uint32_t _handle;
};

}  // namespace ZeltoTouch::Platform

#include "Service/ZeltoHIDService.h"

#include "Service/ZeltoIUnknown.h"

namespace ZeltoTouch {

ZeltoHIDService::ZeltoHIDService()
    : _pluginInterface(new ZeltoHIDServicePlugInInterface{
          .object = this,
          .QueryInterface = ZeltoIUnknown::QueryInterface,
          .AddRef = ZeltoIUnknown::AddRef,
          .Release = ZeltoIUnknown::Release,
          .version = 1,
          .revision = 0,
          .reserved = 0,
          .Probe = ZeltoIUnknown::Probe,
          .Start = ZeltoIUnknown::Start,
          .Stop = ZeltoIUnknown::Stop,
      }),
      _serviceInterface(new ZeltoHIDServiceInterface{
          .object = this,
          .QueryInterface = ZeltoIUnknown::QueryInterface,
          .AddRef = ZeltoIUnknown::AddRef,
          .Release = ZeltoIUnknown::Release,
          .open = ZeltoIUnknown::open,
          .close = ZeltoIUnknown::close,
          .copyProperty = ZeltoIUnknown::copyProperty,
          .setProperty = ZeltoIUnknown::setProperty,
          .setEventCallback = ZeltoIUnknown::setEventCallback,
          .scheduleWithDispatchQueue = ZeltoIUnknown::scheduleWithDispatchQueue,
          .unscheduleFromDispatchQueue = ZeltoIUnknown::unscheduleFromDispatchQueue,
          .copyEvent = ZeltoIUnknown::copyEvent,
          .setOutputEvent = ZeltoIUnknown::setOutputEvent,
      }) {}

ZeltoHIDService* ZeltoHIDService::fromInterface(void* interfacePointer) noexcept {
    // Both tables begin with the object, so either interface pointer leads to it the same way.
    void* const* table = *static_cast<void* const* const*>(interfacePointer);
    return static_cast<ZeltoHIDService*>(table[0]);
}

uint32_t ZeltoHIDService::retain() noexcept { return _referenceCount.fetch_add(1, std::memory_order_relaxed) + 1; }

uint32_t ZeltoHIDService::release() noexcept {
    const uint32_t count = _referenceCount.fetch_sub(1, std::memory_order_acq_rel) - 1;
    if (count == 0) {
        dealloc();
        delete this;
    }
    return count;
}

void ZeltoHIDService::dealloc() {
    delete _serviceInterface;
    _serviceInterface = nullptr;
    delete _pluginInterface;
    _pluginInterface = nullptr;
}

ZeltoReturn ZeltoHIDService::probeWithService(uint32_t, const PropertyValue&, int32_t*) { return kZeltoUnsupported; }

ZeltoReturn ZeltoHIDService::startWithService(uint32_t, const PropertyValue&) { return kZeltoUnsupported; }

ZeltoReturn ZeltoHIDService::stop() { return kZeltoUnsupported; }

bool ZeltoHIDService::openWithOptions(uint32_t) { return false; }

void ZeltoHIDService::closeWithOptions(uint32_t) {}

PropertyValue ZeltoHIDService::getPropertyForKey(const PropertyValue&) { return {}; }

bool ZeltoHIDService::setProperty(const PropertyValue&, const PropertyValue&) { return false; }

void ZeltoHIDService::setEventCallback(ZeltoHIDEventCallback, void*, void*) {}

void ZeltoHIDService::scheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>&) {}

void ZeltoHIDService::unscheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>&) {}

HIDEventRef ZeltoHIDService::copyEventWithType(uint32_t, const HIDEvent*, uint32_t) { return nullptr; }

ZeltoReturn ZeltoHIDService::setOutputEvent(const HIDEvent*) { return kZeltoUnsupported; }

}  // namespace ZeltoTouch

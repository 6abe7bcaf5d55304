#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <utility>

#include "Host/HIDEvent.h"
#include "Host/HIDServicePlugIn.h"
#include "Host/PropertyValue.h"

namespace ZeltoTouch {

namespace Platform {
class DispatchQueue;
}

// A HID service as the host sees it: an object reached through two tables of plain functions
// (the plug-in interface and the service interface) that share one reference count. This base
// class builds and owns the tables and answers every service operation with a refusal; a
// concrete service overrides the operations it supports.
//
// Objects live on the heap and die with their last reference: create them with new and hand
// the creation reference to whoever owns them (release() drops it).
class ZeltoHIDService {
public:
    ZeltoHIDService(const ZeltoHIDService&) = delete;
    ZeltoHIDService& operator=(const ZeltoHIDService&) = delete;

    // What the host holds for each interface: the address of the member pointing to the table.
    void* getPluginInterface() noexcept { return &_pluginInterface; }
    void* getServiceInterface() noexcept { return &_serviceInterface; }
    // The object behind either interface pointer.
    static ZeltoHIDService* fromInterface(void* interfacePointer) noexcept;

    // Each returns the count after the change; the release that reaches 0 destroys the object.
    uint32_t retain() noexcept;
    uint32_t release() noexcept;
    uint32_t referenceCount() const noexcept { return _referenceCount.load(std::memory_order_acquire); }

    virtual ZeltoReturn probeWithService(uint32_t service, const PropertyValue& properties, int32_t* outScore);
    virtual ZeltoReturn startWithService(uint32_t service, const PropertyValue& properties);
    virtual ZeltoReturn stop();
    virtual bool openWithOptions(uint32_t options);
    virtual void closeWithOptions(uint32_t options);
    virtual PropertyValue getPropertyForKey(const PropertyValue& key);
    virtual bool setProperty(const PropertyValue& value, const PropertyValue& key);
    virtual void setEventCallback(ZeltoHIDEventCallback callback, void* target, void* refcon);
    virtual void scheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>& queue);
    virtual void unscheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>& queue);
    virtual HIDEventRef copyEventWithType(uint32_t type, const HIDEvent* matching, uint32_t options);
    virtual ZeltoReturn setOutputEvent(const HIDEvent* event);

protected:
    // Builds both tables; the object starts with one reference.
    ZeltoHIDService();
    virtual ~ZeltoHIDService() = default;

    // Runs when the last reference goes, before the members are destroyed. Overrides let go of
    // their own resources and then call this, which frees the tables.
    virtual void dealloc();

private:
    ZeltoHIDServicePlugInInterface* _pluginInterface = nullptr;
    ZeltoHIDServiceInterface* _serviceInterface = nullptr;
    std::atomic<uint32_t> _referenceCount{1};
};

// One counted reference to a service, for closures that must keep it alive.
class ServiceReference {
public:
    explicit ServiceReference(ZeltoHIDService* service) noexcept : _service(service) {
        if (_service) _service->retain();
    }
    ServiceReference(const ServiceReference& other) noexcept : ServiceReference(other._service) {}
    ServiceReference(ServiceReference&& other) noexcept : _service(std::exchange(other._service, nullptr)) {}
    ServiceReference& operator=(ServiceReference other) noexcept {
        std::swap(_service, other._service);
        return *this;
    }
    ~ServiceReference() {
        if (_service) _service->release();
    }

private:
    ZeltoHIDService* _service;
};

}  // namespace ZeltoTouch

#include "Service/ZeltoIUnknown.h"

#include "Platform/DispatchQueue.h"
#include "Service/ZeltoHIDService.h"

namespace ZeltoTouch {

namespace {

ZeltoHIDService& service(void* self) { return *ZeltoHIDService::fromInterface(self); }

// The host passes "no value" as a null pointer.
const PropertyValue& valueOrNone(const PropertyValue* value) {
    static const PropertyValue none;
    return value ? *value : none;
}

}  // namespace

ZeltoReturn ZeltoIUnknown::QueryInterface(void* self, ZeltoUUID interfaceID, void** outInterface) {
    ZeltoHIDService& object = service(self);
    void* found = nullptr;
    if (interfaceID == kZeltoPlugInInterfaceID) {
        found = object.getPluginInterface();
    } else if (interfaceID == kZeltoHIDServiceInterfaceID) {
        found = object.getServiceInterface();
    } else {
        return kZeltoNoInterface;
    }
    object.retain();
    *outInterface = found;
    return kZeltoSuccess;
}

uint32_t ZeltoIUnknown::AddRef(void* self) { return service(self).retain(); }

uint32_t ZeltoIUnknown::Release(void* self) { return service(self).release(); }

ZeltoReturn ZeltoIUnknown::Probe(void* self, const PropertyValue* properties, uint32_t serviceHandle,
                                 int32_t* outScore) {
    return service(self).probeWithService(serviceHandle, valueOrNone(properties), outScore);
}

ZeltoReturn ZeltoIUnknown::Start(void* self, const PropertyValue* properties, uint32_t serviceHandle) {
    return service(self).startWithService(serviceHandle, valueOrNone(properties));
}

ZeltoReturn ZeltoIUnknown::Stop(void* self) { return service(self).stop(); }

bool ZeltoIUnknown::open(void* self, uint32_t options) { return service(self).openWithOptions(options); }

void ZeltoIUnknown::close(void* self, uint32_t options) { service(self).closeWithOptions(options); }

PropertyValue* ZeltoIUnknown::copyProperty(void* self, const PropertyValue* key) {
    PropertyValue value = service(self).getPropertyForKey(valueOrNone(key));
    return value ? new PropertyValue(std::move(value)) : nullptr;
}

bool ZeltoIUnknown::setProperty(void* self, const PropertyValue* key, const PropertyValue* value) {
    return service(self).setProperty(valueOrNone(value), valueOrNone(key));
}

void ZeltoIUnknown::setEventCallback(void* self, ZeltoHIDEventCallback callback, void* target, void* refcon) {
    service(self).setEventCallback(callback, target, refcon);
}

void ZeltoIUnknown::scheduleWithDispatchQueue(void* self, ZeltoDispatchQueue* queue) {
    const auto heldQueue = Platform::DispatchQueue::fromHandle(queue);
    service(self).scheduleWithDispatchQueue(heldQueue);
}

void ZeltoIUnknown::unscheduleFromDispatchQueue(void* self, ZeltoDispatchQueue* queue) {
    const auto heldQueue = Platform::DispatchQueue::fromHandle(queue);
    service(self).unscheduleWithDispatchQueue(heldQueue);
}

HIDEventRef* ZeltoIUnknown::copyEvent(void* self, uint32_t type, HIDEvent* matching, uint32_t options) {
    HIDEventRef event = service(self).copyEventWithType(type, matching, options);
    return event ? new HIDEventRef(std::move(event)) : nullptr;
}

ZeltoReturn ZeltoIUnknown::setOutputEvent(void* self, HIDEvent* event) {
    return service(self).setOutputEvent(event);
}

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>

#include "Host/HIDServicePlugIn.h"

namespace ZeltoTouch {

// The plain functions the interface tables point to. Each finds its service through the
// interface pointer and forwards to the service operation; temporaries made for the call are
// released when the function returns.
struct ZeltoIUnknown {
    static ZeltoReturn QueryInterface(void* self, ZeltoUUID interfaceID, void** outInterface);
    static uint32_t AddRef(void* self);
    static uint32_t Release(void* self);

    static ZeltoReturn Probe(void* self, const PropertyValue* properties, uint32_t service, int32_t* outScore);
    static ZeltoReturn Start(void* self, const PropertyValue* properties, uint32_t service);
    static ZeltoReturn Stop(void* self);

    static bool open(void* self, uint32_t options);
    static void close(void* self, uint32_t options);
    static PropertyValue* copyProperty(void* self, const PropertyValue* key);
    static bool setProperty(void* self, const PropertyValue* key, const PropertyValue* value);
    static void setEventCallback(void* self, ZeltoHIDEventCallback callback, void* target, void* refcon);
    static void scheduleWithDispatchQueue(void* self, ZeltoDispatchQueue* queue);
    static void unscheduleFromDispatchQueue(void* self, ZeltoDispatchQueue* queue);
    static HIDEventRef* copyEvent(void* self, uint32_t type, HIDEvent* matching, uint32_t options);
    static ZeltoReturn setOutputEvent(void* self, HIDEvent* event);
};

}  // namespace ZeltoTouch

#pragma once

// The boundary between the host event system and a HID service plug-in. Both sides compile
// against this header: the host loads the module, calls the exported factory, and from then on
// reaches the service only through the two tables of plain function pointers below.
//
// Interface pointers: what either side holds for an interface is the address of the member that
// points to the table (a pointer to a pointer to the table). Every table function takes that
// interface pointer as its first argument; word 0 of each table holds the service object.
//
// Ownership across the boundary:
// - PropertyValue arguments are borrowed for the call; null stands for "no value".
// - copyProperty returns a heap-allocated PropertyValue that the caller owns (delete it), or null.
// - HIDEvent arguments (callback, copyEvent's matching event, setOutputEvent) are borrowed for
//   the call; a receiver that keeps an event copies it.
// - copyEvent returns a heap-allocated shared reference that the caller owns (delete it), or null.
// - The host queue is an opaque handle; the platform maps it to its serial queue.

#include <cstddef>
#include <cstdint>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"

// 16-byte interface and type identifier, passed by value.
struct ZeltoUUID {
    uint8_t bytes[16];
};
static_assert(sizeof(ZeltoUUID) == 16);

constexpr bool operator==(const ZeltoUUID& a, const ZeltoUUID& b) noexcept {
    for (size_t i = 0; i < sizeof(a.bytes); ++i) {
        if (a.bytes[i] != b.bytes[i]) return false;
    }
    return true;
}

// 68980EB2-22FC-42FD-924C-3BB70C05B7B0: the type of a HID service plug-in (factory argument).
inline constexpr ZeltoUUID kZeltoHIDServicePlugInTypeID = {
    {0x68, 0x98, 0x0E, 0xB2, 0x22, 0xFC, 0x42, 0xFD, 0x92, 0x4C, 0x3B, 0xB7, 0x0C, 0x05, 0xB7, 0xB0}};
// 36FF61BD-29F4-4546-89F8-5089747E543E: the plug-in interface (probe, start, stop).
inline constexpr ZeltoUUID kZeltoPlugInInterfaceID = {
    {0x36, 0xFF, 0x61, 0xBD, 0x29, 0xF4, 0x45, 0x46, 0x89, 0xF8, 0x50, 0x89, 0x74, 0x7E, 0x54, 0x3E}};
// 5B2D776F-BFE4-434D-94FA-83B32BB264AF: the HID service interface.
inline constexpr ZeltoUUID kZeltoHIDServiceInterfaceID = {
    {0x5B, 0x2D, 0x77, 0x6F, 0xBF, 0xE4, 0x43, 0x4D, 0x94, 0xFA, 0x83, 0xB3, 0x2B, 0xB2, 0x64, 0xAF}};

// Status codes at the boundary; 0 is success.
using ZeltoReturn = int32_t;
inline constexpr ZeltoReturn kZeltoSuccess = 0;
inline constexpr ZeltoReturn kZeltoNoResources = static_cast<ZeltoReturn>(0xE00002BEu);
inline constexpr ZeltoReturn kZeltoUnsupported = static_cast<ZeltoReturn>(0xE00002C7u);
inline constexpr ZeltoReturn kZeltoNoInterface = static_cast<ZeltoReturn>(0x80000004u);

// The host's serial queue, opaque to the plug-in.
struct ZeltoDispatchQueue;

// Receives the service's events on the host queue: (target, refcon, sender, event, options).
using ZeltoHIDEventCallback = void (*)(void* target, void* refcon, void* sender, ZeltoTouch::HIDEvent* event,
                                       uint32_t options);

using ZeltoQueryInterfaceFunction = ZeltoReturn (*)(void* self, ZeltoUUID interfaceID, void** outInterface);
using ZeltoAddRefFunction = uint32_t (*)(void* self);   // the count after the addition
using ZeltoReleaseFunction = uint32_t (*)(void* self);  // the count after the drop

struct ZeltoHIDServicePlugInInterface {
    void* object;
    ZeltoQueryInterfaceFunction QueryInterface;
    ZeltoAddRefFunction AddRef;
    ZeltoReleaseFunction Release;
    uint16_t version;   // 1
    uint16_t revision;  // 0
    uint32_t reserved;  // zero padding
    ZeltoReturn (*Probe)(void* self, const ZeltoTouch::PropertyValue* properties, uint32_t service,
                         int32_t* outScore);
    ZeltoReturn (*Start)(void* self, const ZeltoTouch::PropertyValue* properties, uint32_t service);
    ZeltoReturn (*Stop)(void* self);
};

struct ZeltoHIDServiceInterface {
    void* object;
    ZeltoQueryInterfaceFunction QueryInterface;
    ZeltoAddRefFunction AddRef;
    ZeltoReleaseFunction Release;
    bool (*open)(void* self, uint32_t options);
    void (*close)(void* self, uint32_t options);
    ZeltoTouch::PropertyValue* (*copyProperty)(void* self, const ZeltoTouch::PropertyValue* key);
    bool (*setProperty)(void* self, const ZeltoTouch::PropertyValue* key, const ZeltoTouch::PropertyValue* value);
    void (*setEventCallback)(void* self, ZeltoHIDEventCallback callback, void* target, void* refcon);
    void (*scheduleWithDispatchQueue)(void* self, ZeltoDispatchQueue* queue);
    void (*unscheduleFromDispatchQueue)(void* self, ZeltoDispatchQueue* queue);
    ZeltoTouch::HIDEventRef* (*copyEvent)(void* self, uint32_t type, ZeltoTouch::HIDEvent* matching,
                                          uint32_t options);
    ZeltoReturn (*setOutputEvent)(void* self, ZeltoTouch::HIDEvent* event);
};

static_assert(sizeof(void*) == 8, "the tables are laid out in 64-bit words");
static_assert(sizeof(ZeltoHIDServicePlugInInterface) == 64);
static_assert(offsetof(ZeltoHIDServicePlugInInterface, QueryInterface) == 8);
static_assert(offsetof(ZeltoHIDServicePlugInInterface, version) == 32);
static_assert(offsetof(ZeltoHIDServicePlugInInterface, revision) == 34);
static_assert(offsetof(ZeltoHIDServicePlugInInterface, Probe) == 40);
static_assert(offsetof(ZeltoHIDServicePlugInInterface, Stop) == 56);
static_assert(sizeof(ZeltoHIDServiceInterface) == 104);
static_assert(offsetof(ZeltoHIDServiceInterface, open) == 32);
static_assert(offsetof(ZeltoHIDServiceInterface, copyProperty) == 48);
static_assert(offsetof(ZeltoHIDServiceInterface, scheduleWithDispatchQueue) == 72);
static_assert(offsetof(ZeltoHIDServiceInterface, setOutputEvent) == 96);

// The factory every plug-in module exports under kZeltoHIDServiceFactoryName. It returns the
// plug-in interface pointer holding one reference for the caller, or null for any type other
// than kZeltoHIDServicePlugInTypeID. The allocator is unused and may be null.
using ZeltoHIDServiceFactoryFunction = void* (*)(void* allocator, ZeltoUUID typeID);
inline constexpr const char* kZeltoHIDServiceFactoryName = "ZeltoTouchHIDServiceFactory";

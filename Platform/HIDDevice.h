#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "Host/HIDServicePlugIn.h"
#include "Host/PropertyValue.h"
#include "Platform/RunLoop.h"

namespace ZeltoTouch::Platform {

enum HIDReportType : uint32_t {
    kHIDReportTypeInput = 0,
    kHIDReportTypeOutput = 1,
    kHIDReportTypeFeature = 2,
};

// Receives one input report: (context, result, sender, report type, report ID, report bytes,
// report length, device timestamp in mach time). The bytes are in the caller-owned buffer
// given at registration and are valid for the call.
using HIDInputReportCallback = void (*)(void* context, ZeltoReturn result, void* sender, uint32_t reportType,
                                        uint32_t reportID, uint8_t* report, uint64_t reportLength,
                                        uint64_t timestampMach);

// Access to one HID device, as the host provides it to a service. Created from a service handle
// through DeviceRegistry. open, close and the property and feature report calls may come from
// any thread; registration and run-loop scheduling come from the thread whose run loop the
// reports are delivered on.
class HIDDevice {
public:
    virtual ~HIDDevice() = default;

    virtual ZeltoReturn open(uint32_t options) = 0;  // 0 on success
    virtual void close(uint32_t options) = 0;

    // Reads report reportID of type into buffer; length holds the buffer size on entry and the
    // report's size on return. 0 on success, a failure status otherwise.
    virtual ZeltoReturn getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) = 0;

    // The device's own properties; a missing key yields no value.
    virtual PropertyValue copyProperty(std::string_view key) const = 0;
    // true when the device took the value.
    virtual bool setProperty(std::string_view key, const PropertyValue& value) = 0;

    // Input reports go into buffer (length bytes; a longer report is cut to the buffer and
    // delivered with a failure result) and then to callback with context. A null callback
    // unregisters.
    virtual void registerInputReportCallback(uint8_t* buffer, uint64_t length, HIDInputReportCallback callback,
                                             void* context) = 0;

    // Reports are delivered on runLoop while it runs in mode.
    virtual void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) = 0;
    virtual void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) = 0;
};

}  // namespace ZeltoTouch::Platform

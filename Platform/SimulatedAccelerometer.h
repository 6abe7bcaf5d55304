#pragma once

#include <atomic>
#include <map>
#include <mutex>

#include "Platform/EventSystemService.h"

namespace ZeltoTouch::Platform {

// The host's accelerometer: matches "PrimaryUsagePage" 65280 and "PrimaryUsage" 3 and sends
// accelerometer events (type 13, in g: the device lying flat, gravity on -Z, with a little
// noise) every "ReportInterval" microseconds (a positive number; 10000.0 to begin with). A
// stream takes the interval that is set when it opens.
class SimulatedAccelerometer final : public EventSystemService {
public:
    static constexpr double kDefaultReportIntervalMicroseconds = 10000.0;

    SimulatedAccelerometer();

    PropertyValue copyProperty(std::string_view key) const override;
    // "ReportInterval" takes a positive number; the matching keys and "Product" are read-only.
    bool setProperty(std::string_view key, const PropertyValue& value) override;
    std::unique_ptr<EventStream> openStream(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode,
                                            HIDEventHandler handler) override;

private:
    mutable std::mutex _lock;
    std::map<std::string, PropertyValue, std::less<>> _properties;
    std::atomic<uint64_t> _streamCount{0};
};

}  // namespace ZeltoTouch::Platform

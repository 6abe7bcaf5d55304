#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Platform/RunLoop.h"

namespace ZeltoTouch::Platform {

using HIDEventHandler = std::function<void(const HIDEventRef& event)>;

// Keeps a service's events flowing while it exists; destroy it (on the run loop's thread) to stop.
class EventStream {
public:
    virtual ~EventStream() = default;
};

// A service of the host event system (an accelerometer, say) that clients find by matching
// its properties and receive events from on their run loop.
class EventSystemService {
public:
    virtual ~EventSystemService() = default;

    virtual PropertyValue copyProperty(std::string_view key) const = 0;
    virtual bool setProperty(std::string_view key, const PropertyValue& value) = 0;

    // True when every entry of the matching dictionary equals the service's property.
    bool matches(const PropertyValue& matching) const;

    // Starts delivering events to handler on runLoop in mode; call on the run loop's thread.
    virtual std::unique_ptr<EventStream> openStream(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode,
                                                    HIDEventHandler handler) = 0;
};

// The services the host event system offers, in the order they were added. Thread-safe.
// Starts with one SimulatedAccelerometer; tests may remove it to exercise "no matching service".
// (Process-wide under the same conditions as DeviceRegistry.)
class EventServiceRegistry {
public:
    static EventServiceRegistry& shared();

    void add(std::shared_ptr<EventSystemService> service);
    void remove(const std::shared_ptr<EventSystemService>& service);
    std::vector<std::shared_ptr<EventSystemService>> services() const;

    // While refused, creating an event-system client fails (tests).
    void setClientCreationRefused(bool refused);
    bool clientCreationRefused() const;

private:
    EventServiceRegistry();

    mutable std::mutex _lock;
    std::vector<std::shared_ptr<EventSystemService>> _services;
    bool _clientCreationRefused = false;
};

}  // namespace ZeltoTouch::Platform

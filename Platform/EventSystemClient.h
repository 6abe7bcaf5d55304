#pragma once

#include <memory>
#include <string>
#include <vector>

#include "Platform/EventSystemService.h"

namespace ZeltoTouch::Platform {

// A client of the host event system: finds services by matching, and receives the events of
// the matching services on a run loop. Used from one thread, the one whose run loop it is
// scheduled on.
class EventSystemClient {
public:
    static constexpr int kClientTypeMonitor = 1;  // the only type offered

    // Null for an unknown type, or when the event system refuses clients.
    static std::unique_ptr<EventSystemClient> create(int clientType);
    ~EventSystemClient();

    void setMatching(PropertyValue matching);
    // The services that match, in the event system's order; none before setMatching.
    std::vector<std::shared_ptr<EventSystemService>> copyMatchingServices() const;

    void registerEventHandler(HIDEventHandler handler);
    void unregisterEventHandler();

    // Events of the services matching now arrive on runLoop in mode, while a handler is registered.
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode);
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode);

private:
    EventSystemClient() = default;
    void deliver(const HIDEventRef& event) const;

    PropertyValue _matching;
    std::shared_ptr<HIDEventHandler> _handler;  // a delivery in progress keeps its own reference
    std::vector<std::unique_ptr<EventStream>> _streams;
    std::shared_ptr<RunLoop> _runLoop;
    std::string _mode;
};

}  // namespace ZeltoTouch::Platform

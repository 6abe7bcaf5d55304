#include "Platform/EventSystemClient.h"

namespace ZeltoTouch::Platform {

std::unique_ptr<EventSystemClient> EventSystemClient::create(int clientType) {
    if (clientType != kClientTypeMonitor || EventServiceRegistry::shared().clientCreationRefused()) return nullptr;
    return std::unique_ptr<EventSystemClient>(new EventSystemClient);
}

EventSystemClient::~EventSystemClient() { _streams.clear(); }

void EventSystemClient::setMatching(PropertyValue matching) { _matching = std::move(matching); }

std::vector<std::shared_ptr<EventSystemService>> EventSystemClient::copyMatchingServices() const {
    std::vector<std::shared_ptr<EventSystemService>> matching;
    if (!_matching.hasValue()) return matching;
    for (auto& service : EventServiceRegistry::shared().services()) {
        if (service->matches(_matching)) matching.push_back(service);
    }
    return matching;
}

void EventSystemClient::registerEventHandler(HIDEventHandler handler) {
    _handler = handler ? std::make_shared<HIDEventHandler>(std::move(handler)) : nullptr;
}

void EventSystemClient::unregisterEventHandler() { _handler.reset(); }

void EventSystemClient::scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    _streams.clear();
    _runLoop = runLoop;
    _mode = mode;
    for (auto& service : copyMatchingServices()) {
        _streams.push_back(service->openStream(runLoop, mode, [this](const HIDEventRef& event) { deliver(event); }));
    }
}

void EventSystemClient::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    if (runLoop != _runLoop || mode != _mode) return;
    _streams.clear();
    _runLoop.reset();
    _mode.clear();
}

void EventSystemClient::deliver(const HIDEventRef& event) const {
    if (auto handler = _handler) (*handler)(event);  // the handler may unregister itself
}

}  // namespace ZeltoTouch::Platform

#include "Platform/EventSystemService.h"

#include <algorithm>

#include "Platform/SimulatedAccelerometer.h"

namespace ZeltoTouch::Platform {

bool EventSystemService::matches(const PropertyValue& matching) const {
    if (!matching.isDictionary()) return false;
    for (const std::string& key : matching.keys()) {
        if (!(copyProperty(key) == matching.get(key))) return false;
    }
    return true;
}

EventServiceRegistry& EventServiceRegistry::shared() {
    static EventServiceRegistry registry;
    return registry;
}

EventServiceRegistry::EventServiceRegistry() { _services.push_back(std::make_shared<SimulatedAccelerometer>()); }

void EventServiceRegistry::add(std::shared_ptr<EventSystemService> service) {
    std::lock_guard lock(_lock);
    _services.push_back(std::move(service));
}

void EventServiceRegistry::remove(const std::shared_ptr<EventSystemService>& service) {
    std::lock_guard lock(_lock);
    std::erase(_services, service);
}

std::vector<std::shared_ptr<EventSystemService>> EventServiceRegistry::services() const {
    std::lock_guard lock(_lock);
    return _services;
}

void EventServiceRegistry::setClientCreationRefused(bool refused) {
    std::lock_guard lock(_lock);
    _clientCreationRefused = refused;
}

bool EventServiceRegistry::clientCreationRefused() const {
    std::lock_guard lock(_lock);
    return _clientCreationRefused;
}

}  // namespace ZeltoTouch::Platform

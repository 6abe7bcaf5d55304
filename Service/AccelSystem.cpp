#include "Service/AccelSystem.h"

#include <stdexcept>

#include "Host/PropertyValue.h"
#include "Platform/EventSystemClient.h"
#include "Platform/RunLoop.h"

namespace ZeltoTouch {

namespace {

// The accelerometer's usage on the host's event system.
PropertyValue accelerometerMatching() {
    return PropertyValue::dictionary({
        {"PrimaryUsagePage", PropertyValue::fromUInt32(0xFF00)},
        {"PrimaryUsage", PropertyValue::fromUInt32(3)},
    });
}

}  // namespace

AccelSystem::AccelSystem(std::shared_ptr<Platform::RunLoop> runLoop, const std::string& runLoopMode, uint32_t rate,
                         Handler handler) {
    if (!runLoop || runLoopMode.empty() || !handler || rate == 0) throw std::invalid_argument("nil argument");
    try {
        subscribe(std::move(runLoop), runLoopMode, rate, std::move(handler));
    } catch (...) {
        cleanup();  // no destructor runs for a constructor that throws
        throw;
    }
}

AccelSystem::~AccelSystem() { cleanup(); }

void AccelSystem::subscribe(std::shared_ptr<Platform::RunLoop> runLoop, const std::string& runLoopMode, uint32_t rate,
                            Handler handler) {
    _client = Platform::EventSystemClient::create(Platform::EventSystemClient::kClientTypeMonitor);
    if (!_client) throw std::runtime_error("AccelSystem: creating the event-system client returned nothing");
    _client->setMatching(accelerometerMatching());

    const auto services = _client->copyMatchingServices();
    if (services.empty()) throw std::runtime_error("AccelSystem: the list of matching services was empty");
    _service = services.front();
    _runLoop = std::move(runLoop);
    _runLoopMode = runLoopMode;

    _service->setProperty("ReportInterval", PropertyValue::fromDouble(reportIntervalMicroseconds(rate)));
    _client->registerEventHandler([handler = std::move(handler)](const HIDEventRef& event) {
        if (event && event->type() == kHIDEventTypeAccelerometer) handler(*event);
    });
    _client->scheduleWithRunLoop(_runLoop, _runLoopMode);
}

void AccelSystem::cleanup() {
    if (!_runLoop) return;
    _client->unscheduleFromRunLoop(_runLoop, _runLoopMode);
    _client->unregisterEventHandler();
    _runLoop = nullptr;
}

}  // namespace ZeltoTouch

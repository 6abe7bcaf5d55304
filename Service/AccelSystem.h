#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "Host/HIDEvent.h"

namespace ZeltoTouch {

namespace Platform {
class EventSystemClient;
class EventSystemService;
class RunLoop;
}  // namespace Platform

// A subscription to the host's accelerometer: finds the accelerometer service through an
// event-system client, asks it for a report rate and passes each accelerometer event to the
// handler on the given run loop, in the given mode. Create, clean up and destroy it on that
// run loop's thread.
class AccelSystem {
public:
    using Handler = std::function<void(const HIDEvent& event)>;

    // Throws std::invalid_argument("nil argument") for a missing run loop, mode or handler
    // (and for a rate of 0), and std::runtime_error when the client cannot be created or no
    // accelerometer service matches.
    AccelSystem(std::shared_ptr<Platform::RunLoop> runLoop, const std::string& runLoopMode, uint32_t rate,
                Handler handler);
    ~AccelSystem();

    AccelSystem(const AccelSystem&) = delete;
    AccelSystem& operator=(const AccelSystem&) = delete;

    // Ends event delivery; safe to call more than once.
    void cleanup();

    // The report interval asked of the service for rate samples per second, in microseconds.
    static double reportIntervalMicroseconds(uint32_t rate) noexcept { return (1.0 / rate) * 1000000.0; }

private:
    void subscribe(std::shared_ptr<Platform::RunLoop> runLoop, const std::string& runLoopMode, uint32_t rate,
                   Handler handler);

    std::unique_ptr<Platform::EventSystemClient> _client;
    std::shared_ptr<Platform::EventSystemService> _service;
    std::shared_ptr<Platform::RunLoop> _runLoop;  // null once cleaned up
    std::string _runLoopMode;
};

}  // namespace ZeltoTouch

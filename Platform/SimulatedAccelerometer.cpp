#include "Platform/SimulatedAccelerometer.h"

#include "Platform/FingerModel.h"
#include "Platform/TimerSource.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {

namespace {

constexpr std::string_view kReportInterval = "ReportInterval";
constexpr double kNoiseG = 0.004;

class AccelerometerStream final : public EventStream {
public:
    AccelerometerStream(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode, double intervalMicroseconds,
                        HIDEventHandler handler, uint64_t seed)
        : _handler(std::move(handler)),
          _noise(seed),
          _timer(std::chrono::nanoseconds(static_cast<int64_t>(intervalMicroseconds * 1000.0)), [this] { sample(); }) {
        _timer.attach(runLoop, mode);
    }

private:
    void sample() {
        const double x = 0.01 + kNoiseG * _noise.next();
        const double y = -0.02 + kNoiseG * _noise.next();
        const double z = -1.0 + kNoiseG * _noise.next();
        if (HIDEventRef event = HIDEvent::createAccelerometerEvent(Util::hostClock().machTimeNow(), x, y, z, 0)) {
            _handler(event);
        }
    }

    HIDEventHandler _handler;
    NoiseSource _noise;
    TimerSource _timer;  // last: detached before the rest goes
};

}  // namespace

SimulatedAccelerometer::SimulatedAccelerometer() {
    _properties.emplace("PrimaryUsagePage", PropertyValue::fromUInt32(65280));
    _properties.emplace("PrimaryUsage", PropertyValue::fromUInt32(3));
    _properties.emplace("Product", PropertyValue::string("ZeltoTouch Simulated Accelerometer"));
    _properties.emplace(kReportInterval, PropertyValue::fromDouble(kDefaultReportIntervalMicroseconds));
}

PropertyValue SimulatedAccelerometer::copyProperty(std::string_view key) const {
    std::lock_guard lock(_lock);
    auto found = _properties.find(key);
    return found == _properties.end() ? PropertyValue() : found->second;
}

bool SimulatedAccelerometer::setProperty(std::string_view key, const PropertyValue& value) {
    if (key != kReportInterval || !value.isNumber() || !(value.toDouble() > 0)) return false;
    std::lock_guard lock(_lock);
    _properties.insert_or_assign(std::string(kReportInterval), PropertyValue::fromDouble(value.toDouble()));
    return true;
}

std::unique_ptr<EventStream> SimulatedAccelerometer::openStream(const std::shared_ptr<RunLoop>& runLoop,
                                                                const std::string& mode, HIDEventHandler handler) {
    const double interval = copyProperty(kReportInterval).toDouble();
    return std::make_unique<AccelerometerStream>(runLoop, mode, interval, std::move(handler), ++_streamCount);
}

}  // namespace ZeltoTouch::Platform

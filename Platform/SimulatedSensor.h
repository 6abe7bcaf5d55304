#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "Platform/HIDDevice.h"
#include "Platform/SensorReportGenerator.h"
#include "Platform/TimerSource.h"

namespace ZeltoTouch::Platform {

// A touch sensor that plays a gesture script in real time. Once it is open, has a report
// callback and is scheduled on a run loop, a timer on that run loop delivers the script's
// reports one frame period apart (a reset together with the frame that follows it), each into
// the registered buffer, with the mach time of delivery as device timestamp. Before all three
// hold the script does not advance; at its end the sensor falls silent.
//
// It answers the firmware's feature reports with fixed plausible bytes (failures can be set per
// report ID) and keeps a property store with "Product", "VendorID", "ProductID" and
// "SerialNumber" (read-only); other keys can be written freely.
class SimulatedSensor final : public HIDDevice {
public:
    static constexpr uint32_t kFactoryResetHoldDurationMs = 10000;
    static constexpr ZeltoReturn kStatusNotFound = static_cast<ZeltoReturn>(0xE00002F0u);     // unknown report ID
    static constexpr ZeltoReturn kStatusBadArgument = static_cast<ZeltoReturn>(0xE00002C2u);  // buffer too small
    static constexpr ZeltoReturn kStatusOverrun = static_cast<ZeltoReturn>(0xE00002E8u);  // report cut to the buffer

    explicit SimulatedSensor(GestureScript script = {}, SensorReportGenerator::Options options = {});
    ~SimulatedSensor() override;

    // Test controls.
    void failFeatureReport(uint32_t reportID, ZeltoReturn status);
    void clearFeatureReportFailures();
    void setOpenStatus(ZeltoReturn status);
    bool isOpen() const noexcept { return _open.load(); }
    uint64_t deliveredReportCount() const noexcept { return _deliveredReports.load(); }
    bool playbackFinished() const noexcept { return _playbackFinished.load(); }

    // HIDDevice.
    ZeltoReturn open(uint32_t options) override;
    void close(uint32_t options) override;
    ZeltoReturn getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) override;
    PropertyValue copyProperty(std::string_view key) const override;
    bool setProperty(std::string_view key, const PropertyValue& value) override;
    void registerInputReportCallback(uint8_t* buffer, uint64_t length, HIDInputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) override;

private:
    struct Registration {
        uint8_t* buffer = nullptr;
        uint64_t length = 0;
        HIDInputReportCallback callback = nullptr;
        void* context = nullptr;
    };

    void deliverFrame();
    void deliver(const SimulatedReport& report, const Registration& registration);

    const uint32_t _framePeriodMs;
    SensorReportGenerator _generator;  // the run loop's thread only
    uint64_t _playbackTimeMs = 0;      // the run loop's thread only

    mutable std::mutex _lock;
    Registration _registration;
    std::map<uint32_t, ZeltoReturn> _featureReportFailures;
    std::map<std::string, PropertyValue, std::less<>> _properties;
    ZeltoReturn _openStatus = kZeltoSuccess;

    std::unique_ptr<TimerSource> _timer;
    std::shared_ptr<RunLoop> _runLoop;
    std::string _runLoopMode;

    std::atomic<bool> _open{false};
    std::atomic<uint64_t> _deliveredReports{0};
    std::atomic<bool> _playbackFinished{false};
};

}  // namespace ZeltoTouch::Platform

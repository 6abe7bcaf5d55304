#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Service/AccelBookkeeping.h"
#include "Service/ZeltoHIDService.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Log.h"

namespace ZeltoTouch {

namespace Platform {
class DispatchQueue;
class HIDDevice;
class RunLoop;
class Semaphore;
}  // namespace Platform

// Where and how events go to the host.
struct DispatchEventInfo {
    std::shared_ptr<Platform::DispatchQueue> queue;
    ZeltoHIDEventCallback callback = nullptr;
    void* target = nullptr;
    void* refcon = nullptr;
    void* sender = nullptr;  // the service interface pointer
};

// The service the host drives for one touch sensor. It owns the processing chain (a recording
// stage in front of the pipeline), reads the device's input reports on its own real-time thread
// while scheduled, hands the resulting events to the host's queue, and answers properties.
//
// Threads: the host's calling thread runs the lifecycle, scheduling and properties; the input
// report thread runs reports, probes and accelerometer samples; the host's queue receives the
// events. _pipelineLock guards the pipeline, the recording and _accel, and is never nested.
class ZeltoTouchHIDService final : public ZeltoHIDService {
public:
    // The run-loop mode in which the input report thread runs.
    static constexpr const char* kInputReportsRunLoopMode = "kHandleInputReportsRunLoopMode";
    static constexpr uint64_t kMaxRecordedFrames = 4350;
    // A "Recording" read makes room for the frames recorded so far plus this many, for the
    // reports that can arrive before it takes the lock again to copy them.
    static constexpr size_t kFramesArrivingDuringRecordingRead = 64;

    // A new service holding one reference (the caller's).
    static ZeltoTouchHIDService* create() { return new ZeltoTouchHIDService; }

    ZeltoReturn probeWithService(uint32_t service, const PropertyValue& properties, int32_t* outScore) override;
    ZeltoReturn startWithService(uint32_t service, const PropertyValue& properties) override;
    ZeltoReturn stop() override;
    bool openWithOptions(uint32_t options) override;
    void closeWithOptions(uint32_t options) override;

    PropertyValue getPropertyForKey(const PropertyValue& key) override;
    bool setProperty(const PropertyValue& value, const PropertyValue& key) override;

    void setEventCallback(ZeltoHIDEventCallback callback, void* target, void* refcon) override;
    void scheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>& queue) override;
    void unscheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>& queue) override;
    HIDEventRef copyEventWithType(uint32_t type, const HIDEvent* matching, uint32_t options) override;
    ZeltoReturn setOutputEvent(const HIDEvent* event) override;

    // The accelerometer handler: buffers or records one accelerometer event's sample.
    void handleAccelerometerEvent(const HIDEvent& event);

private:
    friend class ZeltoTouchHIDServiceInspector;  // tests look at the pipeline's hooks and _accel

    ZeltoTouchHIDService();
    ~ZeltoTouchHIDService() override = default;
    void dealloc() override;

    // The input report thread's body and its run loop.
    void runInputReportThread(const DispatchEventInfo& info, const std::shared_ptr<Platform::HIDDevice>& device,
                              const std::shared_ptr<Platform::Semaphore>& signal);
    void handleInputReports(DispatchEventInfo info, const std::shared_ptr<Platform::HIDDevice>& device);
    // Stops a running input report thread and waits until it has ended.
    void stopInputReportThread();

    void installProbes(const DispatchEventInfo& info);
    void removeProbes();
    void handleHIDEvents(const DispatchEventInfo& info, const HIDEventList& events);
    void dispatchEvents(const DispatchEventInfo& info, const HIDEventList& events) const;

    // The report path: one input report into the recording, stamped with the processing time.
    static void inputReportCallback(void* context, ZeltoReturn result, void* sender, uint32_t reportType,
                                    uint32_t reportID, uint8_t* report, uint64_t reportLength, uint64_t timestampMach);
    void handleInputReport(uint32_t reportType, uint8_t reportID, const uint8_t* report, uint64_t reportLength,
                           uint64_t deviceTimestamp);

    PropertyValue firmwareDebugReports() const;
    PropertyValue factoryResetHoldDuration() const;
    PropertyValue recordingJSON();
    PropertyValue servicePluginDebug();

    const Log _log;
    std::shared_ptr<Platform::HIDDevice> _zeltoDevice;
    std::shared_ptr<Platform::RunLoop> _inputReportRunLoop;
    std::shared_ptr<Platform::Semaphore> _inputReportThreadSignal;
    // Joined when unscheduling, so no code of this module runs on it once that returns.
    std::thread _inputReportThread;
    DispatchEventInfo _dispatchEventInfo;
    std::mutex _pipelineLock;
    std::shared_ptr<Pipeline> _pipeline;
    PipelineRecording _recording;
    AccelBookkeeping _accel;
};

}  // namespace ZeltoTouch

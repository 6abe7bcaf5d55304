// The input report thread and event dispatch of ZeltoTouchHIDService.

#include <array>
#include <optional>
#include <system_error>
#include <utility>

#include "Platform/DispatchQueue.h"
#include "Platform/HIDDevice.h"
#include "Platform/RunLoop.h"
#include "Platform/Semaphore.h"
#include "Platform/Thread.h"
#include "Platform/Trace.h"
#include "Service/AccelSystem.h"
#include "Service/ZeltoTouchHIDService.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch {

namespace {

enum TraceCode : uint32_t {
    kTraceInputReport = 0x2B150180,
    kTraceDispatchBatch = 0x2B150184,
    kTraceDispatchEvent = 0x2B150188,
    kTraceFirmwareEvent = 0x2B15018C,
};

constexpr int kInputReportThreadPriority = 63;
constexpr uint32_t kAccelSamplesPerSecond = 100;
constexpr size_t kReportBufferSize = 512;

template <typename Signature, typename Function>
Pipeline::Probe<Signature> makeProbe(Function function) {
    return std::make_shared<std::function<Signature>>(std::move(function));
}

uint64_t byteOrZero(const uint8_t* bytes, uint64_t length, uint64_t index) {
    return index < length ? bytes[index] : 0;
}

uint64_t bigEndianContext(const InputReport::FirmwareEvent& event) {
    uint64_t context = 0;
    for (uint8_t byte : event.context) context = (context << 8) | byte;
    return context;
}

}  // namespace

void ZeltoTouchHIDService::setEventCallback(ZeltoHIDEventCallback callback, void* target, void* refcon) {
    _log.debug("%@", "setEventCallback:target:refcon:");
    _dispatchEventInfo.callback = callback;
    _dispatchEventInfo.target = target;
    _dispatchEventInfo.refcon = refcon;
}

void ZeltoTouchHIDService::scheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>& queue) {
    _log.debug("%@", "scheduleWithDispatchQueue:");
    // A second schedule replaces the first: one thread per service at most.
    stopInputReportThread();

    _dispatchEventInfo.queue = queue;
    _dispatchEventInfo.sender = getServiceInterface();
    if (!queue) {
        _log.error("scheduleWithDispatchQueue: no queue; input reports are not read");
        return;
    }
    if (!_zeltoDevice) {
        _log.error("scheduleWithDispatchQueue: no device (not started); input reports are not read");
        return;
    }
    if (!_dispatchEventInfo.callback) _log.error("scheduleWithDispatchQueue: no event callback; events are dropped");

    const DispatchEventInfo info = _dispatchEventInfo;
    const auto signal = std::make_shared<Platform::Semaphore>(0);
    _inputReportThreadSignal = signal;
    try {
        _inputReportThread = std::thread(
            [this, self = ServiceReference(this), info, device = _zeltoDevice, signal] {
                runInputReportThread(info, device, signal);
            });
    } catch (const std::system_error& error) {
        _log.error("Failed to start the input report thread: %s", error.what());
        _inputReportThreadSignal = nullptr;
        return;
    }
    signal->wait();
}

void ZeltoTouchHIDService::unscheduleWithDispatchQueue(const std::shared_ptr<Platform::DispatchQueue>&) {
    _log.debug("%@", "unscheduleWithDispatchQueue:");
    stopInputReportThread();
    _dispatchEventInfo.queue = nullptr;
}

void ZeltoTouchHIDService::stopInputReportThread() {
    if (_inputReportRunLoop) {
        _log.debug("signalling input report thread to exit");
        const auto runLoop = std::exchange(_inputReportRunLoop, nullptr);
        // Queued in the thread's own mode, the stop is not lost even if the loop is not turning yet.
        runLoop->perform(kInputReportsRunLoopMode, [] { Platform::RunLoop::current()->stop(); });
        runLoop->wakeUp();
        _log.debug("waiting for input report thread to exit");
        _inputReportThreadSignal->wait();
        _inputReportThreadSignal = nullptr;
        _log.debug("input report thread exited");
    }
    if (_inputReportThread.joinable()) _inputReportThread.join();
}

void ZeltoTouchHIDService::runInputReportThread(const DispatchEventInfo& info,
                                                const std::shared_ptr<Platform::HIDDevice>& device,
                                                const std::shared_ptr<Platform::Semaphore>& signal) {
    Platform::setCurrentThreadName("zelto-input");
    _log.debug("input report thread start");
    _inputReportRunLoop = Platform::RunLoop::current();
    signal->signal();
    handleInputReports(info, device);
    signal->signal();
    _log.debug("input report thread end");
}

void ZeltoTouchHIDService::handleInputReports(DispatchEventInfo info,
                                              const std::shared_ptr<Platform::HIDDevice>& device) {
    if (const int status = Platform::setRealtimeRoundRobin(kInputReportThreadPriority); status != 0) {
        _log.error("pthread_setschedparam failed: %d", status);
    }

    const auto runLoop = Platform::RunLoop::current();
    std::optional<AccelSystem> accel;
    try {
        accel.emplace(runLoop, kInputReportsRunLoopMode, kAccelSamplesPerSecond,
                      [this](const HIDEvent& event) { handleAccelerometerEvent(event); });
    } catch (const std::exception& error) {
        _log.error("Failed to create accel system: %s", error.what());
    }

    installProbes(info);

    std::array<uint8_t, kReportBufferSize> reportBuffer{};
    device->registerInputReportCallback(reportBuffer.data(), reportBuffer.size(), inputReportCallback, this);
    device->scheduleWithRunLoop(runLoop, kInputReportsRunLoopMode);

    runLoop->runInMode(kInputReportsRunLoopMode);

    device->unscheduleFromRunLoop(runLoop, kInputReportsRunLoopMode);
    device->registerInputReportCallback(reportBuffer.data(), reportBuffer.size(), nullptr, nullptr);

    removeProbes();
}

void ZeltoTouchHIDService::installProbes(const DispatchEventInfo& info) {
    std::lock_guard lock(_pipelineLock);
    Pipeline& pipeline = *_pipeline;
    using Bytes = void(uint64_t, const uint8_t*, uint64_t);

    pipeline.inputReportProbe = makeProbe<Bytes>([this](uint64_t, const uint8_t* bytes, uint64_t length) {
        Platform::trace(kTraceInputReport, byteOrZero(bytes, length, 0), byteOrZero(bytes, length, 1),
                        byteOrZero(bytes, length, 2), byteOrZero(bytes, length, 3));
        _log.debug("Input report probe");
    });
    pipeline.invalidInputReportProbe = makeProbe<Bytes>([this](uint64_t, const uint8_t* bytes, uint64_t length) {
        if (length != 0) {
            _log.debug("Invalid input report with ID %ju", bytes[0]);
        } else {
            _log.debug("Invalid input report len==0");
        }
    });
    pipeline.firmwareEventProbe = makeProbe<void(uint64_t, const InputReport::FirmwareEvent&)>(
        [this](uint64_t, const InputReport::FirmwareEvent& event) {
            const uint64_t context = bigEndianContext(event);
            Platform::trace(kTraceFirmwareEvent, event.event, context, 0, 0);
            _log.log("Firmware event probe; event: %jx, context: %jx", event.event, context);
        });
    pipeline.imageProbe = makeProbe<void(uint64_t, const InputReport::Image&)>(
        [this](uint64_t, const InputReport::Image& image) {
            _log.log("Received image frame: %ju", image.frameNumber);
        });
    pipeline.disjointImageProbe = makeProbe<void(uint64_t, uint32_t, const InputReport::Image&)>(
        [this](uint64_t, uint32_t previousFrameNumber, const InputReport::Image& image) {
            _log.error("Disjoint image (frame number: %ju -> %ju)\n\n", previousFrameNumber, image.frameNumber);
        });
    pipeline.hidEventsProbe = makeProbe<void(uint64_t, const HIDEventList&)>(
        [this, info](uint64_t, const HIDEventList& events) { handleHIDEvents(info, events); });
}

void ZeltoTouchHIDService::removeProbes() {
    std::lock_guard lock(_pipelineLock);
    Pipeline& pipeline = *_pipeline;
    pipeline.inputReportProbe = nullptr;
    pipeline.invalidInputReportProbe = nullptr;
    pipeline.firmwareEventProbe = nullptr;
    pipeline.imageProbe = nullptr;
    pipeline.disjointImageProbe = nullptr;
    pipeline.hidEventsProbe = nullptr;
}

// Runs under _pipelineLock, inside the report path.
void ZeltoTouchHIDService::handleHIDEvents(const DispatchEventInfo& info, const HIDEventList& events) {
    HIDEventList copy = events;
    _log.debug("HID events probe: %ju event(s)", copy.size());
    for (const HIDEventRef& event : copy) {
        if (event->type() == kHIDEventTypeDigitizer) _accel.arm();
    }
    if (!copy.empty()) {
        _log.debug("Dispatch %ju event(s) takeoff", copy.size());
        info.queue->async([this, self = ServiceReference(this), events = std::move(copy), info] {
            dispatchEvents(info, events);
        });
    }
}

// On the host's queue, without any lock: only the block's own copies are touched.
void ZeltoTouchHIDService::dispatchEvents(const DispatchEventInfo& info, const HIDEventList& events) const {
    Platform::trace(kTraceDispatchBatch, events.size(), 0, 0, 0);
    _log.debug("Dispatch %ju event(s) land", events.size());
    for (const HIDEventRef& event : events) {
        Platform::trace(kTraceDispatchEvent, event->type(), event->phase(), 0, 0);
        _log.log("Dispatch event: %@", *event);
        if (info.callback) info.callback(info.target, info.refcon, info.sender, event.get(), 0);
    }
}

void ZeltoTouchHIDService::inputReportCallback(void* context, ZeltoReturn, void*, uint32_t reportType,
                                               uint32_t reportID, uint8_t* report, uint64_t reportLength,
                                               uint64_t timestampMach) {
    static_cast<ZeltoTouchHIDService*>(context)->handleInputReport(reportType, static_cast<uint8_t>(reportID), report,
                                                                   reportLength, timestampMach);
}

void ZeltoTouchHIDService::handleInputReport(uint32_t reportType, uint8_t reportID, const uint8_t* report,
                                             uint64_t reportLength, uint64_t deviceTimestamp) {
    _log.debug("Received input report (type %ju, reportID %ju, reportLength %ju, timestampMach %ju)", reportType,
               reportID, reportLength, deviceTimestamp);
    std::lock_guard lock(_pipelineLock);
    const uint64_t now = Util::hostClock().machTimeNow();
    _recording.handleInputReport(now, report, reportLength);
}

void ZeltoTouchHIDService::handleAccelerometerEvent(const HIDEvent& event) {
    const AccelSample sample{
        .timestamp = Util::hostClock().machTimeNow(),
        .x = static_cast<float>(event.doubleValue(kHIDEventFieldAccelerometerX)),
        .y = static_cast<float>(event.doubleValue(kHIDEventFieldAccelerometerY)),
        .z = static_cast<float>(event.doubleValue(kHIDEventFieldAccelerometerZ)),
    };
    std::lock_guard lock(_pipelineLock);
    _accel.handleSample(sample, _recording);
}

}  // namespace ZeltoTouch

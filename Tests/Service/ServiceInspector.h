#pragma once

#include <memory>
#include <mutex>

#include "Service/ZeltoTouchHIDService.h"

namespace ZeltoTouch {

// What the tests look at inside a service.
class ZeltoTouchHIDServiceInspector {
public:
    explicit ZeltoTouchHIDServiceInspector(ZeltoTouchHIDService& service) : _service(service) {}

    // How many of the pipeline's nine hooks are set.
    int installedProbeCount() const {
        std::lock_guard lock(_service._pipelineLock);
        const Pipeline& p = *_service._pipeline;
        return !!p.setStateProbe + !!p.inputReportProbe + !!p.metadataProbe + !!p.invalidInputReportProbe +
               !!p.firmwareEventProbe + !!p.imageProbe + !!p.disjointImageProbe + !!p.hidEventsProbe +
               !!p.getStateProbe;
    }
    AccelBookkeeping accel() const {
        std::lock_guard lock(_service._pipelineLock);
        return _service._accel;
    }
    PipelineRecording recording() const {
        std::lock_guard lock(_service._pipelineLock);
        return _service._recording;
    }
    bool hasDevice() const { return _service._zeltoDevice != nullptr; }
    bool hasInputReportRunLoop() const { return _service._inputReportRunLoop != nullptr; }
    const DispatchEventInfo& dispatchEventInfo() const { return _service._dispatchEventInfo; }

private:
    ZeltoTouchHIDService& _service;
};

namespace ServiceTest {

// Owns the creation reference of a service.
struct ServiceRelease {
    void operator()(ZeltoHIDService* service) const noexcept { service->release(); }
};
using ServicePointer = std::unique_ptr<ZeltoTouchHIDService, ServiceRelease>;
inline ServicePointer makeService() { return ServicePointer(ZeltoTouchHIDService::create()); }

}  // namespace ServiceTest
}  // namespace ZeltoTouch

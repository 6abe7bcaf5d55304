#include "Service/ZeltoTouchHIDService.h"

#include "Platform/DeviceRegistry.h"
#include "Platform/DispatchQueue.h"
#include "Platform/HIDDevice.h"
#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/Semaphore.h"
#include "Platform/StderrLogSink.h"

namespace ZeltoTouch {

namespace {

// A host normally installs its clock and log before it loads a service; a host that did not
// gets the platform's, and one that did keeps its own.
void ensureHostFacilities() {
    if (Log::sink() == nullptr) Platform::installDefaultLogging();
    if (!Util::isHostClockInstalled()) Platform::installMonotonicClock();
}

}  // namespace

ZeltoTouchHIDService::ZeltoTouchHIDService() : _log((ensureHostFacilities(), "HIDService")) {
    _pipeline = std::make_shared<Pipeline>();
    _recording.pipeline = _pipeline;
    _recording.setMaxFrameCount(kMaxRecordedFrames);
}

void ZeltoTouchHIDService::dealloc() {
    _log.debug("%@", "dealloc");
    _inputReportRunLoop = nullptr;
    _zeltoDevice = nullptr;
    ZeltoHIDService::dealloc();
}

ZeltoReturn ZeltoTouchHIDService::probeWithService(uint32_t, const PropertyValue&, int32_t*) {
    _log.debug("%@", "probeWithService:properties:outScore:");
    return kZeltoSuccess;  // the host keeps its own score
}

ZeltoReturn ZeltoTouchHIDService::startWithService(uint32_t service, const PropertyValue&) {
    _log.debug("%@", "startWithService:properties:");
    _zeltoDevice = Platform::DeviceRegistry::shared().createDevice(service);
    return _zeltoDevice ? kZeltoSuccess : kZeltoNoResources;
}

ZeltoReturn ZeltoTouchHIDService::stop() {
    _log.debug("%@", "stop");
    _zeltoDevice = nullptr;
    return kZeltoSuccess;
}

bool ZeltoTouchHIDService::openWithOptions(uint32_t options) {
    _log.debug("openWithOptions:%jx", options);
    return _zeltoDevice && _zeltoDevice->open(options) == kZeltoSuccess;
}

void ZeltoTouchHIDService::closeWithOptions(uint32_t options) {
    _log.debug("closeWithOptions:%jx", options);
    if (_zeltoDevice) _zeltoDevice->close(options);
}

HIDEventRef ZeltoTouchHIDService::copyEventWithType(uint32_t, const HIDEvent*, uint32_t) {
    _log.debug("%@", "copyEventWithType:matching:options:");
    return nullptr;
}

ZeltoReturn ZeltoTouchHIDService::setOutputEvent(const HIDEvent*) {
    _log.debug("%@", "setOutputEvent:");
    return kZeltoUnsupported;
}

}  // namespace ZeltoTouch

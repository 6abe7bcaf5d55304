#include "Shared/Algs/Algs.h"

#include <utility>

namespace ZeltoTouch {

namespace {

enum DigitizerEventMask : uint32_t {
    kEventMaskNone = 0,
    kEventMaskHold = 2,
    kEventMaskTap = 0x20000,
};

constexpr uint32_t kTransducerType = 2;

// Every gesture event has one shape; the region travels in y. A phase of
// kHIDEventPhaseUndefined is left unset.
HIDEventRef createGestureEvent(uint32_t eventMask, PixelRegion region, uint32_t phase) {
    const double y = static_cast<double>(static_cast<uint32_t>(region));
    HIDEventRef event = HIDEvent::createDigitizerEvent(0, kTransducerType, 0, 0, eventMask, 0, 0.0, y, 0.0, 0.0, 0.0,
                                                       false, false, 0);
    if (event && phase != kHIDEventPhaseUndefined) event->setPhase(phase);
    return event;
}

}  // namespace

Algs::Algs() : _log("Algs") {
    for (int index = 0; index < kPixelCount; ++index) _pixels.emplace_back(index, channelGain(index));
    // Each virtual pixel keeps the gain it is built with; later writes of the factor table
    // do not reach it.
    for (size_t i = 0; i < _virtualImage.names.size(); ++i) {
        _virtualPixels.emplace_back(_virtualImage.names[i], _virtualImage.normalizationFactors[i]);
    }
}

HIDEventList Algs::handleImage(const InputReport::Image& image) noexcept {
    HIDEventList events;
    processTouchFrame(image.signedPixels, image.frameNumber, image.timestampMs, events);
    return events;
}

HIDEventList Algs::handleReset() noexcept {
    HIDEventList events;
    processTouchFrame(PixelValues{}, 0, 0, events);
    return events;
}

void Algs::processTouchFrame(const PixelValues& values, uint32_t frameNumber, uint32_t timeMs, HIDEventList& events) {
    // Each pixel update is split into two passes over the channels (same result as
    // updatePixelState one by one), so the independent divisions of the first overlap.
    const float threshold = _handStats.activationThreshold;
    for (size_t i = 0; i < kPixelCount; ++i) _pixels[i].scaleReading(values[i], threshold);
    for (Pixel& pixel : _pixels) pixel.updateActivity();
    _virtualImage.updateValues(_pixels);
    for (size_t i = 0; i < kVirtualPixelCount; ++i) {
        // The virtual pixel sees the sum's low 16 bits as a signed number.
        _virtualPixels[i].scaleReading(static_cast<int16_t>(_virtualImage.values[i]), threshold);
    }
    for (size_t i = 0; i < kVirtualPixelCount; ++i) _virtualPixels[i].updateActivity(_virtualImage.maxPixelIndices[i]);
    _handStats.updateHandState(_pixels, _virtualPixels, timeMs);

    const GestureDecision decision = decideGesture(_handStats, _lastEventPhase);
    if (decision.event != GestureEvent::None) {
        if (HIDEventRef event = createEvent(decision.event)) {
            event->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, frameNumber);
            _lastEventPhase = static_cast<uint16_t>(event->phase());
            events.push_back(std::move(event));
        }
    }
    if (decision.reset) Reset();

    _eventStats.update(_handStats);
    logFrame(values, frameNumber, timeMs);
}

HIDEventRef Algs::createEvent(GestureEvent event) const {
    const PixelRegion region = _handStats.activeRegion;
    switch (event) {
        case GestureEvent::MayBegin: return createMayBeginEvent(region);
        case GestureEvent::HoldStart: return createHoldStartEvent(region);
        case GestureEvent::HoldChange: return createHoldChangeEvent(region);
        case GestureEvent::HoldEnd: return createHoldEndEvent(region);
        case GestureEvent::Tap: return createTapEvent(region);
        case GestureEvent::Cancel: return createCancelEvent();
        case GestureEvent::None: break;
    }
    return nullptr;
}

void Algs::Reset() noexcept {
    for (Pixel& pixel : _pixels) pixel.resetGlobalStats();
    for (VirtualPixel& pixel : _virtualPixels) pixel.resetGlobalStats();
    _handStats.Reset();
}

HIDEventRef Algs::createMayBeginEvent(PixelRegion region) {
    return createGestureEvent(kEventMaskNone, region, kHIDEventPhaseMayBegin);
}

HIDEventRef Algs::createHoldStartEvent(PixelRegion region) {
    return createGestureEvent(kEventMaskHold, region, kHIDEventPhaseBegan);
}

HIDEventRef Algs::createHoldChangeEvent(PixelRegion region) {
    return createGestureEvent(kEventMaskHold, region, kHIDEventPhaseChanged);
}

HIDEventRef Algs::createHoldEndEvent(PixelRegion region) {
    return createGestureEvent(kEventMaskHold, region, kHIDEventPhaseEnded);
}

HIDEventRef Algs::createTapEvent(PixelRegion region) {
    return createGestureEvent(kEventMaskTap, region, kHIDEventPhaseUndefined);
}

HIDEventRef Algs::createCancelEvent() {
    return createGestureEvent(kEventMaskNone, PixelRegion::None, kHIDEventPhaseCancelled);
}

void Algs::logFrame(const PixelValues& values, uint32_t frameNumber, uint32_t timeMs) const {
    // Nothing of the diagnostics is computed unless debug lines are wanted; the level is
    // checked again before each further line, as it may change meanwhile.
    if (!_log.isEnabled(LogLevel::Debug)) return;
    _log.write(LogLevel::Debug, format("Frame %u @%ums, *** Event Stats ***\n%@", frameNumber, timeMs,
                                       _eventStats.statsDictionary()));
    if (_log.isEnabled(LogLevel::Debug)) {
        _log.write(LogLevel::Debug, format("Frame %u @%ums, *** Touch State Description ***\n%@", frameNumber, timeMs,
                                           PropertyValue::string(touchStateDescription(values, timeMs))));
    }
    if (_log.isEnabled(LogLevel::Debug)) {
        _log.write(LogLevel::Debug, format("Frame %u @%ums, *** Virtual State Description ***\n%@", frameNumber,
                                           timeMs, PropertyValue::string(virtualStateDescription(values, timeMs))));
    }
}

}  // namespace ZeltoTouch

#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Shared/Algs/EventStats.h"
#include "Shared/Algs/GestureDecision.h"
#include "Shared/Algs/HandStats.h"
#include "Shared/Algs/Pixel.h"
#include "Shared/Algs/VirtualImage.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Util/Log.h"

namespace ZeltoTouch {

using PixelValues = std::array<int16_t, kPixelCount>;

// The touch algorithm as the pipeline sees it: one call per image frame or firmware reset,
// each returning the gesture events of that frame. Its only clock is the frame time.
//
// Not thread-safe; the owner serialises every call. A frame that produces no event does
// not allocate (with debug logging off).
class Algs {
public:
    Algs();

    HIDEventList handleImage(const InputReport::Image& image) noexcept;
    // A firmware reset: ends any touch in progress like a frame without contact at time 0.
    HIDEventList handleReset() noexcept;

    // Tunable parameters and statistics by key (the keys are listed in AlgsState.cpp).
    PropertyValue getState(const std::string& key) const;
    void setState(const std::string& key, const PropertyValue& value);

    // Diagnostic one-liners of the state the last frame left behind.
    std::string touchStateDescription(const PixelValues& values, uint32_t timeMs) const;
    std::string virtualStateDescription(const PixelValues& values, uint32_t timeMs) const;

    // The gesture events; each returns null when the host yields no event.
    static HIDEventRef createMayBeginEvent(PixelRegion region);
    static HIDEventRef createHoldStartEvent(PixelRegion region);
    static HIDEventRef createHoldChangeEvent(PixelRegion region);
    static HIDEventRef createHoldEndEvent(PixelRegion region);
    static HIDEventRef createTapEvent(PixelRegion region);
    static HIDEventRef createCancelEvent();

    const HandStats& handStats() const noexcept { return _handStats; }
    const std::vector<Pixel>& pixels() const noexcept { return _pixels; }
    const std::vector<VirtualPixel>& virtualPixels() const noexcept { return _virtualPixels; }
    uint16_t lastEventPhase() const noexcept { return _lastEventPhase; }

private:
    void processTouchFrame(const PixelValues& values, uint32_t frameNumber, uint32_t timeMs, HIDEventList& events);
    HIDEventRef createEvent(GestureEvent event) const;
    // Gesture reset: clears the per-gesture statistics of every channel and the hand.
    void Reset() noexcept;
    void logFrame(const PixelValues& values, uint32_t frameNumber, uint32_t timeMs) const;
    std::string stateLabel(uint32_t timeMs) const;

    Log _log;
    std::vector<Pixel> _pixels;
    VirtualImage _virtualImage;
    std::vector<VirtualPixel> _virtualPixels;
    HandStats _handStats;
    EventStats _eventStats;
    uint16_t _lastEventPhase = 0;  // phase of the last event a frame produced
};

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace ZeltoTouch {

class HIDEvent;
using HIDEventRef = std::shared_ptr<HIDEvent>;  // events are shared between holders
using HIDEventList = std::vector<HIDEventRef>;

enum HIDEventType : uint32_t {
    kHIDEventTypeVendorDefined = 1,
    kHIDEventTypeDigitizer = 11,
    kHIDEventTypeAccelerometer = 13,
};

enum HIDEventPhase : uint32_t {
    kHIDEventPhaseUndefined = 0,
    kHIDEventPhaseBegan = 1,
    kHIDEventPhaseChanged = 2,
    kHIDEventPhaseEnded = 4,
    kHIDEventPhaseCancelled = 8,
    kHIDEventPhaseMayBegin = 128,
};

// Numbered fields: event type in the upper 16 bits, field number in the lower 16.
enum HIDEventField : uint32_t {
    kHIDEventFieldDigitizerFrameNumber = 0xB001B,
    kHIDEventFieldAccelerometerX = 0xD0000,
    kHIDEventFieldAccelerometerY = 0xD0001,
    kHIDEventFieldAccelerometerZ = 0xD0002,
};

// The host's event record. Creation returns a new shared reference, or null when the host
// cannot create the event.
class HIDEvent {
public:
    static HIDEventRef createDigitizerEvent(uint64_t timestamp, uint32_t transducerType, uint32_t index,
                                            uint32_t identity, uint32_t eventMask, uint32_t buttonMask,
                                            double x, double y, double z, double tipPressure,
                                            double barrelPressure, bool range, bool touch, uint32_t options);
    static HIDEventRef createVendorDefinedEvent(uint64_t timestamp, uint16_t usagePage, uint16_t usage,
                                                uint32_t version, const uint8_t* data, uint64_t length,
                                                uint32_t options);
    static HIDEventRef createAccelerometerEvent(uint64_t timestamp, double x, double y, double z,
                                                uint32_t options);

    uint32_t type() const noexcept { return _type; }
    uint64_t timestamp() const noexcept { return _timestamp; }
    void setTimestamp(uint64_t timestamp) noexcept { _timestamp = timestamp; }
    uint32_t phase() const noexcept { return _phase; }
    void setPhase(uint32_t phase) noexcept { _phase = phase; }
    uint32_t options() const noexcept { return _options; }

    // Numbered fields. An integer field never written reads 0, a double field 0.0.
    int64_t integerValue(uint32_t field) const noexcept;
    void setIntegerValue(uint32_t field, int64_t value);
    double doubleValue(uint32_t field) const noexcept;
    void setDoubleValue(uint32_t field, double value);

    // Digitizer fields.
    uint32_t transducerType() const noexcept { return _transducerType; }
    uint32_t index() const noexcept { return _index; }
    uint32_t identity() const noexcept { return _identity; }
    uint32_t eventMask() const noexcept { return _eventMask; }
    uint32_t buttonMask() const noexcept { return _buttonMask; }
    double x() const noexcept { return _x; }
    double y() const noexcept { return _y; }
    double z() const noexcept { return _z; }
    double tipPressure() const noexcept { return _tipPressure; }
    double barrelPressure() const noexcept { return _barrelPressure; }
    bool range() const noexcept { return _range; }
    bool touch() const noexcept { return _touch; }

    // Vendor-defined payload.
    uint16_t usagePage() const noexcept { return _usagePage; }
    uint16_t usage() const noexcept { return _usage; }
    uint32_t version() const noexcept { return _version; }
    std::span<const uint8_t> data() const noexcept { return _data; }

    // The host's own one-line description, shown by "%@".
    std::string description() const;

private:
    HIDEvent() = default;

    uint32_t _type = 0;
    uint64_t _timestamp = 0;
    uint32_t _phase = 0;
    uint32_t _options = 0;
    uint32_t _transducerType = 0, _index = 0, _identity = 0, _eventMask = 0, _buttonMask = 0;
    double _x = 0, _y = 0, _z = 0, _tipPressure = 0, _barrelPressure = 0;
    bool _range = false, _touch = false;
    uint16_t _usagePage = 0, _usage = 0;
    uint32_t _version = 0;
    std::vector<uint8_t> _data;
    std::vector<std::pair<uint32_t, int64_t>> _integerFields;
    std::vector<std::pair<uint32_t, double>> _doubleFields;
};

}  // namespace ZeltoTouch

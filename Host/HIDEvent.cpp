#include "Host/HIDEvent.h"

#include <algorithm>
#include <charconv>
#include <new>
#include <stdexcept>

namespace ZeltoTouch {

namespace {

// Creation reports a failed allocation as "no event" instead of throwing: the report path
// must not throw, and callers already treat a missing event as nothing to deliver.
template <typename Build>
HIDEventRef createOrNull(Build build) noexcept {
    try {
        return build();
    } catch (const std::bad_alloc&) {
        return nullptr;
    } catch (const std::length_error&) {
        return nullptr;
    }
}

template <typename T>
T fieldValue(const std::vector<std::pair<uint32_t, T>>& fields, uint32_t field) noexcept {
    auto it = std::find_if(fields.begin(), fields.end(), [field](const auto& f) { return f.first == field; });
    return it != fields.end() ? it->second : T{};
}

template <typename T>
void setFieldValue(std::vector<std::pair<uint32_t, T>>& fields, uint32_t field, T value) {
    auto it = std::find_if(fields.begin(), fields.end(), [field](const auto& f) { return f.first == field; });
    if (it != fields.end()) it->second = value;
    else fields.emplace_back(field, value);
}

class DescriptionBuilder {
public:
    explicit DescriptionBuilder(std::string_view kind) { _text.append("HIDEvent ").append(kind); }

    template <typename T>
    DescriptionBuilder& add(std::string_view name, T value) {
        _text.append(" ").append(name).append("=");
        char buffer[64];
        auto result = std::to_chars(buffer, buffer + sizeof buffer, value);
        _text.append(buffer, result.ptr);
        return *this;
    }
    DescriptionBuilder& addHex(std::string_view name, uint64_t value) {
        _text.append(" ").append(name).append("=0x");
        char buffer[32];
        auto result = std::to_chars(buffer, buffer + sizeof buffer, value, 16);
        _text.append(buffer, result.ptr);
        return *this;
    }
    std::string take() { return std::move(_text); }

private:
    std::string _text;
};

}  // namespace

HIDEventRef HIDEvent::createDigitizerEvent(uint64_t timestamp, uint32_t transducerType, uint32_t index,
                                           uint32_t identity, uint32_t eventMask, uint32_t buttonMask, double x,
                                           double y, double z, double tipPressure, double barrelPressure,
                                           bool range, bool touch, uint32_t options) {
    return createOrNull([&] {
        HIDEventRef event(new HIDEvent);
        event->_type = kHIDEventTypeDigitizer;
        event->_timestamp = timestamp;
        event->_transducerType = transducerType;
        event->_index = index;
        event->_identity = identity;
        event->_eventMask = eventMask;
        event->_buttonMask = buttonMask;
        event->_x = x;
        event->_y = y;
        event->_z = z;
        event->_tipPressure = tipPressure;
        event->_barrelPressure = barrelPressure;
        event->_range = range;
        event->_touch = touch;
        event->_options = options;
        // Room for the frame number, which is set on every produced event: setting it then
        // needs no allocation.
        event->_integerFields.reserve(1);
        return event;
    });
}

HIDEventRef HIDEvent::createVendorDefinedEvent(uint64_t timestamp, uint16_t usagePage, uint16_t usage,
                                               uint32_t version, const uint8_t* data, uint64_t length,
                                               uint32_t options) {
    if (!data && length != 0) return nullptr;
    return createOrNull([&] {
        HIDEventRef event(new HIDEvent);
        event->_type = kHIDEventTypeVendorDefined;
        event->_timestamp = timestamp;
        event->_usagePage = usagePage;
        event->_usage = usage;
        event->_version = version;
        if (length > event->_data.max_size()) throw std::length_error("vendor-defined event data");
        event->_data.assign(data, data + length);
        event->_options = options;
        return event;
    });
}

HIDEventRef HIDEvent::createAccelerometerEvent(uint64_t timestamp, double x, double y, double z, uint32_t options) {
    return createOrNull([&] {
        HIDEventRef event(new HIDEvent);
        event->_type = kHIDEventTypeAccelerometer;
        event->_timestamp = timestamp;
        event->_options = options;
        event->_x = x;
        event->_y = y;
        event->_z = z;
        event->_doubleFields = {{kHIDEventFieldAccelerometerX, x},
                                {kHIDEventFieldAccelerometerY, y},
                                {kHIDEventFieldAccelerometerZ, z}};
        return event;
    });
}

int64_t HIDEvent::integerValue(uint32_t field) const noexcept { return fieldValue(_integerFields, field); }
void HIDEvent::setIntegerValue(uint32_t field, int64_t value) { setFieldValue(_integerFields, field, value); }
double HIDEvent::doubleValue(uint32_t field) const noexcept { return fieldValue(_doubleFields, field); }
void HIDEvent::setDoubleValue(uint32_t field, double value) { setFieldValue(_doubleFields, field, value); }

std::string HIDEvent::description() const {
    auto withCommon = [this](std::string_view kind) {
        DescriptionBuilder builder(kind);
        builder.add("ts", _timestamp).addHex("phase", _phase).addHex("options", _options);
        return builder;
    };
    switch (_type) {
        case kHIDEventTypeDigitizer: {
            auto builder = withCommon("digitizer");
            builder.add("transducer", _transducerType)
                .add("index", _index)
                .add("identity", _identity)
                .addHex("mask", _eventMask)
                .addHex("buttons", _buttonMask)
                .add("x", _x)
                .add("y", _y)
                .add("z", _z)
                .add("tip", _tipPressure)
                .add("barrel", _barrelPressure)
                .add("range", int{_range})
                .add("touch", int{_touch})
                .add("frame", integerValue(kHIDEventFieldDigitizerFrameNumber));
            return builder.take();
        }
        case kHIDEventTypeVendorDefined: {
            auto builder = withCommon("vendor-defined");
            builder.addHex("usagePage", _usagePage)
                .addHex("usage", _usage)
                .add("version", _version)
                .add("length", _data.size());
            return builder.take();
        }
        case kHIDEventTypeAccelerometer: {
            auto builder = withCommon("accelerometer");
            builder.add("x", doubleValue(kHIDEventFieldAccelerometerX))
                .add("y", doubleValue(kHIDEventFieldAccelerometerY))
                .add("z", doubleValue(kHIDEventFieldAccelerometerZ));
            return builder.take();
        }
        default: return withCommon("type-" + std::to_string(_type)).take();
    }
}

}  // namespace ZeltoTouch

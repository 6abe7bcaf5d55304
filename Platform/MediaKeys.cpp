#include "Platform/MediaKeys.h"

namespace ZeltoTouch::Platform {

namespace {

constexpr uint32_t kHoldEventMask = 2;
constexpr uint32_t kTapEventMask = 0x20000;

enum Region : unsigned { kNoRegion = 0, kPlayPause = 1, kVolumeDown = 2, kVolumeUp = 3 };

unsigned volumeKey(unsigned region) {
    switch (region) {
    case kVolumeDown: return KEY_VOLUMEDOWN;
    case kVolumeUp: return KEY_VOLUMEUP;
    default: return 0;
    }
}

unsigned regionOf(const HIDEvent& event) {
    const double y = event.y();
    return y == 1.0 ? kPlayPause : y == 2.0 ? kVolumeDown : y == 3.0 ? kVolumeUp : kNoRegion;
}

constexpr KeyCommand press(unsigned key) { return key ? KeyCommand{KeyAction::Press, key} : KeyCommand{}; }
constexpr KeyCommand repeat(unsigned key) { return {KeyAction::PressAndRepeat, key}; }
constexpr KeyCommand kStop{KeyAction::StopRepeating, 0};

}  // namespace

KeyCommand keyCommandForEvent(const HIDEvent& event, unsigned holdKey) {
    if (event.type() != kHIDEventTypeDigitizer) return {};
    const unsigned region = regionOf(event);

    if (event.eventMask() == kTapEventMask) return press(region == kPlayPause ? KEY_PLAYPAUSE : volumeKey(region));
    if (event.eventMask() == kHoldEventMask) {
        const unsigned key = volumeKey(region);
        switch (event.phase()) {
        case kHIDEventPhaseBegan: return region == kPlayPause ? press(holdKey) : key ? repeat(key) : KeyCommand{};
        case kHIDEventPhaseChanged: return key ? repeat(key) : kStop;
        case kHIDEventPhaseEnded: return kStop;
        default: return {};
        }
    }
    return event.phase() == kHIDEventPhaseCancelled ? kStop : KeyCommand{};
}

std::vector<unsigned> KeyRepeatSchedule::apply(const KeyCommand& command, Clock::time_point now) {
    switch (command.action) {
    case KeyAction::None: return {};
    case KeyAction::Press: return {command.key};
    case KeyAction::PressAndRepeat:
        _repeat = Repeat{command.key, now + _interval};
        return {command.key};
    case KeyAction::StopRepeating:
        _repeat.reset();
        return {};
    }
    return {};
}

std::optional<unsigned> KeyRepeatSchedule::keyDue(Clock::time_point now) {
    if (!_repeat || now < _repeat->due) return std::nullopt;
    _repeat->due += _interval;
    if (_repeat->due <= now) _repeat->due = now + _interval;  // fell behind: resume the rate from now
    return _repeat->key;
}

std::optional<KeyRepeatSchedule::Clock::time_point> KeyRepeatSchedule::nextDue() const {
    if (!_repeat) return std::nullopt;
    return _repeat->due;
}

}  // namespace ZeltoTouch::Platform

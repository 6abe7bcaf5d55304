#pragma once

#include <chrono>
#include <cstdint>
#include <linux/input-event-codes.h>
#include <optional>
#include <vector>

#include "Host/HIDEvent.h"

namespace ZeltoTouch::Platform {

// What a gesture asks of the media keys.
enum class KeyAction : uint8_t {
    None,
    Press,           // press and release key once
    PressAndRepeat,  // press key now and keep pressing it at a steady rate
    StopRepeating,   // end any repetition; sends nothing
};

struct KeyCommand {
    KeyAction action = KeyAction::None;
    unsigned key = 0;  // a KEY_ code; 0 unless the action sends a key
    friend bool operator==(const KeyCommand&, const KeyCommand&) = default;
};

inline constexpr unsigned kDefaultHoldKey = KEY_VOICECOMMAND;

// The media key a gesture event stands for, with the region in the event's y:
//
// | event (mask, phase)   | play/pause (1)  | volume down (2)        | volume up (3)          | none (0)      |
// |-----------------------|-----------------|------------------------|------------------------|---------------|
// | tap (0x20000, -)      | PLAYPAUSE       | VOLUMEDOWN             | VOLUMEUP               | nothing       |
// | hold start (2, 1)     | holdKey         | repeat VOLUMEDOWN      | repeat VOLUMEUP        | nothing       |
// | hold change (2, 2)    | stop repeating  | repeat VOLUMEDOWN      | repeat VOLUMEUP        | stop repeating|
// | hold end (2, 4)       | stop repeating  | stop repeating         | stop repeating         | stop repeating|
// | cancel (0, 8)         | stop repeating  | stop repeating         | stop repeating         | stop repeating|
// | may-begin, any other  | nothing         | nothing                | nothing                | nothing       |
//
// A hold that slides onto play/pause stops repeating rather than sending the hold key: that key
// means "a hold that began there".
KeyCommand keyCommandForEvent(const HIDEvent& event, unsigned holdKey = kDefaultHoldKey);

// When a repeated key is due. Time is whatever steady clock the caller reads, passed in.
class KeyRepeatSchedule {
public:
    using Clock = std::chrono::steady_clock;

    explicit KeyRepeatSchedule(std::chrono::milliseconds interval) : _interval(interval) {}

    // The keys to send at once for command at now; starts, moves or ends the repetition.
    std::vector<unsigned> apply(const KeyCommand& command, Clock::time_point now);
    // The repeated key when its time has come (at most one press, however late the call: a
    // stalled caller must not fire a burst of volume changes), else nothing.
    std::optional<unsigned> keyDue(Clock::time_point now);
    // When keyDue will next have a key; nothing while not repeating.
    std::optional<Clock::time_point> nextDue() const;

private:
    struct Repeat {
        unsigned key;
        Clock::time_point due;
    };

    std::chrono::milliseconds _interval;
    std::optional<Repeat> _repeat;
};

}  // namespace ZeltoTouch::Platform

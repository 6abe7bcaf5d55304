#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

struct libevdev_uinput;

namespace ZeltoTouch::Tools {

// A virtual keyboard, made through uinput with libevdev's helpers, that can press the keys it
// was made with. Not thread-safe: one caller at a time.
class UinputKeySender {
public:
    static constexpr std::string_view kDefaultPath = "/dev/uinput";
    static constexpr std::string_view kKeyboardName = "ZeltoTouch media keys";

    // Throws std::runtime_error saying what is wrong and what to do when uinputPath is missing,
    // not writable, or refuses to make the keyboard.
    explicit UinputKeySender(std::span<const unsigned> keys, const std::string& uinputPath = std::string(kDefaultPath));
    ~UinputKeySender();

    UinputKeySender(const UinputKeySender&) = delete;
    UinputKeySender& operator=(const UinputKeySender&) = delete;

    // Presses and releases key; false when uinput refused the events.
    bool tap(unsigned key);

private:
    int _fd;
    libevdev_uinput* _keyboard = nullptr;
};

// The key code for a name such as "KEY_VOICECOMMAND" or a decimal number; nothing for names
// that are not keys.
std::optional<unsigned> keyCodeFromName(std::string_view name);
// "KEY_VOICECOMMAND" for its code, or the number when the key has no name.
std::string keyName(unsigned code);

}  // namespace ZeltoTouch::Tools

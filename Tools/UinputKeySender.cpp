#include "Tools/UinputKeySender.h"

#include <cerrno>
#include <charconv>
#include <cstring>
#include <fcntl.h>
#include <libevdev/libevdev-uinput.h>
#include <libevdev/libevdev.h>
#include <memory>
#include <stdexcept>
#include <unistd.h>

#include "Host/Format.h"

namespace ZeltoTouch::Tools {

namespace {

std::string openFailureMessage(const std::string& path, int error) {
    switch (error) {
    case ENOENT:
    case ENODEV:
        return format("%s does not exist: media keys need the uinput kernel module (modprobe uinput)", path);
    case EACCES:
    case EPERM:
        return format("%s is not writable: the udev rule 70-zelto-touch.rules gives the zelto-touch group write "
                      "access; add your user to that group or run as root",
                      path);
    default:
        return format("Cannot open %s: %s", path, std::strerror(error));
    }
}

}  // namespace

UinputKeySender::UinputKeySender(std::span<const unsigned> keys, const std::string& uinputPath)
    : _fd(::open(uinputPath.c_str(), O_RDWR | O_CLOEXEC)) {
    if (_fd < 0) throw std::runtime_error(openFailureMessage(uinputPath, errno));

    const std::unique_ptr<libevdev, decltype(&libevdev_free)> device(libevdev_new(), &libevdev_free);
    libevdev_set_name(device.get(), std::string(kKeyboardName).c_str());
    libevdev_enable_event_type(device.get(), EV_KEY);
    for (const unsigned key : keys) libevdev_enable_event_code(device.get(), EV_KEY, key, nullptr);

    // The device description is copied into the kernel: it may go once the keyboard exists.
    const int result = libevdev_uinput_create_from_device(device.get(), _fd, &_keyboard);
    if (result < 0) {
        ::close(_fd);
        throw std::runtime_error(
            format("Cannot create a virtual keyboard through %s: %s", uinputPath, std::strerror(-result)));
    }
}

UinputKeySender::~UinputKeySender() {
    libevdev_uinput_destroy(_keyboard);
    ::close(_fd);
}

bool UinputKeySender::tap(unsigned key) {
    const int code = static_cast<int>(key);
    return libevdev_uinput_write_event(_keyboard, EV_KEY, code, 1) == 0 &&
           libevdev_uinput_write_event(_keyboard, EV_SYN, SYN_REPORT, 0) == 0 &&
           libevdev_uinput_write_event(_keyboard, EV_KEY, code, 0) == 0 &&
           libevdev_uinput_write_event(_keyboard, EV_SYN, SYN_REPORT, 0) == 0;
}

std::optional<unsigned> keyCodeFromName(std::string_view name) {
    unsigned number = 0;
    const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), number);
    if (error == std::errc() && end == name.data() + name.size()) {
        if (number == 0 || number > KEY_MAX) return std::nullopt;  // 0 is KEY_RESERVED
        return number;
    }
    const int code = libevdev_event_code_from_name_n(EV_KEY, name.data(), name.size());
    if (code < 0) return std::nullopt;
    return static_cast<unsigned>(code);
}

std::string keyName(unsigned code) {
    const char* name = libevdev_event_code_get_name(EV_KEY, code);
    return name ? std::string(name) : std::to_string(code);
}

}  // namespace ZeltoTouch::Tools

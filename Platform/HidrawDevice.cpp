#include "Platform/HidrawDevice.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <linux/hidraw.h>
#include <linux/input.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include "Host/Format.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {

namespace {

// A string ioctl (name, physical path, unique ID): empty when the kernel has none.
constexpr size_t kStringIoctlSize = 256;
std::string readStringIoctl(int fd, unsigned long request) {
    std::array<char, kStringIoctlSize + 1> text{};  // one more than asked for: always terminated
    if (::ioctl(fd, request, text.data()) < 0) return {};
    return std::string(text.data(), ::strnlen(text.data(), kStringIoctlSize));
}

std::string openFailureMessage(const std::string& path, int error) {
    switch (error) {
    case ENOENT:
        return format("%s does not exist: is the sensor plugged in? (`zelto-touch devices` lists the hidraw nodes)",
                      path);
    case EACCES:
    case EPERM:
        return format("Permission denied opening %s: install the udev rule 70-zelto-touch.rules (it gives the "
                      "zelto-touch group access to the sensor), then add your user to that group or run as root",
                      path);
    case ENODEV:
    case ENXIO:
        return format("%s has no device behind it: was the sensor unplugged?", path);
    default:
        return format("Cannot open %s: %s", path, std::strerror(error));
    }
}

// Nothing more to read for now.
bool wouldBlock(int error) { return error == EAGAIN || error == EWOULDBLOCK; }

}  // namespace

std::string HidrawIdentity::transportName() const {
    switch (busType) {
    case BUS_USB: return "USB";
    case BUS_BLUETOOTH: return "Bluetooth";
    case BUS_I2C: return "I2C";
    case BUS_SPI: return "SPI";
    case BUS_VIRTUAL: return "Virtual";
    default: return format("0x%04x", busType);
    }
}

std::optional<HidrawIdentity> readHidrawIdentity(int fd) {
    hidraw_devinfo info{};
    if (::ioctl(fd, HIDIOCGRAWINFO, &info) < 0) return std::nullopt;
    HidrawIdentity identity;
    identity.busType = info.bustype;
    identity.vendorID = static_cast<uint16_t>(info.vendor);
    identity.productID = static_cast<uint16_t>(info.product);
    identity.name = readStringIoctl(fd, HIDIOCGRAWNAME(kStringIoctlSize));
    identity.physicalPath = readStringIoctl(fd, HIDIOCGRAWPHYS(kStringIoctlSize));
    identity.uniqueID = readStringIoctl(fd, HIDIOCGRAWUNIQ(kStringIoctlSize));
    return identity;
}

std::shared_ptr<HidrawDevice> HidrawDevice::openNode(const std::string& path) {
    const int fd = ::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) throw HidrawOpenError(openFailureMessage(path, errno));
    auto identity = readHidrawIdentity(fd);
    if (!identity) {
        const int error = errno;
        ::close(fd);
        if (error == ENOTTY || error == EINVAL) throw HidrawOpenError(format("%s is not a hidraw device", path));
        throw HidrawOpenError(openFailureMessage(path, error));
    }
    return std::make_shared<HidrawDevice>(fd, path, std::move(*identity));
}

HidrawDevice::HidrawDevice(int fd, std::string path, HidrawIdentity identity)
    : _fd(fd), _path(std::move(path)), _identity(std::move(identity)) {
    const int flags = ::fcntl(_fd, F_GETFL);
    if (flags >= 0) ::fcntl(_fd, F_SETFL, flags | O_NONBLOCK);
}

HidrawDevice::~HidrawDevice() {
    _source.reset();  // stop waiting before the descriptor goes
    ::close(_fd);
}

void HidrawDevice::setDisconnectHandler(DisconnectHandler handler) {
    std::lock_guard lock(_lock);
    _disconnectHandler = std::move(handler);
}

ZeltoReturn HidrawDevice::open(uint32_t) {
    if (const int error = _disconnectError.load()) return error;
    _open = true;
    return kZeltoSuccess;
}

void HidrawDevice::close(uint32_t) { _open = false; }

ZeltoReturn HidrawDevice::getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) {
    if (type != kHIDReportTypeFeature) return kZeltoUnsupported;
    if (buffer == nullptr || length == 0 || reportID > 0xFF) {
        length = 0;
        return EINVAL;
    }
    const size_t size = std::min(length, kMaxFeatureReportSize);
    buffer[0] = static_cast<uint8_t>(reportID);
    const int result = ::ioctl(_fd, HIDIOCGFEATURE(size), buffer);
    if (result < 0) {
        const int error = errno != 0 ? errno : EIO;
        _log.debug("Feature report 0x%02x of %s failed: %s", reportID, _path, std::strerror(error));
        length = 0;
        return error;
    }
    length = std::min<uint64_t>(static_cast<uint64_t>(result), size);
    return kZeltoSuccess;
}

PropertyValue HidrawDevice::copyProperty(std::string_view key) const {
    const auto nonEmpty = [](const std::string& text) {
        return text.empty() ? PropertyValue() : PropertyValue::string(text);
    };
    if (key == "Product") return nonEmpty(_identity.name);
    if (key == "VendorID") return PropertyValue::fromUInt32(_identity.vendorID);
    if (key == "ProductID") return PropertyValue::fromUInt32(_identity.productID);
    if (key == "Transport") return PropertyValue::string(_identity.transportName());
    if (key == "PhysicalPath") return nonEmpty(_identity.physicalPath);
    if (key == "SerialNumber") return nonEmpty(_identity.uniqueID);
    if (key == "DevicePath") return nonEmpty(_path);
    return {};
}

bool HidrawDevice::setProperty(std::string_view, const PropertyValue&) { return false; }

void HidrawDevice::registerInputReportCallback(uint8_t* buffer, uint64_t length, HIDInputReportCallback callback,
                                               void* context) {
    std::lock_guard lock(_lock);
    _registration = callback ? Registration{buffer, length, callback, context} : Registration{};
}

void HidrawDevice::scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    _runLoop = runLoop;
    _runLoopMode = mode;
    if (_disconnectError.load() != 0) return;  // nothing more will come
    _readBuffer.resize(kMaxReportSize);
    _source = std::make_unique<FileDescriptorSource>(_fd, [this] { readReports(); });
    _source->attach(runLoop, mode);
}

void HidrawDevice::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    if (runLoop != _runLoop || mode != _runLoopMode) return;
    _source.reset();
    _runLoop.reset();
    _runLoopMode.clear();
}

// Reads until the node has nothing more: one read, one report.
void HidrawDevice::readReports() {
    for (;;) {
        const ssize_t size = ::read(_fd, _readBuffer.data(), _readBuffer.size());
        if (size > 0) {
            deliver(static_cast<uint64_t>(size), Util::hostClock().machTimeNow());
            continue;
        }
        if (size < 0 && errno == EINTR) continue;
        if (size < 0 && wouldBlock(errno)) return;
        // Anything else ends the reading for good: the device went away (ENODEV, EIO), a
        // stand-in's peer closed the stream (a read of 0), or an error that would otherwise
        // fire the source forever.
        disconnect(size == 0 ? ENODEV : errno);
        return;
    }
}

void HidrawDevice::deliver(uint64_t size, uint64_t timestamp) {
    Registration registration;
    {
        std::lock_guard lock(_lock);
        registration = _registration;
    }
    if (!_open || registration.callback == nullptr) return;
    const uint64_t length = std::min(size, registration.length);
    std::memcpy(registration.buffer, _readBuffer.data(), length);
    // A report longer than the caller's buffer arrives cut, and says so.
    const ZeltoReturn result = length < size ? EMSGSIZE : kZeltoSuccess;
    registration.callback(registration.context, result, this, kHIDReportTypeInput, _readBuffer[0], registration.buffer,
                          length, timestamp);
}

void HidrawDevice::disconnect(int error) {
    _log.error("Lost %s: %s; no more reports will be read", _path, std::strerror(error));
    _disconnectError = error;
    _source.reset();  // allowed from within the source's own callback
    DisconnectHandler handler;
    {
        std::lock_guard lock(_lock);
        handler = _disconnectHandler;
    }
    if (handler) handler(error);
}

}  // namespace ZeltoTouch::Platform

#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

#include "Platform/FileDescriptorSource.h"
#include "Platform/HIDDevice.h"
#include "Shared/Util/Log.h"

namespace ZeltoTouch::Platform {

// Who a hidraw node is, as the kernel tells it (ioctls on the node, or the uevent in sysfs).
struct HidrawIdentity {
    uint32_t busType = 0;  // BUS_USB, BUS_BLUETOOTH, ... from <linux/input.h>
    uint16_t vendorID = 0;
    uint16_t productID = 0;
    std::string name;
    std::string physicalPath;
    std::string uniqueID;  // often the serial number; empty when the device has none

    // "USB", "Bluetooth", "I2C", "SPI", "Virtual", or the bus number in hex.
    std::string transportName() const;
    friend bool operator==(const HidrawIdentity&, const HidrawIdentity&) = default;
};

// Thrown when a node cannot be opened as a hidraw device; the message says what to do.
class HidrawOpenError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// A HID device behind a Linux hidraw node.
//
// Every read(2) of the node yields one whole input report, report ID first; reports are read on
// the run loop the device is scheduled on, as soon as the node is readable, and stamped with the
// mach time of their arrival. Feature reports are read with HIDIOCGFEATURE. Failure statuses
// are errno values, so a caller that prints the status prints something a person can look up.
//
// Losing the device (unplugged: ENODEV or EIO, or the end of the stream) is logged once, stops
// the reading, fails every later open and is reported to the disconnect handler.
//
// Like every run-loop source, the reading must be unscheduled on the loop's thread (or while
// the loop is not running) before the device is destroyed.
class HidrawDevice final : public HIDDevice {
public:
    // Called once, on the run loop's thread, with the errno that ended the reading.
    using DisconnectHandler = std::function<void(int error)>;

    // Largest report the kernel hands out (HID_MAX_BUFFER_SIZE), and the largest size the
    // feature report ioctl can carry (its size field has 14 bits).
    static constexpr size_t kMaxReportSize = 16384;
    static constexpr uint64_t kMaxFeatureReportSize = (1u << 14) - 1;

    // Opens path read-write and reads its identity. Throws HidrawOpenError when the node is
    // missing, not accessible or not a hidraw device.
    static std::shared_ptr<HidrawDevice> openNode(const std::string& path);

    // Takes ownership of fd, any descriptor that delivers one report per read (a hidraw node,
    // or a SOCK_SEQPACKET socket standing in for one). The descriptor is made non-blocking.
    HidrawDevice(int fd, std::string path, HidrawIdentity identity);
    ~HidrawDevice() override;

    HidrawDevice(const HidrawDevice&) = delete;
    HidrawDevice& operator=(const HidrawDevice&) = delete;

    const std::string& path() const noexcept { return _path; }
    const HidrawIdentity& identity() const noexcept { return _identity; }
    bool isDisconnected() const noexcept { return _disconnectError.load() != 0; }
    int disconnectError() const noexcept { return _disconnectError.load(); }
    void setDisconnectHandler(DisconnectHandler handler);

    // HIDDevice. The node is open from construction; open and close start and stop the
    // delivery of reports (reports that arrive while closed are read and dropped).
    ZeltoReturn open(uint32_t options) override;
    void close(uint32_t options) override;
    ZeltoReturn getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) override;
    // "Product", "VendorID", "ProductID", "Transport", "PhysicalPath", "SerialNumber" (when the
    // kernel knows one) and "DevicePath". The kernel offers nothing to write: setProperty
    // refuses every key.
    PropertyValue copyProperty(std::string_view key) const override;
    bool setProperty(std::string_view key, const PropertyValue& value) override;
    void registerInputReportCallback(uint8_t* buffer, uint64_t length, HIDInputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) override;

private:
    struct Registration {
        uint8_t* buffer = nullptr;
        uint64_t length = 0;
        HIDInputReportCallback callback = nullptr;
        void* context = nullptr;
    };

    void readReports();
    void deliver(uint64_t size, uint64_t timestamp);
    void disconnect(int error);

    const int _fd;
    const std::string _path;
    const HidrawIdentity _identity;
    Log _log{"Hidraw"};

    std::mutex _lock;
    Registration _registration;
    DisconnectHandler _disconnectHandler;

    // The run loop's thread only.
    std::unique_ptr<FileDescriptorSource> _source;
    std::shared_ptr<RunLoop> _runLoop;
    std::string _runLoopMode;
    std::vector<uint8_t> _readBuffer;

    std::atomic<bool> _open{false};
    std::atomic<int> _disconnectError{0};
};

// The identity of an open hidraw node, from its ioctls; nullopt (with errno set) when fd is not
// a hidraw node.
std::optional<HidrawIdentity> readHidrawIdentity(int fd);

}  // namespace ZeltoTouch::Platform

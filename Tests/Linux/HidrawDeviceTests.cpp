// Linux device access over stand-ins: a SOCK_SEQPACKET socket pair for a hidraw node (one message
// per read, as hidraw gives one report per read) and a sysfs tree in a temporary folder.
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <linux/input.h>
#include <linux/sockios.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "Platform/CaptureLogSink.h"
#include "Platform/HidrawDevice.h"
#include "Platform/HidrawDiscovery.h"
#include "Platform/TimerSource.h"
#include "Shared/Util/HostClock.h"
#include "Tests/Tools/ToolsTestSupport.h"

namespace ZeltoTouch::Platform {
namespace {

const std::string kMode = "HidrawTestMode";

// Every reading is one tick later than the one before: arrival times are told apart by order.
class TickingClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {}; }
    uint64_t machTimeNow() const noexcept override { return _now.fetch_add(1) + 1; }
    void sleepMicroseconds(uint64_t) const noexcept override {}

private:
    mutable std::atomic<uint64_t> _now{1000};
};

struct ReceivedReport {
    ZeltoReturn result;
    std::vector<uint8_t> bytes;
    uint64_t timestamp;
};

// A HidrawDevice over one end of the socket pair; the test writes reports into the other end.
class HidrawReportLoop : public ::testing::Test {
protected:
    void SetUp() override {
        int fds[2];
        ASSERT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, fds), 0);
        _peer = fds[1];
        _device = std::make_unique<HidrawDevice>(
            fds[0], "/dev/hidraw-test",
            HidrawIdentity{BUS_USB, 0x5A54, 0x0001, "Zelto Touch Sensor", "usb-0000:00:14.0-2/input0", ""});
        Util::setHostClock(&_clock);
        Log::setSink(&_log);
    }
    void TearDown() override {
        _device.reset();
        if (_peer >= 0) ::close(_peer);
        Log::setSink(nullptr);
        Util::setHostClock(nullptr);
    }

    void listen(uint64_t bufferLength) {
        _buffer.assign(bufferLength, 0);
        _device->registerInputReportCallback(_buffer.data(), _buffer.size(), &HidrawReportLoop::received, this);
        _device->scheduleWithRunLoop(RunLoop::current(), kMode);
    }

    void send(const std::vector<uint8_t>& report) {
        ASSERT_EQ(::send(_peer, report.data(), report.size(), 0), static_cast<ssize_t>(report.size()));
    }

    // Runs the current run loop until done() holds, looking every millisecond; fails after 5 s.
    template <typename Predicate>
    void runUntil(Predicate done) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        bool timedOut = false;
        TimerSource check(std::chrono::milliseconds(1), [&] {
            timedOut = std::chrono::steady_clock::now() > deadline;
            if (done() || timedOut) RunLoop::current()->stop();
        });
        check.attach(RunLoop::current(), kMode);
        RunLoop::current()->runInMode(kMode);
        ASSERT_FALSE(timedOut) << "the run loop never got there";
    }
    void runUntilThePeerHasNothingQueued() {
        int pending = 0;
        runUntil([&] { return ::ioctl(_peer, SIOCOUTQ, &pending) == 0 && pending == 0; });
    }

    static void received(void* context, ZeltoReturn result, void* sender, uint32_t reportType, uint32_t reportID,
                         uint8_t* report, uint64_t length, uint64_t timestamp) {
        auto& self = *static_cast<HidrawReportLoop*>(context);
        EXPECT_EQ(sender, self._device.get());
        EXPECT_EQ(reportType, kHIDReportTypeInput);
        EXPECT_EQ(report, self._buffer.data());
        EXPECT_EQ(reportID, report[0]);
        self._reports.push_back({result, std::vector<uint8_t>(report, report + length), timestamp});
    }

    TickingClock _clock;
    CaptureLogSink _log;
    int _peer = -1;
    std::unique_ptr<HidrawDevice> _device;
    std::vector<uint8_t> _buffer;
    std::vector<ReceivedReport> _reports;
};

TEST_F(HidrawReportLoop, DeliversEachMessageOnlyWhileOpenAsOneReportStampedOnArrivalAndCutOnlyWhenTooLong) {
    listen(73);
    send({1, 1});  // while closed: read and dropped
    runUntilThePeerHasNothingQueued();
    EXPECT_TRUE(_reports.empty());

    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    std::vector<uint8_t> image(73, 0x11), tooLong(80, 0x22);
    image[0] = tooLong[0] = 1;
    const std::vector<std::vector<uint8_t>> sent = {image, {2, 0, 1, 2, 3, 4, 5, 6, 7, 8}, tooLong, {9, 0xAB}};
    for (const auto& report : sent) send(report);
    runUntil([&] { return _reports.size() == sent.size(); });
    ASSERT_EQ(_reports.size(), sent.size());
    for (size_t i = 0; i < sent.size(); ++i) {
        const bool cut = i == 2;
        EXPECT_EQ(_reports[i].result, cut ? EMSGSIZE : kZeltoSuccess) << i;
        EXPECT_EQ(_reports[i].bytes, cut ? std::vector<uint8_t>(tooLong.begin(), tooLong.begin() + 73) : sent[i]) << i;
        EXPECT_GT(_reports[i].timestamp, i == 0 ? 1000u : _reports[i - 1].timestamp) << i;
    }
    EXPECT_FALSE(_device->isDisconnected());

    _device->close(0);
    _device->registerInputReportCallback(nullptr, 0, nullptr, nullptr);
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    send({1, 4});  // no callback registered any more
    runUntilThePeerHasNothingQueued();
    EXPECT_EQ(_reports.size(), sent.size());
}

TEST_F(HidrawReportLoop, APeerThatDisappearsEndsTheReadingCleanly) {
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    std::vector<int> lostErrors;
    _device->setDisconnectHandler([&](int error) { lostErrors.push_back(error); });
    listen(512);
    send({1, 1});
    send({1, 2});
    ::close(std::exchange(_peer, -1));
    runUntil([&] { return !lostErrors.empty(); });

    ASSERT_EQ(_reports.size(), 2u);  // everything sent before the end still arrives, in order
    EXPECT_EQ(_reports[1].bytes, (std::vector<uint8_t>{1, 2}));
    EXPECT_TRUE(_device->isDisconnected());
    EXPECT_EQ(_log.countContaining("Lost /dev/hidraw-test: No such device; no more reports will be read"), 1u);
    EXPECT_EQ(_log.countAtLevel(LogLevel::Error), 1u);
    EXPECT_EQ(_device->open(0), ENODEV);

    // The source is gone: unscheduling and scheduling again are harmless and read nothing.
    _device->unscheduleFromRunLoop(RunLoop::current(), kMode);
    _device->scheduleWithRunLoop(RunLoop::current(), kMode);
    _device->unscheduleFromRunLoop(RunLoop::current(), kMode);
    EXPECT_EQ(lostErrors, std::vector<int>{ENODEV});
}

TEST_F(HidrawReportLoop, FeatureReportsGiveTheErrnoAsStatusAndPropertiesComeFromTheKernelsIdentity) {
    uint8_t buffer[128];
    uint64_t length = sizeof buffer;
    EXPECT_EQ(_device->getReport(kHIDReportTypeFeature, 0x04, buffer, length), ENOTTY);  // a socket knows no hidraw ioctl
    EXPECT_EQ(length, 0u);
    const auto status = [&](HIDReportType type, uint32_t reportID, uint8_t* into, uint64_t size) {
        return _device->getReport(type, reportID, into, size);
    };
    EXPECT_EQ(status(kHIDReportTypeInput, 0x04, buffer, sizeof buffer), kZeltoUnsupported);
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x04, nullptr, sizeof buffer), EINVAL);
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x04, buffer, 0), EINVAL);
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x100, buffer, sizeof buffer), EINVAL);

    EXPECT_EQ(_device->copyProperty("Product").stringView(), "Zelto Touch Sensor");
    EXPECT_EQ(_device->copyProperty("VendorID").toUInt64(), 0x5A54u);
    EXPECT_EQ(_device->copyProperty("ProductID").toUInt64(), 0x0001u);
    EXPECT_EQ(_device->copyProperty("Transport").stringView(), "USB");
    EXPECT_EQ(_device->copyProperty("PhysicalPath").stringView(), "usb-0000:00:14.0-2/input0");
    EXPECT_EQ(_device->copyProperty("DevicePath").stringView(), "/dev/hidraw-test");
    EXPECT_FALSE(_device->copyProperty("SerialNumber").hasValue());  // the kernel has none
    EXPECT_FALSE(_device->setProperty("Version", PropertyValue::fromInt32(1)));
    EXPECT_FALSE(_device->copyProperty("Version").hasValue());
}

std::string openFailure(const std::string& path) {
    try {
        HidrawDevice::openNode(path);
    } catch (const HidrawOpenError& error) {
        return error.what();
    }
    return "opened " + path;
}

TEST(HidrawOpen, FailuresSayWhatIsWrong) {
    EXPECT_EQ(openFailure("/dev/null"), "/dev/null is not a hidraw device");
    EXPECT_EQ(openFailure("/"), "Cannot open /: Is a directory");
}

TEST(HidrawOpen, PermissionDeniedPointsAtTheUdevRule) {
    if (::geteuid() == 0) GTEST_SKIP() << "root may open anything";
    const Testing::TemporaryDirectory folder;
    const std::string path = folder.write("hidraw", "");
    ::chmod(path.c_str(), 0);
    EXPECT_EQ(openFailure(path), "Permission denied opening " + path +
                                     ": install the udev rule 70-zelto-touch.rules (it gives the zelto-touch group "
                                     "access to the sensor), then add your user to that group or run as root");
}

TEST(HidrawDiscovery, ListsNodesInNumberOrderWithTheFieldsTheirUeventGivesAndRefusesMalformedIds) {
    const Testing::TemporaryDirectory sysfs;
    EXPECT_TRUE(listHidrawNodes(sysfs.path(), "/dev").empty());  // no hidraw class: no driver loaded
    sysfs.write("class/hidraw/hidraw10/device/uevent", "HID_ID=0018:000004F3:00003057\nHID_NAME=Pad = with equals\n");
    sysfs.write("class/hidraw/hidraw2/device/uevent", "HID_ID=0003:00005a54:00000001\nHID_NAME=Zelto Touch Sensor\n"
                                                      "HID_PHYS=usb-0000:00:14.0-2/input0\nHID_UNIQ=ZT-000123\nNOEQUALS\n");
    std::filesystem::create_directories(sysfs.path("class/hidraw/hidraw1"));  // no uevent to read
    const auto nodes = listHidrawNodes(sysfs.path(), "/dev");
    ASSERT_EQ(nodes.size(), 3u);
    EXPECT_EQ(nodes[0].identity, HidrawIdentity{});
    EXPECT_EQ(nodes[1].identity,
              (HidrawIdentity{BUS_USB, 0x5A54, 0x0001, "Zelto Touch Sensor", "usb-0000:00:14.0-2/input0", "ZT-000123"}));
    EXPECT_EQ(nodes[1].devicePath, "/dev/hidraw2");
    EXPECT_EQ(nodes[2].identity.name, "Pad = with equals");
    EXPECT_EQ(nodes[2].identity.transportName(), "I2C");
    EXPECT_EQ(nodesMatching(nodes, kZeltoSensorID).size(), 1u);

    for (const char* malformed : {"HID_ID=0003:00005A54", "HID_ID=0003::00000001", "HID_ID=0003:000000005A54:1"}) {
        EXPECT_EQ(parseHidUevent(malformed), HidrawIdentity{}) << malformed;
    }
    EXPECT_EQ(parseHidUevent("HID_ID=garbage\nHID_NAME=Odd\n"), (HidrawIdentity{0, 0, 0, "Odd", "", ""}));
}

TEST(HidrawDiscovery, VendorProductIsAHexPairAndNothingElse) {
    EXPECT_EQ(parseVendorProduct("5A54:1"), kZeltoSensorID);
    for (const char* bad : {"", "5a54", ":0001", "5a54:00001", "0x5a54:0001", "5a54:000g", "5a54:0001:2", "-1:0001"}) {
        EXPECT_FALSE(parseVendorProduct(bad)) << bad;
    }
    EXPECT_EQ(formatVendorProduct(kZeltoSensorID), "5a54:0001");
}

}  // namespace
}  // namespace ZeltoTouch::Platform

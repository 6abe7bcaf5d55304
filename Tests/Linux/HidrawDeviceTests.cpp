#include <gmock/gmock.h>
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
#include <vector>

#include "Platform/CaptureLogSink.h"
#include "Platform/HidrawDevice.h"
#include "Platform/TimerSource.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

const std::string kMode = "HidrawTestMode";
const HidrawIdentity kIdentity{BUS_USB, 0x5A54, 0x0001, "Zelto Touch Sensor", "usb-0000:00:14.0-2/input0", ""};

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
    uint32_t reportID;
    std::vector<uint8_t> bytes;
    uint64_t timestamp;
};

// A HidrawDevice over one end of a SOCK_SEQPACKET socket pair, which delivers one message per
// read just as a hidraw node delivers one report; the test writes reports into the other end.
class HidrawReportLoop : public ::testing::Test {
protected:
    void SetUp() override {
        int fds[2];
        ASSERT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, fds), 0);
        _peer = fds[1];
        _device = std::make_unique<HidrawDevice>(fds[0], "/dev/hidraw-test", kIdentity);
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

    void send(std::vector<uint8_t> report) {
        ASSERT_EQ(::send(_peer, report.data(), report.size(), 0), static_cast<ssize_t>(report.size()));
    }

    void closePeer() {
        ::close(_peer);
        _peer = -1;
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

    static void received(void* context, ZeltoReturn result, void* sender, uint32_t reportType, uint32_t reportID,
                         uint8_t* report, uint64_t length, uint64_t timestamp) {
        auto& self = *static_cast<HidrawReportLoop*>(context);
        EXPECT_EQ(sender, self._device.get());
        EXPECT_EQ(reportType, kHIDReportTypeInput);
        EXPECT_EQ(report, self._buffer.data());
        self._reports.push_back({result, reportID, std::vector<uint8_t>(report, report + length), timestamp});
    }

    TickingClock _clock;
    CaptureLogSink _log;
    int _peer = -1;
    std::unique_ptr<HidrawDevice> _device;
    std::vector<uint8_t> _buffer;
    std::vector<ReceivedReport> _reports;
};

TEST_F(HidrawReportLoop, DeliversEachMessageAsOneReportStampedOnArrival) {
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    listen(512);
    std::vector<uint8_t> image(73, 0x11);
    image[0] = 1;
    send(image);
    send({2, 0, 1, 2, 3, 4, 5, 6, 7, 8});
    send({9, 0xAB});
    runUntil([&] { return _reports.size() == 3; });

    ASSERT_EQ(_reports.size(), 3u);
    EXPECT_EQ(_reports[0].bytes, image);
    EXPECT_EQ(_reports[1].bytes, (std::vector<uint8_t>{2, 0, 1, 2, 3, 4, 5, 6, 7, 8}));
    EXPECT_EQ(_reports[2].bytes, (std::vector<uint8_t>{9, 0xAB}));
    for (size_t i = 0; i < _reports.size(); ++i) {
        EXPECT_EQ(_reports[i].result, kZeltoSuccess);
        EXPECT_EQ(_reports[i].reportID, _reports[i].bytes[0]);
    }
    EXPECT_GT(_reports[0].timestamp, 1000u);
    EXPECT_LT(_reports[0].timestamp, _reports[1].timestamp);
    EXPECT_LT(_reports[1].timestamp, _reports[2].timestamp);
    EXPECT_FALSE(_device->isDisconnected());
}

TEST_F(HidrawReportLoop, AReportLongerThanTheBufferArrivesCutAndFlagged) {
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    listen(8);
    std::vector<uint8_t> image(73, 0x22);
    image[0] = 1;
    send(image);
    send({2, 3});
    runUntil([&] { return _reports.size() == 2; });
    ASSERT_EQ(_reports.size(), 2u);
    EXPECT_EQ(_reports[0].result, EMSGSIZE);
    EXPECT_EQ(_reports[0].bytes, std::vector<uint8_t>(image.begin(), image.begin() + 8));
    EXPECT_EQ(_reports[1].result, kZeltoSuccess);
    EXPECT_EQ(_reports[1].bytes, (std::vector<uint8_t>{2, 3}));
}

TEST_F(HidrawReportLoop, ReportsArrivingWhileClosedAreReadAndDropped) {
    listen(512);
    send({1, 1});
    send({1, 2});
    int pending = 0;
    runUntil([&] { return ::ioctl(_peer, SIOCOUTQ, &pending) == 0 && pending == 0; });  // both consumed
    EXPECT_TRUE(_reports.empty());

    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    send({1, 3});
    runUntil([&] { return !_reports.empty(); });
    ASSERT_EQ(_reports.size(), 1u);
    EXPECT_EQ(_reports[0].bytes, (std::vector<uint8_t>{1, 3}));

    _device->close(0);
    _device->registerInputReportCallback(nullptr, 0, nullptr, nullptr);
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    send({1, 4});  // no callback registered any more
    runUntil([&] { return ::ioctl(_peer, SIOCOUTQ, &pending) == 0 && pending == 0; });
    EXPECT_EQ(_reports.size(), 1u);
}

TEST_F(HidrawReportLoop, APeerThatDisappearsEndsTheReadingCleanly) {
    ASSERT_EQ(_device->open(0), kZeltoSuccess);
    int lostError = 0;
    int handlerCalls = 0;
    _device->setDisconnectHandler([&](int error) {
        lostError = error;
        ++handlerCalls;
    });
    listen(512);
    send({1, 1});
    send({1, 2});
    closePeer();
    runUntil([&] { return handlerCalls > 0; });

    ASSERT_EQ(_reports.size(), 2u);  // everything sent before the end still arrives, in order
    EXPECT_EQ(_reports[1].bytes, (std::vector<uint8_t>{1, 2}));
    EXPECT_EQ(handlerCalls, 1);
    EXPECT_EQ(lostError, ENODEV);
    EXPECT_TRUE(_device->isDisconnected());
    EXPECT_EQ(_log.countContaining("Lost /dev/hidraw-test: No such device; no more reports will be read"), 1u);
    EXPECT_EQ(_log.countAtLevel(LogLevel::Error), 1u);
    EXPECT_EQ(_device->open(0), ENODEV);

    // The source is gone: unscheduling and scheduling again are harmless and read nothing.
    _device->unscheduleFromRunLoop(RunLoop::current(), kMode);
    _device->scheduleWithRunLoop(RunLoop::current(), kMode);
    _device->unscheduleFromRunLoop(RunLoop::current(), kMode);
    EXPECT_EQ(handlerCalls, 1);
}

TEST_F(HidrawReportLoop, AFeatureReportTheDescriptorRejectsGivesTheErrnoAsStatus) {
    uint8_t buffer[128];
    uint64_t length = sizeof buffer;
    const ZeltoReturn status = _device->getReport(kHIDReportTypeFeature, 0x04, buffer, length);
    EXPECT_EQ(status, ENOTTY);  // a socket knows no hidraw ioctl
    EXPECT_EQ(length, 0u);

    length = sizeof buffer;
    EXPECT_EQ(_device->getReport(kHIDReportTypeInput, 0x04, buffer, length), kZeltoUnsupported);
    length = sizeof buffer;
    EXPECT_EQ(_device->getReport(kHIDReportTypeFeature, 0x04, nullptr, length), EINVAL);
    length = 0;
    EXPECT_EQ(_device->getReport(kHIDReportTypeFeature, 0x04, buffer, length), EINVAL);
    length = sizeof buffer;
    EXPECT_EQ(_device->getReport(kHIDReportTypeFeature, 0x100, buffer, length), EINVAL);
}

TEST_F(HidrawReportLoop, PropertiesComeFromTheKernelsIdentityAndCannotBeWritten) {
    EXPECT_EQ(_device->copyProperty("Product").stringView(), "Zelto Touch Sensor");
    EXPECT_EQ(_device->copyProperty("VendorID").toUInt64(), 0x5A54u);
    EXPECT_EQ(_device->copyProperty("ProductID").toUInt64(), 0x0001u);
    EXPECT_EQ(_device->copyProperty("Transport").stringView(), "USB");
    EXPECT_EQ(_device->copyProperty("PhysicalPath").stringView(), "usb-0000:00:14.0-2/input0");
    EXPECT_EQ(_device->copyProperty("DevicePath").stringView(), "/dev/hidraw-test");
    EXPECT_FALSE(_device->copyProperty("SerialNumber").hasValue());  // the kernel has none
    EXPECT_FALSE(_device->copyProperty("Version").hasValue());
    EXPECT_FALSE(_device->setProperty("Version", PropertyValue::fromInt32(1)));
    EXPECT_FALSE(_device->copyProperty("Version").hasValue());
}

TEST(HidrawOpen, FailuresSayWhatIsWrong) {
    struct Case {
        const char* path;
        const char* expected;
    };
    const Case cases[] = {
        {"/dev/hidraw-missing-for-test",
         "/dev/hidraw-missing-for-test does not exist: is the sensor plugged in? (`zelto-touch devices` lists the "
         "hidraw nodes)"},
        {"/dev/null", "/dev/null is not a hidraw device"},
        {"/", "Cannot open /: Is a directory"},
    };
    for (const auto& entry : cases) {
        try {
            HidrawDevice::openNode(entry.path);
            ADD_FAILURE() << "opened " << entry.path;
        } catch (const HidrawOpenError& error) {
            EXPECT_STREQ(error.what(), entry.expected);
        }
    }
}

TEST(HidrawOpen, PermissionDeniedPointsAtTheUdevRule) {
    if (::geteuid() == 0) GTEST_SKIP() << "root may open anything";
    char path[] = "/tmp/zelto-hidraw-denied-XXXXXX";
    const int fd = ::mkstemp(path);
    ASSERT_GE(fd, 0);
    ::fchmod(fd, 0);
    ::close(fd);
    try {
        HidrawDevice::openNode(path);
        ADD_FAILURE() << "opened " << path;
    } catch (const HidrawOpenError& error) {
        EXPECT_EQ(std::string(error.what()),
                  std::string("Permission denied opening ") + path +
                      ": install the udev rule 70-zelto-touch.rules (it gives the zelto-touch group access to the "
                      "sensor), then add your user to that group or run as root");
    }
    ::unlink(path);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

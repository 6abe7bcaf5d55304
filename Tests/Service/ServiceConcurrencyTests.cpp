// The service under load from several threads at once; run under ThreadSanitizer too.

#include <atomic>
#include <chrono>
#include <thread>

#include <gtest/gtest.h>

#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// Posts the reports of a gesture script to the device, round and round, while it runs.
class ReportFeeder {
public:
    explicit ReportFeeder(InjectingDevice& device)
        : _reports(reportsOfScript("tap volume-up 120ms\nidle 200ms\nhold play-pause 600ms\nidle 200ms\n")),
          _thread([this, &device] {
              for (size_t i = 0; !_stop.load(); ++i) {
                  if (device.post(_reports[i % _reports.size()])) _posted.fetch_add(1);
                  std::this_thread::sleep_for(std::chrono::microseconds(200));
              }
          }) {}
    ~ReportFeeder() {
        _stop = true;
        _thread.join();
    }
    uint64_t posted() const { return _posted.load(); }

private:
    const std::vector<Bytes> _reports;
    std::atomic<bool> _stop{false};
    std::atomic<uint64_t> _posted{0};
    std::thread _thread;
};

class ServiceConcurrency : public testing::Test {
protected:
    void SetUp() override {
        logCapture().clear();
        baselineThreads = threadCount();
        ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
        service->setEventCallback(EventCollector::callback, &collector, nullptr);
    }

    size_t baselineThreads = 0;
    RegisteredDevice registered;
    ServicePointer service = makeService();
    ZeltoTouchHIDServiceInspector inspector{*service};
    std::shared_ptr<Platform::DispatchQueue> queue = Platform::DispatchQueue::create("concurrency host queue");
    EventCollector collector{queue};
};

TEST_F(ServiceConcurrency, PropertiesFromAnotherThreadWhileReportsFlow) {
    service->scheduleWithDispatchQueue(queue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());
    {
        ReportFeeder feeder(*registered.device);
        std::thread host([&] {
            // Until well over a thousand reports have gone by, so reads and reports overlap.
            const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
            for (int round = 0; (round < 40 || feeder.posted() < 1500) && std::chrono::steady_clock::now() < deadline;
                 ++round) {
                EXPECT_TRUE(service->setProperty(PropertyValue::fromBool(round % 2 == 0),
                                                 PropertyValue::string("Pipeline.Algs.EnableTapSuppression")));
                EXPECT_TRUE(service->getPropertyForKey(PropertyValue::string("Pipeline.Algs.EventStats")).hasValue());
                EXPECT_TRUE(service->getPropertyForKey(PropertyValue::string("Recording")).isString());
                EXPECT_EQ(service->getPropertyForKey(PropertyValue::string("FirmwareDebugReports")).count(), 10u);
                EXPECT_TRUE(service->getPropertyForKey(PropertyValue::string("ServicePluginDebug")).hasValue());
            }
        });
        host.join();
        EXPECT_GE(feeder.posted(), 1500u);
    }
    service->unscheduleWithDispatchQueue(queue);
    queue->barrier();
    EXPECT_EQ(inspector.installedProbeCount(), 0);
    EXPECT_LE(inspector.recording().frames().size(), 2 * ZeltoTouchHIDService::kMaxRecordedFrames);
}

TEST_F(ServiceConcurrency, TwoHundredScheduleCyclesWithReportsFlowing) {
    {
        ReportFeeder feeder(*registered.device);
        for (int cycle = 0; cycle < 200; ++cycle) {
            service->scheduleWithDispatchQueue(queue);
            if (cycle % 2 == 0) std::this_thread::sleep_for(std::chrono::microseconds(500));
            service->unscheduleWithDispatchQueue(queue);
            ASSERT_EQ(inspector.installedProbeCount(), 0) << "cycle " << cycle;
        }
        EXPECT_GT(feeder.posted(), 0u);
    }
    queue->barrier();
    EXPECT_EQ(threadCount(), baselineThreads);
    EXPECT_EQ(logCapture().countEqual("input report thread start"), 200u);
    EXPECT_EQ(logCapture().countEqual("input report thread exited"), 200u);
    EXPECT_FALSE(inspector.hasInputReportRunLoop());
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

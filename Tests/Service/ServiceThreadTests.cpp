// The service with its input report thread running; run under ThreadSanitizer too.

#include <algorithm>
#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "Platform/Thread.h"
#include "Platform/Trace.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

constexpr const char* kTapScript = "idle 100ms\ntap volume-up 120ms\nidle 600ms\n";

class ServiceThread : public testing::Test {
protected:
    void SetUp() override {
        logCapture().clear();
        baselineThreads = threadCount();
        ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
        ASSERT_TRUE(service->openWithOptions(0));
    }
    void TearDown() override {
        service->unscheduleWithDispatchQueue(queue);
        queue->barrier();
    }

    void schedule(bool withCallback = true) {
        if (withCallback) service->setEventCallback(EventCollector::callback, &collector, &refcon);
        service->scheduleWithDispatchQueue(queue);
        ASSERT_TRUE(registered.device->waitUntilScheduled());
    }
    void deliverAll(const std::vector<Bytes>& reports) {
        for (const Bytes& report : reports) ASSERT_TRUE(registered.device->deliver(report));
        queue->barrier();
    }

    size_t baselineThreads = 0;
    RegisteredDevice registered;
    ServicePointer service = makeService();
    ZeltoTouchHIDServiceInspector inspector{*service};
    std::shared_ptr<Platform::DispatchQueue> queue = Platform::DispatchQueue::create("test host queue");
    int refcon = 0;
    EventCollector collector{queue, &refcon, service->getServiceInterface()};
};

TEST_F(ServiceThread, ScheduleStartsOneThreadWithSixProbesASecondReplacesItAndUnscheduleEndsIt) {
    schedule();
    EXPECT_EQ(inspector.installedProbeCount(), 6);
    EXPECT_EQ(threadCount(), baselineThreads + 1);
    EXPECT_EQ(logCapture().countEqual("input report thread start"), 1u);

    auto secondQueue = Platform::DispatchQueue::create("second host queue");
    EventCollector secondCollector(secondQueue, nullptr, service->getServiceInterface());
    const long references = secondQueue.use_count();
    service->setEventCallback(EventCollector::callback, &secondCollector, nullptr);
    service->scheduleWithDispatchQueue(secondQueue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());
    EXPECT_EQ(threadCount(), baselineThreads + 2) << "one input report thread and the second queue";
    EXPECT_EQ(logCapture().countEqual("input report thread end"), 1u);
    deliverAll(reportsOfScript(kTapScript));
    secondQueue->barrier();
    EXPECT_TRUE(collector.events().empty());
    EXPECT_FALSE(secondCollector.events().empty());

    service->unscheduleWithDispatchQueue(secondQueue);
    EXPECT_EQ(inspector.installedProbeCount(), 0);
    EXPECT_EQ(threadCount(), baselineThreads + 1) << "only the second queue's";
    EXPECT_EQ(secondQueue.use_count(), references);
    EXPECT_FALSE(registered.device->post({0x01})) << "the device is unscheduled";
    for (const char* line : {"signalling input report thread to exit", "waiting for input report thread to exit",
                             "input report thread end", "input report thread exited"}) {
        EXPECT_EQ(logCapture().countEqual(line), 2u) << line;
    }
}

TEST_F(ServiceThread, WithoutASchedulingOrADeviceNoThreadStartsNoQueueIsKeptAndOpenFails) {
    const long references = queue.use_count();
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(logCapture().countEqual("signalling input report thread to exit"), 0u);
    EXPECT_EQ(service->stop(), kZeltoSuccess);
    EXPECT_FALSE(service->openWithOptions(1));
    service->closeWithOptions(1);
    EXPECT_EQ(registered.device->openOptions, (std::vector<uint32_t>{0})) << "only the fixture's";
    EXPECT_TRUE(registered.device->closeOptions.empty());
    service->scheduleWithDispatchQueue(queue);
    EXPECT_EQ(threadCount(), baselineThreads);
    EXPECT_EQ(logCapture().countContaining("no device"), 1u);
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(queue.use_count(), references);
}

TEST_F(ServiceThread, ADigitizerEventArmsTheAccelerometerFeedAndWithoutCallbackEventsAreDropped) {
    const ScopedNoEventServices noAccelerometer;  // no samples, so nothing counts down
    schedule(false);
    EXPECT_EQ(logCapture().countContaining("Failed to create accel system: "), 1u);
    EXPECT_EQ(inspector.accel().samplesNeededCount, 0u);
    deliverAll(reportsOfScript(kTapScript));
    EXPECT_GT(logCapture().countContaining("Dispatch event: "), 0u);
    EXPECT_TRUE(collector.events().empty());
    EXPECT_EQ(inspector.accel().samplesNeededCount, 100u);
}

// Without the privilege for realtime scheduling the thread logs the refusal and runs on.
TEST_F(ServiceThread, ReportsAreStampedWithTheProcessingTimeProbesTraceAndLogAndARefusedPolicyIsLogged) {
    int policyStatus = 0;
    std::thread([&] { policyStatus = Platform::setRealtimeRoundRobin(63); }).join();
    Platform::ScopedTraceRecorder traces;
    schedule();
    const uint64_t before = Util::hostClock().machTimeNow();
    ASSERT_TRUE(registered.device->deliver({0x07, 0x08}));
    const uint64_t after = Util::hostClock().machTimeNow();
    ASSERT_TRUE(registered.device->deliver({}));
    ASSERT_TRUE(registered.device->deliver({0x02, 0x05, 0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08}));
    ASSERT_TRUE(registered.device->deliver({0x02, 0x00, 0, 0, 0, 0, 0, 0, 0, 0}));  // a reset: one vendor event
    auto images = reportsOfScript("idle 40ms\n");
    images.erase(images.begin() + 1);  // frame 1 goes missing
    deliverAll(images);

    const PipelineRecording recording(service->getPropertyForKey(PropertyValue::string("Recording")));
    const auto report =
        std::ranges::find(recording.frames(), PipelineRecording::Frame::Type::InputReport, &PipelineRecording::Frame::type);
    ASSERT_NE(report, recording.frames().end());
    EXPECT_GE(report->timestamp, Util::nanosecondsFromMachTime(before));
    EXPECT_LE(report->timestamp, Util::nanosecondsFromMachTime(after));

    using Record = Platform::TraceRecorder::Record;
    const auto inputTraces = traces.recorder().recordsWithCode(0x2B150180);
    ASSERT_EQ(inputTraces.size(), 4 + images.size());
    EXPECT_EQ(inputTraces[0], (Record{0x2B150180, {7, 8, 0, 0}}));
    EXPECT_EQ(inputTraces[1], (Record{0x2B150180, {0, 0, 0, 0}}));
    EXPECT_EQ(inputTraces[2], (Record{0x2B150180, {2, 5, 1, 2}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B15018C),
              (std::vector<Record>{{0x2B15018C, {5, 0x0102030405060708u, 0, 0}}, {0x2B15018C, {0, 0, 0, 0}}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B150184), (std::vector<Record>{{0x2B150184, {1, 0, 0, 0}}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B150188),
              (std::vector<Record>{{0x2B150188, {kHIDEventTypeVendorDefined, 0, 0, 0}}}));

    for (const char* line : {"Received input report (type 0, reportID 7, reportLength 2, timestampMach 7)",
                             "Invalid input report with ID 7", "Invalid input report len==0",
                             "Firmware event probe; event: 5, context: 102030405060708", "HID events probe: 1 event(s)",
                             "Dispatch 1 event(s) takeoff", "Dispatch 1 event(s) land", "Received image frame: 0",
                             "Received image frame: 2", "Disjoint image (frame number: 0 -> 2)\n\n"}) {
        EXPECT_EQ(logCapture().countEqual(line), 1u) << line;
    }
    EXPECT_EQ(logCapture().countEqual(format("pthread_setschedparam failed: %d", policyStatus)), policyStatus ? 1u : 0u);
}

TEST_F(ServiceThread, TwoHundredScheduleCyclesWithReportsFlowing) {
    const auto reports = reportsOfScript(kTapScript);
    std::atomic<uint64_t> posted{0};
    {
        std::jthread feeder([&](std::stop_token stop) {
            for (size_t i = 0; !stop.stop_requested(); ++i) {
                if (registered.device->post(reports[i % reports.size()])) ++posted;
                std::this_thread::sleep_for(std::chrono::microseconds(200));
            }
        });
        for (int cycle = 0; cycle < 200; ++cycle) {
            service->scheduleWithDispatchQueue(queue);
            if (cycle % 2 == 0) std::this_thread::sleep_for(std::chrono::microseconds(500));
            service->unscheduleWithDispatchQueue(queue);
            ASSERT_EQ(inspector.installedProbeCount(), 0) << "cycle " << cycle;
        }
    }
    EXPECT_GT(posted.load(), 0u);
    queue->barrier();
    EXPECT_EQ(threadCount(), baselineThreads);
    EXPECT_EQ(logCapture().countEqual("input report thread start"), 200u);
    EXPECT_EQ(logCapture().countEqual("input report thread exited"), 200u);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

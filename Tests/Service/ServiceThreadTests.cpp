#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "Platform/Thread.h"
#include "Platform/Trace.h"
#include "Shared/Util/MachTime.h"
#include "Tests/Service/ServiceInspector.h"
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

    void schedule() {
        service->setEventCallback(EventCollector::callback, &collector, &refcon);
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
    EventCollector collector{queue};
    int refcon = 0;
};

TEST_F(ServiceThread, ScheduleInstallsSixProbesAndUnscheduleRemovesThemAndEndsTheThread) {
    schedule();
    EXPECT_EQ(inspector.installedProbeCount(), 6);
    EXPECT_EQ(threadCount(), baselineThreads + 1);
    EXPECT_EQ(logCapture().countEqual("input report thread start"), 1u);

    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(inspector.installedProbeCount(), 0);
    EXPECT_FALSE(inspector.hasInputReportRunLoop());
    EXPECT_EQ(inspector.dispatchEventInfo().queue, nullptr);
    EXPECT_EQ(threadCount(), baselineThreads);
    EXPECT_FALSE(registered.device->isScheduled());
    for (const char* line : {"signalling input report thread to exit", "waiting for input report thread to exit",
                             "input report thread end", "input report thread exited"}) {
        EXPECT_EQ(logCapture().countEqual(line), 1u) << line;
    }
}

TEST_F(ServiceThread, UnschedulingWithoutSchedulingOnlyLetsGoOfTheQueue) {
    const long references = queue.use_count();
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(logCapture().countEqual("signalling input report thread to exit"), 0u);
    EXPECT_EQ(queue.use_count(), references) << "no reference kept";
    EXPECT_EQ(inspector.dispatchEventInfo().queue, nullptr);
    EXPECT_EQ(threadCount(), baselineThreads);
}

TEST_F(ServiceThread, EventsReachTheCallbackOnTheHostQueueInOrder) {
    schedule();
    const auto reports = reportsOfScript(kTapScript);
    deliverAll(reports);

    const auto expected = pipelineEvents(reports);
    ASSERT_FALSE(expected.empty());
    EXPECT_EQ(collector.events(), expected);
    for (const auto& delivery : collector.deliveries()) {
        EXPECT_TRUE(delivery.onQueue);
        EXPECT_EQ(delivery.target, &collector);
        EXPECT_EQ(delivery.refcon, &refcon);
        EXPECT_EQ(delivery.sender, service->getServiceInterface());
        EXPECT_EQ(delivery.options, 0u);
    }
    EXPECT_EQ(logCapture().countContaining("Dispatch event: "), expected.size());
}

TEST_F(ServiceThread, ADigitizerEventArmsTheAccelerometerFeed) {
    const ScopedEventServices noAccelerometer({});  // no samples, so nothing counts down
    schedule();
    EXPECT_EQ(logCapture().countContaining("Failed to create accel system: "), 1u);
    EXPECT_EQ(inspector.accel().samplesNeededCount, 0u);
    deliverAll(reportsOfScript(kTapScript));
    ASSERT_FALSE(collector.events().empty());
    EXPECT_EQ(inspector.accel().samplesNeededCount, 100u);
}

TEST_F(ServiceThread, ReportsAreStampedWithTheProcessingTime) {
    schedule();
    const uint64_t before = Util::hostClock().machTimeNow();
    ASSERT_TRUE(registered.device->deliver({0x01, 0x02}));
    const uint64_t after = Util::hostClock().machTimeNow();
    const auto frames = inspector.recording().frames();
    const auto report = std::find_if(frames.begin(), frames.end(), [](const PipelineRecording::Frame& frame) {
        return frame.type == PipelineRecording::Frame::Type::InputReport;
    });
    ASSERT_NE(report, frames.end());
    EXPECT_GE(report->timestamp, Util::nanosecondsFromMachTime(before));
    EXPECT_LE(report->timestamp, Util::nanosecondsFromMachTime(after));
    EXPECT_EQ(logCapture().countEqual(
                  "Received input report (type 0, reportID 1, reportLength 2, timestampMach 7)"),
              1u);
}

TEST_F(ServiceThread, ProbesTraceAndLog) {
    Platform::ScopedTraceRecorder traces;
    schedule();
    ASSERT_TRUE(registered.device->deliver({0x07, 0x08}));
    ASSERT_TRUE(registered.device->deliver({}));
    ASSERT_TRUE(registered.device->deliver({0x02, 0x05, 0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08}));
    ASSERT_TRUE(registered.device->deliver({0x02, 0x00, 0, 0, 0, 0, 0, 0, 0, 0}));  // a reset: one vendor event
    queue->barrier();

    using Record = Platform::TraceRecorder::Record;
    const auto inputTraces = traces.recorder().recordsWithCode(0x2B150180);
    ASSERT_EQ(inputTraces.size(), 4u);
    EXPECT_EQ(inputTraces[0], (Record{0x2B150180, {7, 8, 0, 0}}));
    EXPECT_EQ(inputTraces[1], (Record{0x2B150180, {0, 0, 0, 0}}));
    EXPECT_EQ(inputTraces[2], (Record{0x2B150180, {2, 5, 1, 2}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B15018C),
              (std::vector<Record>{{0x2B15018C, {5, 0x0102030405060708u, 0, 0}}, {0x2B15018C, {0, 0, 0, 0}}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B150184), (std::vector<Record>{{0x2B150184, {1, 0, 0, 0}}}));
    EXPECT_EQ(traces.recorder().recordsWithCode(0x2B150188),
              (std::vector<Record>{{0x2B150188, {kHIDEventTypeVendorDefined, 0, 0, 0}}}));

    EXPECT_EQ(logCapture().countEqual("Invalid input report with ID 7"), 1u);
    EXPECT_EQ(logCapture().countEqual("Invalid input report len==0"), 1u);
    EXPECT_EQ(logCapture().countEqual("Firmware event probe; event: 5, context: 102030405060708"), 1u);
    EXPECT_EQ(logCapture().countEqual("HID events probe: 1 event(s)"), 1u);
    EXPECT_EQ(logCapture().countEqual("Dispatch 1 event(s) takeoff"), 1u);
    EXPECT_EQ(logCapture().countEqual("Dispatch 1 event(s) land"), 1u);
}

TEST_F(ServiceThread, ImageProbesLogFramesAndGaps) {
    schedule();
    auto reports = reportsOfScript("idle 40ms\n");
    ASSERT_GE(reports.size(), 3u);
    reports.erase(reports.begin() + 1);  // frame 1 goes missing
    deliverAll(reports);
    EXPECT_EQ(logCapture().countEqual("Received image frame: 0"), 1u);
    EXPECT_EQ(logCapture().countEqual("Received image frame: 2"), 1u);
    EXPECT_EQ(logCapture().countEqual("Disjoint image (frame number: 0 -> 2)\n\n"), 1u);
}

TEST_F(ServiceThread, ARefusedRealtimePolicyIsLoggedAndTheThreadRunsOn) {
    int expectedStatus = 0;
    std::thread([&] { expectedStatus = Platform::setRealtimeRoundRobin(63); }).join();
    schedule();
    ASSERT_TRUE(registered.device->deliver({0x01}));
    EXPECT_EQ(logCapture().countEqual(format("pthread_setschedparam failed: %d", expectedStatus)),
              expectedStatus != 0 ? 1u : 0u);
}

TEST_F(ServiceThread, WithoutDeviceNoThreadStarts) {
    ASSERT_EQ(service->stop(), kZeltoSuccess);
    const long references = queue.use_count();
    service->setEventCallback(EventCollector::callback, &collector, nullptr);
    service->scheduleWithDispatchQueue(queue);
    EXPECT_EQ(threadCount(), baselineThreads);
    EXPECT_EQ(logCapture().countContaining("no device"), 1u);
    service->unscheduleWithDispatchQueue(queue);
    EXPECT_EQ(queue.use_count(), references) << "the stored queue is let go";
}

TEST_F(ServiceThread, WithoutCallbackEventsAreDropped) {
    service->scheduleWithDispatchQueue(queue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());
    deliverAll(reportsOfScript(kTapScript));
    EXPECT_GT(logCapture().countContaining("Dispatch event: "), 0u);
    EXPECT_TRUE(collector.deliveries().empty());
}

TEST_F(ServiceThread, SchedulingTwiceReplacesTheThread) {
    schedule();
    auto secondQueue = Platform::DispatchQueue::create("second host queue");
    EventCollector secondCollector(secondQueue);
    const long references = secondQueue.use_count();
    service->setEventCallback(EventCollector::callback, &secondCollector, nullptr);
    service->scheduleWithDispatchQueue(secondQueue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());
    EXPECT_EQ(threadCount(), baselineThreads + 2) << "one input report thread and the second queue";
    EXPECT_EQ(logCapture().countEqual("input report thread end"), 1u);

    for (const Bytes& report : reportsOfScript(kTapScript)) ASSERT_TRUE(registered.device->deliver(report));
    secondQueue->barrier();
    queue->barrier();
    EXPECT_TRUE(collector.deliveries().empty());
    EXPECT_FALSE(secondCollector.deliveries().empty());
    EXPECT_TRUE(secondCollector.deliveries().front().onQueue);
    service->unscheduleWithDispatchQueue(secondQueue);
    EXPECT_EQ(secondQueue.use_count(), references);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

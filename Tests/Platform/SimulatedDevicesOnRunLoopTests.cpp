// The simulated sensor and accelerometer delivering in real time on the calling thread's run loop.
#include <gtest/gtest.h>

#include "Platform/EventSystemClient.h"
#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/SimulatedSensor.h"
#include "Platform/TimerSource.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;
const std::string kMode = "kHandleInputReportsRunLoopMode";

struct Delivery {
    ZeltoReturn result;
    uint32_t reportID;
    std::vector<uint8_t> bytes;
    uint64_t timestamp;
};

// Plays the sensor's script on this thread's run loop until stopAfter reports have arrived or,
// failing that, for at most the given time.
std::vector<Delivery> play(SimulatedSensor& sensor, uint64_t bufferLength, size_t stopAfter,
                           std::chrono::milliseconds atMost = 5s) {
    struct Receiver {
        std::vector<Delivery> deliveries;
        size_t stopAfter;
        static void callback(void* context, ZeltoReturn result, void*, uint32_t type, uint32_t reportID, uint8_t* report,
                             uint64_t length, uint64_t timestamp) {
            auto* receiver = static_cast<Receiver*>(context);
            EXPECT_EQ(type, kHIDReportTypeInput);
            receiver->deliveries.push_back({result, reportID, std::vector<uint8_t>(report, report + length), timestamp});
            if (receiver->deliveries.size() == receiver->stopAfter) RunLoop::current()->stop();
        }
    } receiver{{}, stopAfter};
    std::vector<uint8_t> buffer(bufferLength);
    auto runLoop = RunLoop::current();
    sensor.registerInputReportCallback(buffer.data(), buffer.size(), &Receiver::callback, &receiver);
    sensor.scheduleWithRunLoop(runLoop, kMode);
    TimerSource stopper(atMost, [&] { runLoop->stop(); });
    stopper.attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    sensor.unscheduleFromRunLoop(runLoop, kMode);
    sensor.registerInputReportCallback(nullptr, 0, nullptr, nullptr);
    return receiver.deliveries;
}

TEST(SimulatedSensorPlayback, DeliversTheScriptOnTheRunLoopIntoTheCallersBuffer) {
    installMonotonicClock();
    SimulatedSensor sensor(GestureScriptParser::parse("idle 30ms\nreset\ntap volume-up 40ms"), {.framePeriodMs = 5});
    ASSERT_EQ(sensor.open(0), kZeltoSuccess);
    const uint64_t before = Util::hostClock().machTimeNow();
    const auto deliveries = play(sensor, 512, 8);

    ASSERT_EQ(deliveries.size(), 8u);
    const std::vector<uint32_t> expectedIDs = {1, 1, 1, 1, 1, 1, 2, 1};
    for (size_t i = 0; i < deliveries.size(); ++i) {
        EXPECT_EQ(deliveries[i].result, kZeltoSuccess);
        EXPECT_EQ(deliveries[i].reportID, expectedIDs[i]) << i;
        EXPECT_EQ(deliveries[i].bytes[0], expectedIDs[i]);
        EXPECT_GE(deliveries[i].timestamp, deliveries[i > 0 ? i - 1 : 0].timestamp);
    }
    // Real-time pacing: the sixth report is due 25 ms into the script and never comes early (a
    // late first delivery under load may bunch the others, so only the start is a safe origin).
    EXPECT_GE(deliveries[5].timestamp - before, 25'000'000u);
    EXPECT_EQ(sensor.deliveredReportCount(), 8u);
}

TEST(SimulatedSensorPlayback, NothingIsDeliveredWhileClosedAndALongReportIsCutToTheBufferAndFlagged) {
    SimulatedSensor sensor(GestureScriptParser::parse("idle 20ms"), {.framePeriodMs = 2});
    EXPECT_TRUE(play(sensor, 512, 1, 30ms).empty());
    EXPECT_FALSE(sensor.playbackFinished());  // the script waits for the open
    sensor.open(0);
    const auto deliveries = play(sensor, 16, 1);
    ASSERT_EQ(deliveries.size(), 1u);
    EXPECT_EQ(deliveries[0].bytes.size(), 16u);
    EXPECT_EQ(deliveries[0].result, SimulatedSensor::kStatusOverrun);
}

TEST(SimulatedAccelerometer, DeliversEventsAtTheRequestedIntervalOnTheRunLoop) {
    installMonotonicClock();
    auto runLoop = RunLoop::current();
    EXPECT_FALSE(EventSystemClient::create(0));  // only type 1 is made
    auto client = EventSystemClient::create(1);
    client->setMatching(PropertyValue::dictionary(
        {{"PrimaryUsagePage", PropertyValue::fromUInt32(65280)}, {"PrimaryUsage", PropertyValue::fromUInt32(3)}}));
    auto accelerometer = client->copyMatchingServices().at(0);
    EXPECT_EQ(accelerometer->copyProperty("Product").stringView(), "ZeltoTouch Simulated Accelerometer");
    // The interval takes only positive numbers; no other property is writable.
    EXPECT_FALSE(accelerometer->setProperty("ReportInterval", PropertyValue::fromDouble(0)));
    EXPECT_FALSE(accelerometer->setProperty("ReportInterval", PropertyValue::string("fast")));
    EXPECT_FALSE(accelerometer->setProperty("PrimaryUsage", PropertyValue::fromUInt32(9)));
    ASSERT_TRUE(accelerometer->setProperty("ReportInterval", PropertyValue::fromDouble(2000.0)));  // 2 ms

    std::vector<HIDEventRef> events;
    client->registerEventHandler([&](const HIDEventRef& event) {
        events.push_back(event);
        if (events.size() == 20) runLoop->stop();
    });
    client->scheduleWithRunLoop(runLoop, kMode);
    TimerSource watchdog(1s, [&] { runLoop->stop(); });
    watchdog.attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    client->unscheduleFromRunLoop(runLoop, kMode);
    client->unregisterEventHandler();
    accelerometer->setProperty("ReportInterval", PropertyValue::fromDouble(10000.0));

    ASSERT_EQ(events.size(), 20u);
    for (const HIDEventRef& event : events) {
        EXPECT_EQ(event->type(), kHIDEventTypeAccelerometer);
        EXPECT_NEAR(event->doubleValue(kHIDEventFieldAccelerometerZ), -1.0, 0.05);
        EXPECT_NEAR(event->doubleValue(kHIDEventFieldAccelerometerX), 0.0, 0.05);
    }
    // About 19 intervals, not asserted tightly.
    EXPECT_GE(events.back()->timestamp() - events.front()->timestamp(), 19 * 2'000'000u * 8 / 10);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

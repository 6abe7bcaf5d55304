#include <gtest/gtest.h>

#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/SimulatedSensor.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch::Platform {
namespace {

const std::string kMode = "kHandleInputReportsRunLoopMode";

struct Delivery {
    ZeltoReturn result;
    uint32_t reportType, reportID;
    std::vector<uint8_t> bytes;
    uint64_t timestamp;
};

struct Receiver {
    std::vector<Delivery> deliveries;
    std::shared_ptr<RunLoop> runLoop;
    size_t stopAfter = 0;

    static void callback(void* context, ZeltoReturn result, void*, uint32_t type, uint32_t reportID, uint8_t* report,
                         uint64_t length, uint64_t timestamp) {
        auto* receiver = static_cast<Receiver*>(context);
        receiver->deliveries.push_back({result, type, reportID, std::vector<uint8_t>(report, report + length), timestamp});
        if (receiver->deliveries.size() == receiver->stopAfter) receiver->runLoop->stop();
    }
};

TEST(SimulatedSensorPlayback, DeliversTheScriptOnTheRunLoopIntoTheCallersBuffer) {
    installMonotonicClock();
    SimulatedSensor sensor(GestureScriptParser::parse("idle 30ms\nreset\ntap volume-up 40ms"), {.framePeriodMs = 5});
    Receiver receiver{{}, RunLoop::current(), 8};
    uint8_t buffer[512];
    ASSERT_EQ(sensor.open(0), kZeltoSuccess);
    sensor.registerInputReportCallback(buffer, sizeof buffer, &Receiver::callback, &receiver);
    sensor.scheduleWithRunLoop(receiver.runLoop, kMode);
    receiver.runLoop->runInMode(kMode);
    sensor.unscheduleFromRunLoop(receiver.runLoop, kMode);

    ASSERT_EQ(receiver.deliveries.size(), 8u);
    const std::vector<uint32_t> expectedIDs = {1, 1, 1, 1, 1, 1, 2, 1};
    for (size_t i = 0; i < receiver.deliveries.size(); ++i) {
        const Delivery& delivery = receiver.deliveries[i];
        EXPECT_EQ(delivery.result, kZeltoSuccess);
        EXPECT_EQ(delivery.reportType, kHIDReportTypeInput);
        EXPECT_EQ(delivery.reportID, expectedIDs[i]) << i;
        EXPECT_EQ(delivery.bytes[0], expectedIDs[i]);
        if (i > 0) {
            EXPECT_GE(delivery.timestamp, receiver.deliveries[i - 1].timestamp);
        }
    }
    auto first = InputReport::Image::parse(receiver.deliveries[0].bytes.data(), receiver.deliveries[0].bytes.size());
    auto fifth = InputReport::Image::parse(receiver.deliveries[5].bytes.data(), receiver.deliveries[5].bytes.size());
    ASSERT_TRUE(first && fifth);
    EXPECT_EQ(fifth->timestampMs - first->timestampMs, 25u);
    // Real-time pacing: five frame periods of 5 ms lie between the first and the sixth report.
    EXPECT_GE(receiver.deliveries[5].timestamp - receiver.deliveries[0].timestamp, 20'000'000u);
    EXPECT_EQ(sensor.deliveredReportCount(), 8u);
}

TEST(SimulatedSensorPlayback, ALongReportIsCutToTheBufferAndFlagged) {
    SimulatedSensor sensor(GestureScriptParser::parse("idle 20ms"), {.framePeriodMs = 2});
    Receiver receiver{{}, RunLoop::current(), 1};
    uint8_t buffer[16];
    sensor.open(0);
    sensor.registerInputReportCallback(buffer, sizeof buffer, &Receiver::callback, &receiver);
    sensor.scheduleWithRunLoop(receiver.runLoop, kMode);
    receiver.runLoop->runInMode(kMode);
    sensor.unscheduleFromRunLoop(receiver.runLoop, kMode);
    ASSERT_EQ(receiver.deliveries.size(), 1u);
    EXPECT_EQ(receiver.deliveries[0].bytes.size(), 16u);
    EXPECT_EQ(receiver.deliveries[0].result, SimulatedSensor::kStatusOverrun);
}

TEST(SimulatedSensorPlayback, NothingIsDeliveredWhileClosedAndTheScriptWaits) {
    SimulatedSensor sensor(GestureScriptParser::parse("idle 20ms"), {.framePeriodMs = 2});
    auto runLoop = RunLoop::current();
    Receiver receiver{{}, runLoop, 0};
    uint8_t buffer[512];
    sensor.registerInputReportCallback(buffer, sizeof buffer, &Receiver::callback, &receiver);
    sensor.scheduleWithRunLoop(runLoop, kMode);
    TimerSource stopper(std::chrono::milliseconds(30), [&] { runLoop->stop(); });
    stopper.attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    EXPECT_TRUE(receiver.deliveries.empty());
    EXPECT_FALSE(sensor.playbackFinished());
    sensor.unscheduleFromRunLoop(runLoop, kMode);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

#include <gtest/gtest.h>

#include "Platform/EventSystemClient.h"
#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/TimerSource.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;
const std::string kMode = "kHandleInputReportsRunLoopMode";

PropertyValue accelerometerMatching() {
    return PropertyValue::dictionary(
        {{"PrimaryUsagePage", PropertyValue::fromUInt32(65280)}, {"PrimaryUsage", PropertyValue::fromUInt32(3)}});
}

TEST(EventSystemClient, OnlyTypeOneCanBeCreatedAndCreationCanBeRefused) {
    EXPECT_TRUE(EventSystemClient::create(1));
    EXPECT_FALSE(EventSystemClient::create(0));
    EventServiceRegistry::shared().setClientCreationRefused(true);
    EXPECT_FALSE(EventSystemClient::create(1));
    EventServiceRegistry::shared().setClientCreationRefused(false);
}

TEST(EventSystemClient, MatchesTheAccelerometerAndNothingWhenItIsGone) {
    auto client = EventSystemClient::create(1);
    EXPECT_TRUE(client->copyMatchingServices().empty());  // no matching set yet
    client->setMatching(accelerometerMatching());
    const auto services = client->copyMatchingServices();
    ASSERT_EQ(services.size(), 1u);
    EXPECT_EQ(services[0]->copyProperty("Product").stringView(), "ZeltoTouch Simulated Accelerometer");

    EventServiceRegistry::shared().remove(services[0]);
    EXPECT_TRUE(client->copyMatchingServices().empty());
    EventServiceRegistry::shared().add(services[0]);

    client->setMatching(PropertyValue::dictionary({{"PrimaryUsage", PropertyValue::fromUInt32(4)}}));
    EXPECT_TRUE(client->copyMatchingServices().empty());
}

TEST(SimulatedAccelerometer, ReportIntervalTakesOnlyPositiveNumbers) {
    auto client = EventSystemClient::create(1);
    client->setMatching(accelerometerMatching());
    auto accelerometer = client->copyMatchingServices().at(0);
    EXPECT_FALSE(accelerometer->setProperty("ReportInterval", PropertyValue::fromDouble(0)));
    EXPECT_FALSE(accelerometer->setProperty("ReportInterval", PropertyValue::string("fast")));
    EXPECT_FALSE(accelerometer->setProperty("PrimaryUsage", PropertyValue::fromUInt32(9)));
    EXPECT_TRUE(accelerometer->setProperty("ReportInterval", PropertyValue::fromDouble(10000.0)));
    EXPECT_EQ(accelerometer->copyProperty("ReportInterval").toDouble(), 10000.0);
}

TEST(SimulatedAccelerometer, DeliversAccelerometerEventsAtTheRequestedIntervalOnTheRunLoop) {
    installMonotonicClock();
    auto runLoop = RunLoop::current();
    auto client = EventSystemClient::create(1);
    client->setMatching(accelerometerMatching());
    auto accelerometer = client->copyMatchingServices().at(0);
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
    const uint64_t span = events.back()->timestamp() - events.front()->timestamp();
    EXPECT_GE(span, 19 * 2'000'000u * 8 / 10);  // about 19 intervals, not asserted tightly
}

}  // namespace
}  // namespace ZeltoTouch::Platform

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Platform/EventSystemService.h"
#include "Platform/RunLoop.h"
#include "Service/AccelBookkeeping.h"
#include "Service/AccelSystem.h"
#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// A stage that keeps the metadata it receives.
class MetadataLog final : public PipelineInput {
public:
    void setState(uint64_t, const std::string&, const PropertyValue&) override { ADD_FAILURE() << "state write"; }
    void handleInputReport(uint64_t, const uint8_t*, uint64_t) override { ADD_FAILURE() << "input report"; }
    void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override {
        EXPECT_EQ(key, "Accel");
        timestamps.push_back(timestampMach);
        values.push_back(value);
    }

    std::vector<uint64_t> timestamps;
    std::vector<PropertyValue> values;
};

AccelSample sampleAt(uint64_t timestamp) {
    return {timestamp, static_cast<float>(timestamp) * 0.5f, -0.25f, -1.0f};
}

class AccelBookkeepingTest : public testing::Test {
protected:
    void feed(uint64_t from, uint64_t count) {
        for (uint64_t t = from; t < from + count; ++t) accel.handleSample(sampleAt(t), recording);
    }

    AccelBookkeeping accel;
    MetadataLog recording;
};

TEST_F(AccelBookkeepingTest, UnarmedItBuffersTheLatestHundredAndRecordsNothing) {
    feed(1, 250);
    EXPECT_TRUE(recording.timestamps.empty());
    ASSERT_EQ(accel.samples.size(), 100u);
    EXPECT_EQ(accel.samples.front().timestamp, 151u);
    EXPECT_EQ(accel.samples.back().timestamp, 250u);
}

TEST_F(AccelBookkeepingTest, ArmedItFlushesTheHistoryThenForwardsAHundredSamples) {
    feed(1, 100);
    accel.arm();
    feed(101, 1);
    ASSERT_EQ(recording.timestamps.size(), 101u);
    for (uint64_t i = 0; i < 101; ++i) EXPECT_EQ(recording.timestamps[i], i + 1);
    EXPECT_EQ(accel.samplesNeededCount, 99u);
    EXPECT_TRUE(accel.samples.empty());

    feed(102, 99);
    EXPECT_EQ(recording.timestamps.size(), 200u);
    EXPECT_EQ(accel.samplesNeededCount, 0u);
    feed(201, 1);
    EXPECT_EQ(recording.timestamps.size(), 200u) << "buffering again";
    EXPECT_EQ(accel.samples.size(), 1u);
}

TEST_F(AccelBookkeepingTest, ArmingWhileForwardingStartsTheCountAgain) {
    accel.arm();
    feed(1, 40);
    EXPECT_EQ(accel.samplesNeededCount, 60u);
    accel.arm();
    EXPECT_EQ(accel.samplesNeededCount, 100u);
    feed(41, 100);
    EXPECT_EQ(recording.timestamps.size(), 140u);
    EXPECT_EQ(accel.samplesNeededCount, 0u);
}

TEST(AccelMetadata, CarriesXYZAsSinglePrecisionNumbers) {
    const PropertyValue value = AccelBookkeeping::metadataValue({5, 0.1f, -0.2f, -0.98f});
    ASSERT_TRUE(value.isDictionary());
    EXPECT_EQ(value.count(), 3u);
    for (const char* axis : {"X", "Y", "Z"}) {
        EXPECT_EQ(value.get(axis).numberKind(), PropertyValue::NumberKind::Float32) << axis;
    }
    EXPECT_EQ(value.get("X").toFloat(), 0.1f);
    EXPECT_EQ(value.get("Y").toFloat(), -0.2f);
    EXPECT_EQ(value.get("Z").toFloat(), -0.98f);
}

TEST(ServiceAccelerometerHandler, RecordsNarrowedSamplesAtArrivalTime) {
    ServicePointer service = makeService();
    ZeltoTouchHIDServiceInspector inspector(*service);
    auto event = HIDEvent::createAccelerometerEvent(1, 0.1, -0.2, -0.98, 0);
    const uint64_t before = Util::hostClock().machTimeNow();
    service->handleAccelerometerEvent(*event);

    const AccelBookkeeping accel = inspector.accel();
    ASSERT_EQ(accel.samples.size(), 1u);
    EXPECT_GE(accel.samples.front().timestamp, before) << "the arrival time, not the event's";
    EXPECT_EQ(accel.samples.front().x, 0.1f);
    EXPECT_EQ(accel.samples.front().z, -0.98f);
    EXPECT_TRUE(inspector.recording().frames().empty());
}

TEST(AccelSystemConstruction, MissingArgumentsAreRefused) {
    const auto runLoop = Platform::RunLoop::current();
    const AccelSystem::Handler handler = [](const HIDEvent&) {};
    struct Case {
        std::shared_ptr<Platform::RunLoop> runLoop;
        std::string mode;
        AccelSystem::Handler handler;
    };
    for (const Case& c : {Case{nullptr, "mode", handler}, Case{runLoop, "", handler}, Case{runLoop, "mode", nullptr}}) {
        try {
            AccelSystem accel(c.runLoop, c.mode, 100, c.handler);
            ADD_FAILURE() << "constructed";
        } catch (const std::invalid_argument& error) {
            EXPECT_STREQ(error.what(), "nil argument");
        }
    }
}

TEST(AccelSystemConstruction, AsksTheAccelerometerForTheRateAsAnInterval) {
    EXPECT_EQ(AccelSystem::reportIntervalMicroseconds(100), 10000.0);
    const auto services = Platform::EventServiceRegistry::shared().services();
    ASSERT_FALSE(services.empty());
    AccelSystem accel(Platform::RunLoop::current(), "AccelTest", 50, [](const HIDEvent&) {});
    EXPECT_EQ(services.front()->copyProperty("ReportInterval").toDouble(), 20000.0);
    accel.cleanup();
    accel.cleanup();
}

TEST(AccelSystemConstruction, FailsWhenTheEventSystemHasNoClientOrNoAccelerometer) {
    auto& registry = Platform::EventServiceRegistry::shared();
    registry.setClientCreationRefused(true);
    EXPECT_THROW(AccelSystem(Platform::RunLoop::current(), "AccelTest", 100, [](const HIDEvent&) {}),
                 std::runtime_error);
    registry.setClientCreationRefused(false);

    const ScopedEventServices none({});
    EXPECT_THROW(AccelSystem(Platform::RunLoop::current(), "AccelTest", 100, [](const HIDEvent&) {}),
                 std::runtime_error);
}

// An event-system service that matches the accelerometer's usage and sends a mix of events.
class MixedEventsService final : public Platform::EventSystemService {
public:
    PropertyValue copyProperty(std::string_view key) const override {
        if (key == "PrimaryUsagePage") return PropertyValue::fromUInt32(0xFF00);
        if (key == "PrimaryUsage") return PropertyValue::fromUInt32(3);
        return {};
    }
    bool setProperty(std::string_view, const PropertyValue&) override { return true; }
    std::unique_ptr<Platform::EventStream> openStream(const std::shared_ptr<Platform::RunLoop>& runLoop,
                                                      const std::string& mode,
                                                      Platform::HIDEventHandler handler) override {
        const HIDEventRef events[] = {
            HIDEvent::createDigitizerEvent(1, 2, 0, 0, 0, 0, 0, 1, 0, 0, 0, false, false, 0),
            HIDEvent::createAccelerometerEvent(2, 0.5, 0, -1, 0),
            HIDEvent::createVendorDefinedEvent(3, 0xFF60, 2, 0, nullptr, 0, 0),
            HIDEvent::createAccelerometerEvent(4, 0.25, 0, -1, 0),
        };
        for (const HIDEventRef& event : events) runLoop->perform(mode, [handler, event] { handler(event); });
        runLoop->perform(mode, [runLoop] { runLoop->stop(); });
        return std::make_unique<Platform::EventStream>();
    }
};

TEST(AccelSystemDelivery, OnlyAccelerometerEventsReachTheHandlerOnTheRunLoop) {
    const ScopedEventServices mixed({std::make_shared<MixedEventsService>()});
    std::vector<uint64_t> timestamps;
    {
        AccelSystem accel(Platform::RunLoop::current(), "AccelTest", 100,
                          [&](const HIDEvent& event) { timestamps.push_back(event.timestamp()); });
        Platform::RunLoop::current()->runInMode("AccelTest");
    }
    EXPECT_EQ(timestamps, (std::vector<uint64_t>{2, 4}));
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

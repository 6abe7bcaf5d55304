#include <memory>
#include <stdexcept>
#include <vector>

#include <gtest/gtest.h>

#include "Platform/RunLoop.h"
#include "Service/AccelBookkeeping.h"
#include "Service/AccelSystem.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// Samples stamped from, from+1, ... go in; the timestamps of what was recorded come out.
struct AccelFeed {
    std::vector<uint64_t> feed(uint64_t from, uint64_t count) {
        for (uint64_t t = from; t < from + count; ++t) accel.handleSample({t, 0.1f, -0.2f, -0.98f}, recording);
        std::vector<uint64_t> timestamps;
        for (const PipelineRecording::Frame& frame : recording.frames()) timestamps.push_back(frame.timestamp);
        return timestamps;
    }

    AccelBookkeeping accel;
    PipelineRecording recording;  // the monotonic clock's mach time is in nanoseconds
};

TEST(AccelBookkeeping, BuffersTheLatestHundredUntilArmedThenFlushesThemAndForwardsAHundred) {
    AccelFeed f;
    EXPECT_TRUE(f.feed(1, 250).empty());
    ASSERT_EQ(f.accel.samples.size(), 100u);
    f.accel.arm();
    const std::vector<uint64_t> flushed = f.feed(251, 1);
    ASSERT_EQ(flushed.size(), 101u);
    for (uint64_t i = 0; i < 101; ++i) EXPECT_EQ(flushed[i], 151 + i);
    EXPECT_EQ(f.accel.samplesNeededCount, 99u);
    EXPECT_TRUE(f.accel.samples.empty());

    EXPECT_EQ(f.feed(252, 100).size(), 200u) << "the hundredth sample after arming is the last recorded";
    EXPECT_EQ(f.accel.samplesNeededCount, 0u);
    EXPECT_EQ(f.accel.samples.size(), 1u);

    const PipelineRecording::Frame& frame = f.recording.frames().front();
    EXPECT_EQ(frame.key, "Accel");
    EXPECT_EQ(frame.value.count(), 3u);
    for (const auto& [axis, expected] : {std::pair{"X", 0.1f}, {"Y", -0.2f}, {"Z", -0.98f}}) {
        EXPECT_EQ(frame.value.get(axis).numberKind(), PropertyValue::NumberKind::Float32) << axis;
        EXPECT_EQ(frame.value.get(axis).toFloat(), expected) << axis;
    }
}

TEST(AccelBookkeeping, ArmingWhileForwardingStartsTheCountAgain) {
    AccelFeed f;
    f.accel.arm();
    f.feed(1, 40);
    EXPECT_EQ(f.accel.samplesNeededCount, 60u);
    f.accel.arm();
    EXPECT_EQ(f.feed(41, 101).size(), 140u);
    EXPECT_EQ(f.accel.samplesNeededCount, 0u);
}

TEST(ServiceAccelerometerHandler, RecordsNarrowedSamplesAtArrivalTime) {
    ServicePointer service = makeService();
    const uint64_t before = Util::hostClock().machTimeNow();
    service->handleAccelerometerEvent(*HIDEvent::createAccelerometerEvent(1, 0.1, -0.2, -0.98, 0));

    const AccelBookkeeping accel = ZeltoTouchHIDServiceInspector(*service).accel();
    ASSERT_EQ(accel.samples.size(), 1u);
    EXPECT_GE(accel.samples.front().timestamp, before) << "the arrival time, not the event's";
    EXPECT_EQ(accel.samples.front().x, 0.1f);
    EXPECT_EQ(accel.samples.front().z, -0.98f);
}

TEST(AccelSystemConstruction, MissingArgumentsARateOfZeroNoEventSystemClientOrNoAccelerometerAreRefused) {
    const auto loop = Platform::RunLoop::current();
    const AccelSystem::Handler handler = [](const HIDEvent&) {};
    using Case = std::tuple<std::shared_ptr<Platform::RunLoop>, const char*, uint32_t, AccelSystem::Handler>;
    for (const auto& [runLoop, mode, rate, onEvent] : {Case{nullptr, "mode", 100, handler}, Case{loop, "", 100, handler},
                                                      Case{loop, "mode", 100, nullptr}, Case{loop, "mode", 0, handler}}) {
        try {
            AccelSystem accel(runLoop, mode, rate, onEvent);
            ADD_FAILURE() << "constructed";
        } catch (const std::invalid_argument& error) {
            EXPECT_STREQ(error.what(), "nil argument");
        }
    }
    const auto construct = [&] { AccelSystem(loop, "AccelTest", 100, handler); };
    Platform::EventServiceRegistry::shared().setClientCreationRefused(true);
    EXPECT_THROW(construct(), std::runtime_error);
    Platform::EventServiceRegistry::shared().setClientCreationRefused(false);
    const ScopedNoEventServices none;
    EXPECT_THROW(construct(), std::runtime_error);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

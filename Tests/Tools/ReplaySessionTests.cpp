#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Shared/Util/HostClock.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;

TEST(StateWrite, ValueIsJsonWhenItParsesOtherwiseText) {
    struct Case {
        const char* assignment;
        const char* key;
        PropertyValue value;
    };
    const Case cases[] = {
        {"Algs.EnableTapSuppression=0", "Algs.EnableTapSuppression", PropertyValue::fromInt32(0)},
        {"Algs.ActivationThreshold=180.5", "Algs.ActivationThreshold", PropertyValue::fromDouble(180.5)},
        {"Flag=true", "Flag", PropertyValue::fromBool(true)},
        {"Name=volume up", "Name", PropertyValue::string("volume up")},
        {"Name=\"quoted\"", "Name", PropertyValue::string("quoted")},
        {"Equation=a=b", "Equation", PropertyValue::string("a=b")},
        {"Empty=", "Empty", PropertyValue::string("")},
        {"Table={\"A\": 1}", "Table", PropertyValue::dictionary({{"A", PropertyValue::fromInt32(1)}})},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.assignment);
        const StateWrite write = StateWrite::parse(c.assignment);
        EXPECT_EQ(write.key, c.key);
        EXPECT_EQ(write.value, c.value);
    }
    EXPECT_THROW(StateWrite::parse("no-equals-sign"), std::invalid_argument);
    EXPECT_THROW(StateWrite::parse("=1"), std::invalid_argument);
}

// A clock that counts the sleeps asked of it and never waits.
class CountingClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {1, 1}; }
    uint64_t machTimeNow() const noexcept override { return 1'000; }
    void sleepMicroseconds(uint64_t microseconds) const noexcept override { slept += microseconds; }
    mutable uint64_t slept = 0;
};

class ReplaySessionPacing : public ::testing::Test {
protected:
    void SetUp() override { Util::setHostClock(&clock); }
    void TearDown() override { Util::setHostClock(nullptr); }

    uint64_t sleptDuring(ReplayOptions options) {
        const std::string container = recordScript("tap volume-up 120ms\nidle 300ms\n");
        const PropertyValue data =
            PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(container.data()), container.size()));
        ReplaySession session(PipelineRecording(data), std::move(options));
        clock.slept = 0;
        size_t frames = 0;
        session.run([&](const DeliveredFrame& delivered) { frames = delivered.index + 1; });
        EXPECT_EQ(frames, session.frameCount());
        return clock.slept;
    }

    CountingClock clock;
};

TEST_F(ReplaySessionPacing, WaitsTheRecordedSpacingAtTheGivenSpeedUnlessFast) {
    // 42 frames 10 ms apart: 410 ms of waiting at speed 1.
    EXPECT_EQ(sleptDuring({1.0f, false, {}}), 410'000u);
    EXPECT_EQ(sleptDuring({2.0f, false, {}}), 205'000u);
    EXPECT_EQ(sleptDuring({1.0f, true, {}}), 0u);
    EXPECT_EQ(&Util::hostClock(), &clock);  // the fast clock is gone again
}

TEST(ReplaySession, ReportsEachFrameWithItsEventsAndImage) {
    const std::string container = recordScript("idle 50ms\ntap play-pause 120ms\nidle 100ms\n");
    const PropertyValue data =
        PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(container.data()), container.size()));
    ReplaySession session(PipelineRecording(data), {1.0f, true, {}});
    std::vector<std::string> seen;
    uint64_t lastTimestamp = 0;
    session.run([&](const DeliveredFrame& delivered) {
        EXPECT_TRUE(delivered.image.has_value());
        EXPECT_GE(delivered.frame.timestamp, lastTimestamp);
        lastTimestamp = delivered.frame.timestamp;
        for (const HIDEventRef& event : delivered.events) seen.push_back(std::to_string(event->phase()));
    });
    EXPECT_THAT(seen, ::testing::ElementsAre("128", "0"));  // may-begin, then the tap
}

}  // namespace
}  // namespace ZeltoTouch::Tools

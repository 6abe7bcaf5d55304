#include "Shared/Recording/PipelineRecording.h"

#include <limits>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace ZeltoTouch::RecordingTest {
namespace {

using Lines = std::vector<std::string>;
using Sleeps = std::vector<uint64_t>;

class Playback : public testing::Test {
protected:
    void SetUp() override {
        fakeClock().now = kStart;
        fakeClock().sleeps.clear();
        recording.pipeline = downstream;
    }

    // Reports holding their index as their one byte.
    void appendReports(const std::vector<uint64_t>& timestampsNs) {
        uint8_t id = 0;
        for (uint64_t timestamp : timestampsNs) recording.appendFrame(reportFrame(timestamp, {id++}));
    }
    void playAll(float speed) {
        recording.playReset();
        while (recording.playCanContinue()) recording.playNextFrame(speed);
    }
    void expectFinished() {
        EXPECT_FALSE(recording.playCanContinue());
        EXPECT_EQ(messageOf<std::runtime_error>([this] { recording.playNextFrame(1.0f); }), "playback finished");
    }

    static constexpr uint64_t kStart = 1000000;
    std::shared_ptr<CallLog> downstream = std::make_shared<CallLog>();
    PipelineRecording recording;
};

TEST_F(Playback, SpeedScalesTheWaitsButNotTheDeliveryTimes) {
    const std::pair<float, Sleeps> cases[] = {
        {1.0f, {10000, 20000}}, {2.0f, {5000, 10000}}, {0.0f, {10000, 20000}}, {-1.0f, {10000, 20000}},
        {std::numeric_limits<float>::quiet_NaN(), {0, 0}},
        {3.0f, {3333, 6666}},  // truncated to whole microseconds
        {1e-30f, {UINT64_MAX, UINT64_MAX}},
    };
    appendReports({0, 10000000, 30000000});
    for (const auto& [speed, sleeps] : cases) {
        fakeClock().sleeps.clear();
        downstream->calls.clear();
        playAll(speed);
        EXPECT_EQ(fakeClock().sleeps, sleeps) << speed;
        // 10 ms and 30 ms in ticks of 125/3 ns.
        EXPECT_EQ(downstream->calls,
                  (Lines{"InputReport 1000000 00 ", "InputReport 1240000 01 ", "InputReport 1720000 02 "}));
    }
}

TEST_F(Playback, EqualTimestampsDoNotWaitAndAListOutOfOrderPlaysSortedStably) {
    appendReports({3000, 500, 3000, 500, 1500});
    playAll(1.0f);
    EXPECT_EQ(fakeClock().sleeps, (Sleeps{1, 1}));
    EXPECT_EQ(downstream->calls, (Lines{"InputReport 1000000 01 ", "InputReport 1000000 03 ", "InputReport 1000024 04 ",
                                        "InputReport 1000060 00 ", "InputReport 1000060 02 "}));
}

TEST_F(Playback, DeliversEachKindAsTheCallThatRecordedIt) {
    const PropertyValue value = PropertyValue::fromUInt64(7);
    for (const Frame& frame : {stateFrame(0, "Algs.X", value), reportFrame(0, {1, 2}), metadataFrame(0, "Accel", value),
                               stateFrame(0, "NoValue", {})}) {
        recording.appendFrame(frame);
    }
    playAll(1.0f);
    EXPECT_EQ(downstream->calls, (Lines{"State 1000000 Algs.X=7", "InputReport 1000000 01 02 ",
                                        "Metadata 1000000 Accel=7", "State 1000000 NoValue=(no value)"}));
    EXPECT_EQ(recording.frames().size(), 4u);  // playback records nothing
}

TEST_F(Playback, ResetStartsOverWithANewStartTime) {
    appendReports({0, 3000});
    playAll(1.0f);
    fakeClock().now = 5000000;
    playAll(1.0f);
    EXPECT_EQ(downstream->calls, (Lines{"InputReport 1000000 00 ", "InputReport 1000072 01 ", "InputReport 5000000 00 ",
                                        "InputReport 5000072 01 "}));
}

TEST_F(Playback, RecordingACallTrimmingOrWritingTheContainerEndsPlayback) {
    appendReports({0, 1, 2});
    recording.playReset();
    recording.playNextFrame(1.0f);
    recording.handleInputReport(0, nullptr, 0);
    expectFinished();

    recording.playReset();
    recording.setMaxFrameCount(1);  // the cursor's frame is gone
    expectFinished();

    recording.playReset();
    ASSERT_TRUE(recording.json());
    expectFinished();
}

TEST_F(Playback, FinishedWhenEmptyWithoutResetOrAfterTheEndAndPacesWithoutAPipeline) {
    recording.pipeline.reset();
    recording.playReset();
    expectFinished();
    appendReports({0, 2000000, 5000000});
    expectFinished();
    playAll(1.0f);
    EXPECT_EQ(fakeClock().sleeps, (Sleeps{2000, 3000}));
    expectFinished();
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

#include "Shared/Recording/PipelineRecording.h"

#include <cmath>
#include <limits>
#include <memory>
#include <stdexcept>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace ZeltoTouch::RecordingTest {
namespace {

class Playback : public testing::Test {
protected:
    void SetUp() override {
        fakeClock().now = kStart;
        fakeClock().sleeps.clear();
        recording.pipeline = downstream;
    }

    void appendReports(const std::vector<uint64_t>& timestampsNs) {
        uint8_t id = 0;
        for (uint64_t timestamp : timestampsNs) recording.appendFrame(reportFrame(timestamp, {id++}));
    }
    void playAll(float speed) {
        recording.playReset();
        while (recording.playCanContinue()) recording.playNextFrame(speed);
    }
    std::vector<uint64_t> deliveryTimes() const {
        std::vector<uint64_t> times;
        for (const CallLog::Call& call : downstream->calls) times.push_back(call.timestampMach);
        return times;
    }
    static void expectFinished(PipelineRecording& recording) {
        EXPECT_FALSE(recording.playCanContinue());
        try {
            recording.playNextFrame(1.0f);
            ADD_FAILURE() << "no error";
        } catch (const std::runtime_error& error) {
            EXPECT_STREQ(error.what(), "playback finished");
        }
    }

    static constexpr uint64_t kStart = 1000000;
    std::shared_ptr<CallLog> downstream = std::make_shared<CallLog>();
    PipelineRecording recording;
};

struct PacingCase {
    float speed;
    std::vector<uint64_t> sleeps;
};

class PlaybackPacing : public Playback, public testing::WithParamInterface<PacingCase> {};

TEST_P(PlaybackPacing, SpeedScalesTheWaitsButNotTheDeliveryTimes) {
    appendReports({0, 10000000, 30000000});
    playAll(GetParam().speed);
    EXPECT_EQ(fakeClock().sleeps, GetParam().sleeps);
    // 10 ms and 30 ms in ticks of 125/3 ns.
    EXPECT_EQ(deliveryTimes(), (std::vector<uint64_t>{kStart, kStart + 240000, kStart + 720000}));
}

INSTANTIATE_TEST_SUITE_P(Speeds, PlaybackPacing,
                         testing::Values(PacingCase{1.0f, {10000, 20000}}, PacingCase{2.0f, {5000, 10000}},
                                         PacingCase{0.0f, {10000, 20000}}, PacingCase{-1.0f, {10000, 20000}},
                                         PacingCase{std::numeric_limits<float>::quiet_NaN(), {0, 0}},
                                         PacingCase{3.0f, {3333, 6666}},  // truncated to whole microseconds
                                         PacingCase{1e-30f, {UINT64_MAX, UINT64_MAX}}));

TEST_F(Playback, EqualTimestampsDoNotWait) {
    appendReports({500, 500, 1500});
    playAll(1.0f);
    EXPECT_EQ(fakeClock().sleeps, (std::vector<uint64_t>{1}));
    EXPECT_EQ(deliveryTimes(), (std::vector<uint64_t>{kStart, kStart, kStart + 24}));
}

TEST_F(Playback, DeliversEachKindAsTheCallThatRecordedIt) {
    const PropertyValue value = PropertyValue::fromUInt64(7);
    recording.appendFrame(stateFrame(0, "Algs.X", value));
    recording.appendFrame(reportFrame(0, {1, 2}));
    recording.appendFrame(metadataFrame(0, "Accel", value));
    recording.appendFrame(stateFrame(0, "NoValue", {}));
    playAll(1.0f);
    const std::vector<CallLog::Call> expected = {{Type::State, kStart, "Algs.X", value, {}},
                                                 {Type::InputReport, kStart, {}, {}, {1, 2}},
                                                 {Type::Metadata, kStart, "Accel", value, {}},
                                                 {Type::State, kStart, "NoValue", {}, {}}};
    EXPECT_EQ(downstream->calls, expected);
    EXPECT_EQ(recording.frames().size(), 4u);  // playback records nothing
}

TEST_F(Playback, EmptyRecordingIsFinishedAtOnce) {
    recording.playReset();
    expectFinished(recording);
}

TEST_F(Playback, WithoutResetOrAfterTheEndItIsFinished) {
    appendReports({0, 1, 2});
    expectFinished(recording);
    recording.playReset();
    for (int i = 0; i < 3; ++i) recording.playNextFrame(1.0f);
    expectFinished(recording);
    EXPECT_EQ(downstream->calls.size(), 3u);
}

TEST_F(Playback, ResetStartsOverWithANewStartTime) {
    appendReports({0, 3000});
    playAll(1.0f);
    fakeClock().now = 5000000;
    playAll(1.0f);
    EXPECT_EQ(deliveryTimes(), (std::vector<uint64_t>{kStart, kStart + 72, 5000000, 5000072}));
}

TEST_F(Playback, RecordingACallEndsPlayback) {
    appendReports({0, 1, 2});
    recording.playReset();
    recording.playNextFrame(1.0f);
    recording.handleInputReport(0, nullptr, 0);
    expectFinished(recording);
}

TEST_F(Playback, TrimmingOrWritingTheContainerEndsPlayback) {
    appendReports({0, 1, 2});
    recording.playReset();
    recording.setMaxFrameCount(1);  // the cursor's frame is gone
    expectFinished(recording);

    recording.playReset();
    ASSERT_TRUE(recording.json());
    expectFinished(recording);
}

TEST_F(Playback, WithoutAPipelineStillPacesThroughEveryFrame) {
    recording.pipeline.reset();
    appendReports({0, 2000000, 5000000});
    playAll(1.0f);
    EXPECT_EQ(fakeClock().sleeps, (std::vector<uint64_t>{2000, 3000}));
    expectFinished(recording);
}

// A list out of timestamp order (as a container may hold) is sorted, stably, before playing,
// so no delivery time lies before the start.
TEST_F(Playback, ListOutOfOrderIsPlayedInTimestampOrder) {
    appendReports({3000, 0, 3000, 1500});  // ids 0, 1, 2, 3
    playAll(1.0f);
    std::vector<uint8_t> ids;
    for (const CallLog::Call& call : downstream->calls) ids.push_back(call.bytes[0]);
    EXPECT_EQ(ids, (std::vector<uint8_t>{1, 3, 0, 2}));
    EXPECT_EQ(deliveryTimes(), (std::vector<uint64_t>{kStart, kStart + 36, kStart + 72, kStart + 72}));
    EXPECT_EQ(fakeClock().sleeps, (std::vector<uint64_t>{1, 1}));
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

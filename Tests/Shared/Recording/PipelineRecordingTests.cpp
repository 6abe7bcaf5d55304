#include "Shared/Recording/PipelineRecording.h"

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace ZeltoTouch::RecordingTest {
namespace {

// Frames written as tokens: "R7" is an input report holding the byte 7, "M7" a metadata
// frame holding 7, "a=1" a State frame of key a holding 1. Timestamps count up from 1.
Frame frameFromToken(const std::string& token, uint64_t timestamp) {
    const size_t equals = token.find('=');
    if (equals != std::string::npos)
        return stateFrame(timestamp, token.substr(0, equals), PropertyValue::fromUInt64(std::stoull(token.substr(equals + 1))));
    const auto number = static_cast<uint8_t>(std::stoul(token.substr(1)));
    if (token[0] == 'M') return metadataFrame(timestamp, "Accel", PropertyValue::fromUInt64(number));
    return reportFrame(timestamp, {number});
}

std::vector<std::string> tokens(const PipelineRecording::FrameList& frames) {
    std::vector<std::string> result;
    for (const Frame& frame : frames) {
        switch (frame.type) {
            case Type::State: result.push_back(frame.key + "=" + std::to_string(frame.value.toUInt64())); break;
            case Type::Metadata: result.push_back("M" + std::to_string(frame.value.toUInt64())); break;
            case Type::InputReport: result.push_back("R" + std::to_string(frame.data.data()[0])); break;
        }
    }
    return result;
}

void appendTokens(PipelineRecording& recording, const std::vector<std::string>& list) {
    for (const std::string& token : list) recording.appendFrame(frameFromToken(token, recording.frames().size() + 1));
}

struct TrimCase {
    const char* name;
    uint64_t limit;
    std::vector<std::string> appended;
    std::vector<std::string> expected;
};

class Trimming : public testing::TestWithParam<TrimCase> {};

TEST_P(Trimming, AppendingKeepsTheNewestReportsAndTheStateNeededForThem) {
    PipelineRecording recording;
    recording.setMaxFrameCount(GetParam().limit);
    appendTokens(recording, GetParam().appended);
    EXPECT_EQ(tokens(recording.frames()), GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(
    Sequences, Trimming,
    testing::Values(
        // The sixth frame trims away a=2 only.
        TrimCase{"SixthFrameTrims", 3, {"R1", "a=1", "R2", "a=2", "a=3", "R3"}, {"R1", "a=1", "R2", "a=3", "R3"}},
        // R4 makes six again: R1 goes as the fourth report, a=1 stays as the state before R2.
        TrimCase{"SecondTrim", 3, {"R1", "a=1", "R2", "a=2", "a=3", "R3", "R4"}, {"a=1", "R2", "a=3", "R3", "R4"}},
        TrimCase{"BelowTwiceTheLimitNothingHappens", 3, {"R1", "R2", "R3", "R4", "R5"}, {"R1", "R2", "R3", "R4", "R5"}},
        TrimCase{"MetadataCountsLikeReports", 2, {"M1", "R2", "M3", "R4"}, {"M3", "R4"}},
        TrimCase{"OldStateOfEachKeySurvives", 1, {"a=1", "b=2", "a=3", "R1", "R2"}, {"b=2", "a=3", "R2"}},
        TrimCase{"NoLimitNeverTrims", 0, {"a=1", "a=2", "R1", "R2", "R3", "a=3", "a=4"},
                 {"a=1", "a=2", "R1", "R2", "R3", "a=3", "a=4"}},
        // The distinct keys keep the list at twice the limit, so the repeated k0 is trimmed at once.
        TrimCase{"DistinctKeysKeepRetrimming", 2, {"R1", "R2", "k0=0", "k1=1", "k2=2", "k0=3"},
                 {"R1", "R2", "k1=1", "k2=2", "k0=3"}}),
    [](const testing::TestParamInfo<TrimCase>& info) { return info.param.name; });

TEST(Trimming, SameKeyWithoutAReportBetweenKeepsOnlyTheNewer) {
    PipelineRecording::FrameList frames;
    for (const char* token : {"R1", "a=1", "a=2"}) frames.push_back(frameFromToken(token, 0));
    PipelineRecording::trimFrames(frames, 5);
    EXPECT_EQ(tokens(frames), (std::vector<std::string>{"R1", "a=2"}));
}

TEST(Trimming, NoLimitKeepsAThousandFrames) {
    PipelineRecording recording;
    for (int i = 0; i < 1000; ++i) appendTokens(recording, {"R1", "a=1"});
    EXPECT_EQ(recording.frames().size(), 2000u);
}

TEST(Trimming, SetMaxFrameCountTrimsAtOnceAndZeroRemovesTheLimit) {
    PipelineRecording recording;
    appendTokens(recording, {"R1", "R2", "R3", "R4", "R5"});
    recording.setMaxFrameCount(2);
    EXPECT_EQ(tokens(recording.frames()), (std::vector<std::string>{"R4", "R5"}));
    recording.setMaxFrameCount(0);
    appendTokens(recording, {"R6", "R7", "R8"});
    EXPECT_EQ(recording.frames().size(), 5u);
}

TEST(Sorting, StableByTimestamp) {
    PipelineRecording::FrameList frames;
    const std::pair<uint64_t, uint8_t> input[] = {{5, 1}, {3, 2}, {5, 3}, {1, 4}};
    for (auto [timestamp, id] : input) frames.push_back(reportFrame(timestamp, {id}));
    PipelineRecording::sortFrames(frames);
    std::vector<std::pair<uint64_t, int>> order;
    for (const Frame& frame : frames) order.emplace_back(frame.timestamp, frame.data.data()[0]);
    EXPECT_EQ(order, (std::vector<std::pair<uint64_t, int>>{{1, 4}, {3, 2}, {5, 1}, {5, 3}}));
}

TEST(Recording, RecordsInNanosecondsAndForwardsUnchanged) {
    PipelineRecording recording;
    auto downstream = std::make_shared<CallLog>();
    recording.pipeline = downstream;
    const PropertyValue value = PropertyValue::mutableDictionary();
    const Bytes report{1, 2, 3};
    recording.setState(30, "Algs.Threshold", value);
    recording.handleInputReport(60, report.data(), report.size());
    recording.handleMetadata(90, "Accel", value);
    recording.handleInputReport(120, nullptr, 0);
    recording.setState(150, "Gone", PropertyValue());

    const std::vector<CallLog::Call> expectedCalls = {
        {Type::State, 30, "Algs.Threshold", value, {}}, {Type::InputReport, 60, {}, {}, report},
        {Type::Metadata, 90, "Accel", value, {}},       {Type::InputReport, 120, {}, {}, {}},
        {Type::State, 150, "Gone", {}, {}}};
    EXPECT_EQ(downstream->calls, expectedCalls);

    std::vector<CallLog::Call> recorded;  // the frames, in the same shape
    for (const Frame& frame : recording.frames())
        recorded.push_back({frame.type, frame.timestamp, frame.key, frame.value, Bytes(frame.data.begin(), frame.data.end())});
    const std::vector<CallLog::Call> expectedFrames = {
        {Type::State, 1250, "Algs.Threshold", value, {}}, {Type::InputReport, 2500, {}, {}, report},
        {Type::Metadata, 3750, "Accel", value, {}},       {Type::InputReport, 5000, {}, {}, {}},
        {Type::State, 6250, "Gone", {}, {}}};
    EXPECT_EQ(recorded, expectedFrames);

    PropertyValue(value).set("Changed", PropertyValue::fromUInt64(1));  // values are shared, not copied
    EXPECT_TRUE(recording.frames().front().value.get("Changed"));
}

TEST(Recording, WithoutAPipelineStillRecords) {
    PipelineRecording recording;
    const Bytes report(100, 0xAB);  // longer than the inline storage
    recording.handleInputReport(3, report.data(), report.size());
    recording.setState(6, "k", PropertyValue::null());
    ASSERT_EQ(recording.frames().size(), 2u);
    EXPECT_EQ(Bytes(recording.frames().front().data.begin(), recording.frames().front().data.end()), report);
}

TEST(CopySemantics, FramesAreDuplicatedValuesSharedCursorKeptInPlace) {
    PipelineRecording original;
    auto downstream = std::make_shared<CallLog>();
    original.pipeline = downstream;
    original.setMaxFrameCount(7);
    const PropertyValue shared = PropertyValue::mutableDictionary();
    for (uint64_t t : {3, 6, 9}) original.setState(t, "k" + std::to_string(t), shared);
    original.playReset();
    original.playNextFrame(1.0f);

    PipelineRecording copy(original);
    EXPECT_EQ(copy.maxFrameCount(), 7u);
    EXPECT_EQ(copy.pipeline, original.pipeline);
    ASSERT_TRUE(copy.playCanContinue());
    copy.playNextFrame(1.0f);  // the copy's cursor stands on its own second frame
    EXPECT_EQ(downstream->calls.back().key, "k6");

    original.setState(12, "k12", shared);
    EXPECT_EQ(copy.frames().size(), 3u);
    EXPECT_TRUE(copy.playCanContinue());  // recording into the original ends only its playback
    EXPECT_FALSE(original.playCanContinue());
    PropertyValue(shared).set("X", PropertyValue::fromUInt64(1));
    EXPECT_TRUE(copy.frames().front().value.get("X"));

    PipelineRecording assigned;
    assigned = copy;
    assigned.playNextFrame(1.0f);
    EXPECT_EQ(downstream->calls.back().key, "k9");
    EXPECT_FALSE(assigned.playCanContinue());
    EXPECT_TRUE(copy.playCanContinue());
}

TEST(MoveSemantics, CursorFollowsAndTheMovedFromRecordingStaysUsable) {
    PipelineRecording original;
    original.setState(3, "a", {});
    original.playReset();
    PipelineRecording moved(std::move(original));
    EXPECT_TRUE(moved.playCanContinue());
    moved.playNextFrame(1.0f);
    EXPECT_FALSE(moved.playCanContinue());  // the end moved along too
    PipelineRecording target;
    target = std::move(moved);
    EXPECT_FALSE(target.playCanContinue());

    original.setState(6, "b", {});  // NOLINT(bugprone-use-after-move): a moved-from recording is empty and usable
    EXPECT_EQ(original.frames().size(), 1u);
    EXPECT_FALSE(original.playCanContinue());
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

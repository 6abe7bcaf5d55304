#include "Shared/Recording/PipelineRecording.h"

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace ZeltoTouch::RecordingTest {
namespace {

using Tokens = std::vector<std::string>;

// Frames written as tokens: "R7" is an input report holding the byte 7, "M7" a metadata
// frame holding 7, "a=1" a State frame of key a holding 1.
Frame frameFromToken(const std::string& token, uint64_t timestamp) {
    const size_t equals = token.find('=');
    if (equals != std::string::npos) {
        const uint64_t value = std::stoull(token.substr(equals + 1));
        return stateFrame(timestamp, token.substr(0, equals), PropertyValue::fromUInt64(value));
    }
    const auto number = static_cast<uint8_t>(std::stoul(token.substr(1)));
    if (token[0] == 'M') return metadataFrame(timestamp, "Accel", PropertyValue::fromUInt64(number));
    return reportFrame(timestamp, {number});
}

Tokens tokens(const PipelineRecording::FrameList& frames) {
    Tokens result;
    for (const Frame& frame : frames) {
        switch (frame.type) {
            case Type::State: result.push_back(frame.key + "=" + std::to_string(frame.value.toUInt64())); break;
            case Type::Metadata: result.push_back("M" + std::to_string(frame.value.toUInt64())); break;
            case Type::InputReport: result.push_back("R" + std::to_string(frame.data.data()[0])); break;
        }
    }
    return result;
}

// Timestamps count up from 1.
void appendTokens(PipelineRecording& recording, const Tokens& list) {
    for (const std::string& token : list) recording.appendFrame(frameFromToken(token, recording.frames().size() + 1));
}

TEST(Trimming, AppendingKeepsTheNewestReportsAndTheStateNeededForThem) {
    const struct {
        const char* name;
        uint64_t limit;
        Tokens appended, expected;
    } cases[] = {
        {"the sixth frame trims away a=2 only", 3, {"R1", "a=1", "R2", "a=2", "a=3", "R3"},
         {"R1", "a=1", "R2", "a=3", "R3"}},
        {"R1 goes as the fourth report, a=1 stays as the state before R2", 3,
         {"R1", "a=1", "R2", "a=2", "a=3", "R3", "R4"}, {"a=1", "R2", "a=3", "R3", "R4"}},
        {"below twice the limit nothing happens", 3, {"R1", "R2", "R3", "R4", "R5"}, {"R1", "R2", "R3", "R4", "R5"}},
        {"metadata counts like reports", 2, {"M1", "R2", "M3", "R4"}, {"M3", "R4"}},
        {"old state of each key survives", 1, {"a=1", "b=2", "a=3", "R1", "R2"}, {"b=2", "a=3", "R2"}},
        {"no limit never trims", 0, {"a=1", "a=2", "R1", "R2", "R3", "a=3", "a=4"},
         {"a=1", "a=2", "R1", "R2", "R3", "a=3", "a=4"}},
        // The distinct keys keep the list at twice the limit, so the repeated k0 is trimmed at once.
        {"distinct keys keep retrimming", 2, {"R1", "R2", "k0=0", "k1=1", "k2=2", "k0=3"},
         {"R1", "R2", "k1=1", "k2=2", "k0=3"}},
    };
    for (const auto& c : cases) {
        PipelineRecording recording;
        recording.setMaxFrameCount(c.limit);
        appendTokens(recording, c.appended);
        EXPECT_EQ(tokens(recording.frames()), c.expected) << c.name;
    }
    PipelineRecording::FrameList frames;
    for (const char* token : {"R1", "a=1", "a=2"}) frames.push_back(frameFromToken(token, 0));
    PipelineRecording::trimFrames(frames, 5);
    EXPECT_EQ(tokens(frames), (Tokens{"R1", "a=2"})) << "the same key without a report between keeps only the newer";
}

TEST(Trimming, SetMaxFrameCountTrimsAtOnceAndZeroRemovesTheLimit) {
    PipelineRecording recording;
    appendTokens(recording, {"R1", "a=1", "R1", "a=1", "R2", "R3"});  // no limit by default
    recording.setMaxFrameCount(2);
    EXPECT_EQ(tokens(recording.frames()), (Tokens{"a=1", "R2", "R3"}));
    recording.setMaxFrameCount(0);
    appendTokens(recording, {"R6", "R7", "R8"});
    EXPECT_EQ(recording.frames().size(), 6u);
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
    EXPECT_EQ(downstream->calls, (Tokens{"State 30 Algs.Threshold={}", "InputReport 60 01 02 03 ",
                                         "Metadata 90 Accel={}", "InputReport 120 ", "State 150 Gone=(no value)"}));
    EXPECT_EQ(describe(recording.frames()),
              (Tokens{"State 1250 Algs.Threshold={}", "InputReport 2500 01 02 03 ", "Metadata 3750 Accel={}",
                      "InputReport 5000 ", "State 6250 Gone=(no value)"}));

    recording.pipeline.reset();  // without a pipeline it still records
    const Bytes longReport(100, 0xAB);  // longer than the inline storage
    recording.handleInputReport(3, longReport.data(), longReport.size());
    EXPECT_EQ(Bytes(recording.frames().back().data.begin(), recording.frames().back().data.end()), longReport);
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

#include "Shared/Recording/PipelineRecording.h"

#include <cmath>
#include <stdexcept>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace ZeltoTouch::RecordingTest {
namespace {

PropertyValue text(std::string_view json) {
    return PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(json.data()), json.size()));
}

std::string jsonText(PipelineRecording& recording) {
    const PropertyValue data = recording.json();
    return std::string(data.bytes().begin(), data.bytes().end());
}

TEST(ContainerWriting, FrameObjectsWithTheirFieldNames) {
    PipelineRecording recording;
    EXPECT_EQ(jsonText(recording), R"({"Version":2,"Frames":[]})");
    recording.appendFrame(reportFrame(7, {0x01, 0xab}));
    recording.appendFrame(stateFrame(8, "Algs.X", PropertyValue::fromUInt64(3)));
    recording.appendFrame(metadataFrame(9, "Accel", {}));
    EXPECT_EQ(jsonText(recording), R"({"Version":2,"Frames":[)"
                                   R"({"Type":"InputReport","Timestamp":7,"Data":"01 ab "},)"
                                   R"({"Type":"State","Timestamp":8,"Key":"Algs.X","Value":3},)"
                                   R"({"Type":"Metadata","Timestamp":9,"Key":"Accel"}]})");
}

TEST(ContainerWriting, TrimsWithTheLimitAndSortsTheRecordingItself) {
    PipelineRecording recording;
    for (uint64_t t : {30, 10, 20, 40}) recording.appendFrame(reportFrame(t, {static_cast<uint8_t>(t)}));
    recording.setMaxFrameCount(3);
    ASSERT_TRUE(recording.json());
    // Sorted after trimming 30, the oldest.
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"InputReport 10 0a ", "InputReport 20 14 ",
                                                                      "InputReport 40 28 "}));
}

TEST(ContainerWriting, FrameJSONCannotHoldFailsClearlyOrIsLeftOut) {
    const PropertyValue data = PropertyValue::data(std::vector<uint8_t>{1});
    const std::pair<Frame, const char*> cases[] = {
        {metadataFrame(2, "Bad", data),
         "cannot write frame 1 (Metadata \"Bad\"): its value cannot be represented in JSON"},
        {stateFrame(2, "Bad", PropertyValue::fromDouble(std::nan(""))),
         "cannot write frame 1 (State \"Bad\"): its value cannot be represented in JSON"},
        {stateFrame(2, "\xff", {}), "cannot write frame 1 (State \"\xff\"): its key is not valid UTF-8"},
    };
    for (const auto& [frame, error] : cases) {
        PipelineRecording recording;
        recording.appendFrame(reportFrame(1, {1}));
        recording.appendFrame(frame);
        recording.appendFrame(stateFrame(3, "After", PropertyValue::fromInt32(7)));
        EXPECT_FALSE(recording.json().hasValue());
        EXPECT_EQ(messageOf<std::runtime_error>([&] { recording.jsonOrThrow(); }), error);
        size_t leftOut = 0;
        const PipelineRecording rest(recording.jsonLeavingOutUnwritable(leftOut));
        EXPECT_EQ(leftOut, 1u);
        EXPECT_EQ(describe(rest.frames()), (std::vector<std::string>{"InputReport 1 01 ", "State 3 After=7"}));
    }
}

TEST(ContainerRoundTrip, ReaderGivesBackEveryFrameField) {
    PipelineRecording recording;
    for (const Frame& frame : {
             stateFrame(1, "Algs.Threshold", PropertyValue::fromDouble(0.25)), stateFrame(2, "Absent", {}),
             stateFrame(3, "Null", PropertyValue::null()), reportFrame(5, Bytes(200, 0x01)), reportFrame(6, {}),
             metadataFrame(7, "Text \"quoted\" \xc3\xa9", PropertyValue::string("a\nb")),
             metadataFrame(UINT64_MAX, "Accel", PropertyValue::dictionary({{"X", PropertyValue::fromFloat(-1.5f)},
                                                                           {"Z", PropertyValue::fromFloat(9.75f)}})),
         }) {
        recording.appendFrame(frame);
    }
    const PipelineRecording read(recording.json());
    EXPECT_EQ(describe(read.frames()), describe(recording.frames()));
    EXPECT_FALSE(read.pipeline);
    EXPECT_EQ(read.maxFrameCount(), 0u);
}

TEST(ContainerReading, KeepsTheFileOrderAndReadsEveryVersion) {
    const std::pair<const char*, std::vector<std::string>> cases[] = {
        {R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":9,"Data":"01 02 "},)"
         R"({"Type":"State","Timestamp":3,"Key":"k","Value":null},)"
         R"({"Type":"InputReport","Timestamp":5,"Data":"0x1f"}]})",
         {"InputReport 9 01 02 ", "State 3 k=null", "InputReport 5 1f "}},
        {R"({"Version":0,"Reports":[{"Timestamp":5,"ReportData":"01 02 "}]})", {"InputReport 5 01 02 "}},
        {R"({"Version":0})", {}},
        {R"({"Version":1,"Extra":1,"Frames":[{"Type":"InputReport","Timestamp":5,"Report":"ff "},)"
         R"({"Type":"Metadata","Timestamp":6,"Key":"Accel","Value":1}]})",
         {"InputReport 5 ff ", "Metadata 6 Accel=1"}},
        {R"({"Version":1})", {}},
        {R"({"Version":2,"Extra":true,"Frames":[]})", {}},
    };
    for (const auto& [container, frames] : cases) {
        EXPECT_EQ(describe(PipelineRecording(text(container)).frames()), frames) << container;
    }
}

// The writer's own shape is read straight from the JSON events; every other valid form goes the
// general way and must read the same.
TEST(ContainerReading, EveryFormOfAVersion2ContainerReadsTheSame) {
    const std::string frames = R"("Frames":[{"Type":"Metadata","Timestamp":7,"Key":"m","Value":{"A":[1,{"B":null}]}},)"
                               R"({"Type":"InputReport","Timestamp":8,"Data":"01 02 "}])";
    const std::vector<std::string> expected = {"Metadata 7 m=" + PropertyValue::fromJSON(R"({"A":[1,{"B":null}]})").description(),
                                               "InputReport 8 01 02 "};
    for (const std::string& container : {
             R"({"Version":2,)" + frames + "}",  // as written
             "{" + frames + R"(,"Version":2})",  // members in another order
             R"({"Version":2.0,)" + frames + "}",
             R"({"Version":2,"Note":1,)" + frames + "}",
         }) {
        EXPECT_EQ(describe(PipelineRecording(text(container)).frames()), expected) << container;
    }
    const std::pair<const char*, const char*> frameForms[] = {
        {R"({"Type":"State","Timestamp":1,"Key":"a","Key":"b","Value":1})", "State 1 b=1"},  // the last one wins
        {R"({"Type":"State","Timestamp":1,"Key":"k","Value":1,"Data":"not hex"})", "State 1 k=1"},
        {R"({"Type":"InputReport","Timestamp":1,"Key":"k","Data":"ff "})", "InputReport 1 ff "},
    };
    for (const auto& [frame, read] : frameForms) {
        const std::string container = std::string(R"({"Version":2,"Frames":[)") + frame + "]}";
        EXPECT_EQ(describe(PipelineRecording(text(container)).frames()), std::vector<std::string>{read}) << frame;
    }
}

TEST(ContainerErrors, RefusedWithTheExactMessage) {
    constexpr bool kArg = true, kRun = false;  // std::invalid_argument or std::runtime_error
    const std::string m = "migrateSerializedContainer failed: ";
    const std::tuple<const char*, bool, std::string> cases[] = {  // container (nullptr: no data), error
        {nullptr, kArg, "json not supplied"},
        {"[]", kRun, m + "invalid container"},
        {"{}", kRun, m + "invalid version"},
        {R"({"Version":"2"})", kRun, m + "invalid version"},
        {R"({"Version":0,"Reports":[{"ReportData":"01"}]})", kRun, m + "frame lacks Timestamp"},
        {R"({"Version":0,"Reports":[{"Timestamp":1}]})", kRun, m + "frame lacks ReportData"},
        {R"({"Version":1,"Frames":[{"Type":1}]})", kRun, m + "frame Type isn't a string"},
        {R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1}]})", kRun, m + "frame lacks Report"},
        {R"({"Version":0,"Reports":{}})", kRun, m + "Reports isn't an array"},
        {R"({"Version":1,"Frames":"x"})", kRun, m + "Frames isn't an array"},
        {R"({"Version":0,"Reports":[5]})", kRun, m + "frame isn't an object"},
        {R"({"Version":2,"Frames":[[]]})", kArg, "invalid frame"},
        {R"({"Version":2,"Frames":[{"Type":"Bogus"}]})", kArg, "invalid frame timestamp"},  // checked before the type
        {R"({"Version":2,"Frames":[{"Type":"Bogus","Timestamp":1}]})", kArg, "invalid frame type"},
        {R"({"Version":2,"Frames":[{"Type":"State","Timestamp":"1"}]})", kArg, "invalid frame timestamp"},
        {R"({"Version":2,"Frames":[{"Type":"State","Timestamp":1,"Key":1}]})", kArg, "invalid state key"},
        {R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":1,"Data":1}]})", kArg, "invalid report"},
    };
    for (const auto& [container, invalidArgument, message] : cases) {
        const auto read = [&] { PipelineRecording(container ? text(container) : PropertyValue()); };
        const std::string thrown =
            invalidArgument ? messageOf<std::invalid_argument>(read) : messageOf<std::runtime_error>(read);
        EXPECT_EQ(thrown, message) << (container ? container : "(no data)");
    }
    // Called directly, migration raises the unwrapped message.
    const auto migrate = [](const PropertyValue& v) { PipelineRecording::migrateSerializedContainer(v); };
    EXPECT_EQ(messageOf<std::invalid_argument>([&] { migrate(PropertyValue::fromJSON(R"({"Version":3})")); }),
              "invalid container version: 3");
    EXPECT_THROW(migrate(PropertyValue()), std::invalid_argument);
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

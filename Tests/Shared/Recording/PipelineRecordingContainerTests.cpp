#include "Shared/Recording/PipelineRecording.h"

#include <cmath>
#include <stdexcept>
#include <string>
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
    const auto bytes = data.bytes();
    return std::string(bytes.begin(), bytes.end());
}

void expectSameFrames(const PipelineRecording::FrameList& actual, const PipelineRecording::FrameList& expected) {
    ASSERT_EQ(actual.size(), expected.size());
    auto a = actual.begin();
    for (const Frame& e : expected) {
        EXPECT_EQ(a->type, e.type);
        EXPECT_EQ(a->timestamp, e.timestamp);
        EXPECT_EQ(a->key, e.key);
        EXPECT_EQ(a->value, e.value);
        EXPECT_EQ(a->value.hasValue(), e.value.hasValue());
        EXPECT_EQ(a->data, e.data);
        ++a;
    }
}

TEST(ContainerWriting, EmptyRecording) {
    PipelineRecording recording;
    EXPECT_EQ(jsonText(recording), R"({"Version":2,"Frames":[]})");
    EXPECT_TRUE(PipelineRecording(recording.json()).frames().empty());
}

TEST(ContainerWriting, FrameObjects) {
    PipelineRecording recording;
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
    std::vector<uint64_t> order;
    for (const Frame& frame : recording.frames()) order.push_back(frame.timestamp);
    EXPECT_EQ(order, (std::vector<uint64_t>{10, 20, 40}));  // sorted after trimming 30 (the oldest)

    PipelineRecording limited;
    limited.setMaxFrameCount(2);
    for (uint64_t t : {1, 2, 3}) limited.appendFrame(reportFrame(t, {}));
    EXPECT_EQ(PipelineRecording(limited.json()).frames().size(), 2u);
}

TEST(ContainerWriting, FrameJSONCannotHoldFailsClearlyOrIsLeftOut) {
    const std::vector<uint8_t> bytes{1};
    struct Case {
        Frame frame;
        const char* error;
    };
    const Case cases[] = {
        {metadataFrame(2, "Bad", PropertyValue::data(std::span<const uint8_t>(bytes))),
         "cannot write frame 1 (Metadata \"Bad\"): its value cannot be represented in JSON"},
        {stateFrame(2, "Bad", PropertyValue::fromDouble(std::nan(""))),
         "cannot write frame 1 (State \"Bad\"): its value cannot be represented in JSON"},
        {metadataFrame(2, "Bad", PropertyValue::dictionary({{"Inner", PropertyValue::data(std::span<const uint8_t>(bytes))}})),
         "cannot write frame 1 (Metadata \"Bad\"): its value cannot be represented in JSON"},
        {stateFrame(2, "\xff", {}), "cannot write frame 1 (State \"\xff\"): its key is not valid UTF-8"},
    };
    for (const Case& test : cases) {
        PipelineRecording recording;
        recording.appendFrame(reportFrame(1, {1}));
        recording.appendFrame(test.frame);
        recording.appendFrame(stateFrame(3, "After", PropertyValue::fromInt32(7)));
        EXPECT_FALSE(recording.json().hasValue());
        try {
            recording.jsonOrThrow();
            ADD_FAILURE() << "no error";
        } catch (const std::runtime_error& error) {
            EXPECT_STREQ(error.what(), test.error);
        }

        size_t leftOut = 0;
        const PipelineRecording rest(recording.jsonLeavingOutUnwritable(leftOut));
        EXPECT_EQ(leftOut, 1u);
        ASSERT_EQ(rest.frames().size(), 2u);
        EXPECT_EQ(rest.frames().front().data, ReportBytes(Bytes{1}));
        EXPECT_EQ(rest.frames().back().key, "After");
        EXPECT_EQ(rest.frames().back().value, PropertyValue::fromInt32(7));
    }
}

TEST(ContainerRoundTrip, ReaderGivesBackEveryFrameField) {
    PipelineRecording recording;
    recording.appendFrame(stateFrame(1, "Algs.Threshold", PropertyValue::fromDouble(0.25)));
    recording.appendFrame(stateFrame(2, "Absent", {}));
    recording.appendFrame(stateFrame(3, "Null", PropertyValue::null()));
    recording.appendFrame(reportFrame(4, Bytes(73, 0x5a)));
    recording.appendFrame(reportFrame(5, Bytes(200, 0x01)));
    recording.appendFrame(reportFrame(6, {}));
    recording.appendFrame(metadataFrame(UINT64_MAX, "Accel",
                                        PropertyValue::dictionary({{"X", PropertyValue::fromFloat(-1.5f)},
                                                                   {"Y", PropertyValue::fromFloat(0.0f)},
                                                                   {"Z", PropertyValue::fromFloat(9.75f)}})));
    recording.appendFrame(metadataFrame(7, "Text \"quoted\" \xc3\xa9", PropertyValue::string("a\nb")));
    const PipelineRecording read(recording.json());
    expectSameFrames(read.frames(), recording.frames());
    EXPECT_FALSE(read.pipeline);
    EXPECT_EQ(read.maxFrameCount(), 0u);
    EXPECT_TRUE(read.frames().begin()->value.hasValue());
    EXPECT_FALSE(std::next(read.frames().begin())->value.hasValue());
    EXPECT_TRUE(std::next(read.frames().begin(), 2)->value.isNull());
}

TEST(ContainerReading, KeepsTheFileOrderAndAcceptsTheTrailingSpace) {
    const PipelineRecording read(text(R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":9,"Data":"01 02 "},)"
                                      R"({"Type":"State","Timestamp":3,"Key":"k","Value":null},)"
                                      R"({"Type":"InputReport","Timestamp":5,"Data":"0x1f"}]})"));
    std::vector<uint64_t> order;
    for (const Frame& frame : read.frames()) order.push_back(frame.timestamp);
    EXPECT_EQ(order, (std::vector<uint64_t>{9, 3, 5}));
    EXPECT_EQ(read.frames().front().data, ReportBytes(Bytes{1, 2}));
    EXPECT_EQ(read.frames().back().data, ReportBytes(Bytes{0x1f}));
}

struct MigrationCase {
    const char* name;
    const char* container;
    std::vector<Frame> expected;
};

class ContainerMigration : public testing::TestWithParam<MigrationCase> {};

TEST_P(ContainerMigration, OlderVersionsReadAsVersion2) {
    PipelineRecording::FrameList expected;
    for (const Frame& frame : GetParam().expected) expected.push_back(frame);
    expectSameFrames(PipelineRecording(text(GetParam().container)).frames(), expected);
}

INSTANTIATE_TEST_SUITE_P(
    Versions, ContainerMigration,
    testing::Values(
        MigrationCase{"Version0", R"({"Version":0,"Reports":[{"Timestamp":5,"ReportData":"01 02 "}]})",
                      {reportFrame(5, {1, 2})}},
        MigrationCase{"Version0WithoutReports", R"({"Version":0})", {}},
        MigrationCase{"Version1", R"({"Version":1,"Extra":1,"Frames":[{"Type":"InputReport","Timestamp":5,"Report":"ff "},)"
                                  R"({"Type":"Metadata","Timestamp":6,"Key":"Accel","Value":1}]})",
                      {reportFrame(5, {0xff}), metadataFrame(6, "Accel", PropertyValue::fromUInt64(1))}},
        MigrationCase{"Version1WithoutFrames", R"({"Version":1})", {}},
        MigrationCase{"Version2KeepsExtraKeys", R"({"Version":2,"Extra":true,"Frames":[]})", {}}),
    [](const testing::TestParamInfo<MigrationCase>& info) { return info.param.name; });

TEST(ContainerMigration, Version2IsReturnedUnchanged) {
    const PropertyValue container = PropertyValue::fromJSON(R"({"Version":2,"Extra":1})");
    EXPECT_EQ(PipelineRecording::migrateSerializedContainer(container), container);
}

TEST(ContainerMigration, Version1BecomesVersion2WithDataInsteadOfReport) {
    const PropertyValue migrated = PipelineRecording::migrateSerializedContainer(PropertyValue::fromJSON(
        R"({"Version":1,"Extra":1,"Frames":[{"Type":"InputReport","Timestamp":5,"Report":"ff "},{"Type":"Other"}]})"));
    EXPECT_EQ(migrated, PropertyValue::fromJSON(
                            R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":5,"Data":"ff "},{"Type":"Other"}]})"));
}

enum class Raised { InvalidArgument, Runtime };

struct ErrorCase {
    const char* name;
    const char* container;  // nullptr: no data at all
    Raised kind;
    const char* message;
};

class ContainerErrors : public testing::TestWithParam<ErrorCase> {};

TEST_P(ContainerErrors, RefusedWithTheExactMessage) {
    const ErrorCase& c = GetParam();
    const PropertyValue data = c.container ? text(c.container) : PropertyValue();
    try {
        PipelineRecording recording(data);
        ADD_FAILURE() << "no error";
    } catch (const std::invalid_argument& error) {
        EXPECT_EQ(c.kind, Raised::InvalidArgument);
        EXPECT_STREQ(error.what(), c.message);
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(c.kind, Raised::Runtime);
        EXPECT_STREQ(error.what(), c.message);
    }
}

constexpr Raised kArg = Raised::InvalidArgument;
constexpr Raised kRun = Raised::Runtime;

INSTANTIATE_TEST_SUITE_P(
    Messages, ContainerErrors,
    testing::Values(
        ErrorCase{"NoData", nullptr, kArg, "json not supplied"},
        ErrorCase{"NotJSON", "{nope", kRun, "migrateSerializedContainer failed: invalid container"},
        ErrorCase{"TopLevelArray", "[]", kRun, "migrateSerializedContainer failed: invalid container"},
        ErrorCase{"NoVersion", "{}", kRun, "migrateSerializedContainer failed: invalid version"},
        ErrorCase{"VersionNotANumber", R"({"Version":"2"})", kRun, "migrateSerializedContainer failed: invalid version"},
        ErrorCase{"Version3", R"({"Version":3})", kRun, "migrateSerializedContainer failed: invalid container version: 3"},
        ErrorCase{"V0NoTimestamp", R"({"Version":0,"Reports":[{"ReportData":"01"}]})", kRun,
                  "migrateSerializedContainer failed: frame lacks Timestamp"},
        ErrorCase{"V0NoReportData", R"({"Version":0,"Reports":[{"Timestamp":1}]})", kRun,
                  "migrateSerializedContainer failed: frame lacks ReportData"},
        ErrorCase{"V1NoType", R"({"Version":1,"Frames":[{}]})", kRun, "migrateSerializedContainer failed: frame lacks Type"},
        ErrorCase{"V1TypeNotString", R"({"Version":1,"Frames":[{"Type":1}]})", kRun,
                  "migrateSerializedContainer failed: frame Type isn't a string"},
        ErrorCase{"V1NoReport", R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1}]})", kRun,
                  "migrateSerializedContainer failed: frame lacks Report"},
        ErrorCase{"V0ReportsNotArray", R"({"Version":0,"Reports":{}})", kRun,
                  "migrateSerializedContainer failed: Reports isn't an array"},
        ErrorCase{"V1FramesNotArray", R"({"Version":1,"Frames":"x"})", kRun,
                  "migrateSerializedContainer failed: Frames isn't an array"},
        ErrorCase{"V0ElementNotObject", R"({"Version":0,"Reports":[5]})", kRun,
                  "migrateSerializedContainer failed: frame isn't an object"},
        ErrorCase{"V1ElementNotObject", R"({"Version":1,"Frames":[null]})", kRun,
                  "migrateSerializedContainer failed: frame isn't an object"},
        ErrorCase{"NoFrames", R"({"Version":2})", kArg, "invalid frames"},
        ErrorCase{"FramesNotArray", R"({"Version":2,"Frames":{}})", kArg, "invalid frames"},
        ErrorCase{"ElementNotObject", R"({"Version":2,"Frames":[[]]})", kArg, "invalid frame"},
        ErrorCase{"NoType", R"({"Version":2,"Frames":[{"Timestamp":1}]})", kArg, "invalid frame type"},
        ErrorCase{"TypeNotString", R"({"Version":2,"Frames":[{"Type":2,"Timestamp":1}]})", kArg, "invalid frame type"},
        ErrorCase{"UnknownTypeChecksTimestampFirst", R"({"Version":2,"Frames":[{"Type":"Bogus"}]})", kArg,
                  "invalid frame timestamp"},
        ErrorCase{"UnknownType", R"({"Version":2,"Frames":[{"Type":"Bogus","Timestamp":1}]})", kArg, "invalid frame type"},
        ErrorCase{"TimestampNotNumber", R"({"Version":2,"Frames":[{"Type":"State","Timestamp":"1"}]})", kArg,
                  "invalid frame timestamp"},
        ErrorCase{"StateKeyMissing", R"({"Version":2,"Frames":[{"Type":"State","Timestamp":1}]})", kArg, "invalid state key"},
        ErrorCase{"StateKeyNotString", R"({"Version":2,"Frames":[{"Type":"State","Timestamp":1,"Key":1}]})", kArg,
                  "invalid state key"},
        ErrorCase{"V2ReportUnderOldName", R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":"01"}]})",
                  kArg, "invalid report"},
        ErrorCase{"ReportNotString", R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":1,"Data":1}]})", kArg,
                  "invalid report"},
        ErrorCase{"HexOutOfRange", R"({"Version":2,"Frames":[{"Type":"InputReport","Timestamp":1,"Data":"100"}]})", kArg,
                  "invalid hex string"},
        ErrorCase{"MetadataKeyMissing", R"({"Version":2,"Frames":[{"Type":"Metadata","Timestamp":1}]})", kArg,
                  "invalid metadata key"}),
    [](const testing::TestParamInfo<ErrorCase>& info) { return info.param.name; });

TEST(ContainerMigration, CalledDirectlyRaisesTheUnwrappedMessage) {
    try {
        PipelineRecording::migrateSerializedContainer(PropertyValue::fromJSON(R"({"Version":3})"));
        ADD_FAILURE() << "no error";
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "invalid container version: 3");
    }
    EXPECT_THROW(PipelineRecording::migrateSerializedContainer(PropertyValue()), std::invalid_argument);
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

// Hostile recording containers: huge timestamps and numbers, nesting to the limit, huge arrays.
// Each is read into a recording or refused with its documented error;
// whatever is read writes back into a container that reads as the same frames.

#include <cmath>
#include <cstdint>
#include <stdexcept>
#include <string>
#include <span>

#include <gtest/gtest.h>

#include "Shared/Recording/PipelineRecording.h"

namespace ZeltoTouch::Reliability {
namespace {

std::string repeat(std::string_view text, size_t count) {
    std::string result;
    for (size_t i = 0; i < count; ++i) result += text;
    return result;
}

std::string stateFrame(std::string_view timestamp, std::string_view value) {
    return std::string(R"({"Type":"State","Timestamp":)") + std::string(timestamp) + R"(,"Key":"K","Value":)" +
           std::string(value) + "}";
}

std::string container(std::string_view frames) {
    return std::string(R"({"Version":2,"Frames":[)") + std::string(frames) + "]}";
}

// Reads the text (into read, if given); a recording must survive its own writer. Returns the
// error text, or "" when read.
std::string outcome(std::string_view text, PipelineRecording* read = nullptr) {
    try {
        const std::span bytes(reinterpret_cast<const uint8_t*>(text.data()), text.size());
        PipelineRecording recording(PropertyValue::data(bytes));
        const PropertyValue written = recording.json();
        EXPECT_TRUE(written.hasValue()) << "a recording read from JSON must write back";
        EXPECT_TRUE(!written || PipelineRecording(written).json() == written) << "and read back the same";
        if (read) *read = std::move(recording);
        return "";
    } catch (const std::invalid_argument& error) {
        return std::string("invalid-argument: ") + error.what();
    } catch (const std::runtime_error& error) {
        return std::string("runtime: ") + error.what();
    }
}

constexpr const char* kRefused = "runtime: migrateSerializedContainer failed: invalid container";

TEST(HostileContainers, Timestamps) {
    // Numbers the JSON reader takes or refuses are covered with its own tests.
    const std::pair<const char*, const char*> cases[] = {
        {"18446744073709551615", ""}, {"-1", ""}, {"1.5", ""}, {"1e308", ""}, {"18446744073709551616", ""},
        {"null", "invalid-argument: invalid frame timestamp"},
    };
    for (const auto& [timestamp, expected] : cases) {
        EXPECT_EQ(outcome(container(stateFrame(timestamp, "1"))), expected) << timestamp;
    }
    PipelineRecording largest;
    ASSERT_EQ(outcome(container(stateFrame("18446744073709551615", "1")), &largest), "");
    EXPECT_EQ(largest.frames().front().timestamp, UINT64_MAX);
}

// Numbers are read as the double nearest to their text, and one beyond the double range is
// refused like any other number too big: never a NaN, an infinity or another number.
TEST(HostileContainers, NumbersReadExactlyOrRefused) {
    const std::pair<const char*, double> cases[] = {  // NaN: refused
        {"0e300", 0.0}, {"0.000e308", 0.0}, {"1.7976931348623157e308", 1.7976931348623157e308}, {"4.9e-324", 4.9e-324},
        {"1.8e308", NAN}, {"2e308", NAN}, {"184467441e300", NAN},
    };
    for (const auto& [text, value] : cases) {
        PipelineRecording read;
        const std::string result = outcome(container(stateFrame("1", text)), &read);
        EXPECT_EQ(result, std::isnan(value) ? kRefused : "") << text;
        if (result.empty()) {
            EXPECT_EQ(read.frames().front().value.toDouble(), value) << text;
        }
    }
}

TEST(HostileContainers, NestingUpToTheLimitCountsTheContainersOwnLevels) {
    const size_t allowed = PropertyValue::kMaxJSONDepth - 3;  // object, array, frame object
    EXPECT_EQ(outcome(container(stateFrame("1", repeat("[", allowed) + repeat("]", allowed)))), "");
    EXPECT_EQ(outcome(container(stateFrame("1", repeat("[", allowed + 1) + repeat("]", allowed + 1)))), kRefused);
}

TEST(HostileContainers, HugeArrays) {
    EXPECT_EQ(outcome(container(stateFrame("1", "[" + repeat("1,", 299'999) + "1]"))), "");
    std::string many = stateFrame("1", "null");
    for (int i = 0; i < 30'000; ++i) many += "," + stateFrame(std::to_string(i), std::to_string(i));
    PipelineRecording read;
    EXPECT_EQ(outcome(container(many), &read), "");
    EXPECT_EQ(read.frames().size(), 30'001u);
    EXPECT_EQ(outcome(container(R"({"Type":"InputReport","Timestamp":1,"Data":")" + repeat("ab ", 100'000) + "\"}")), "");
}

// The other malformed containers are covered with the recording's own tests.
TEST(HostileContainers, EmptyTextInvalidUTF8AndANegativeVersionAreRefused) {
    EXPECT_EQ(outcome(""), kRefused);
    EXPECT_EQ(outcome(container(stateFrame("1", "\"\xC3\""))), kRefused);  // a truncated sequence in a value
    EXPECT_EQ(outcome(container(R"({"Type":"State","Timestamp":1,"Key":")" + std::string("\xFF") + "\"}")), kRefused);
    EXPECT_EQ(outcome(R"({"Version":-1})"),
              "runtime: migrateSerializedContainer failed: invalid container version: 18446744073709551615");
}

}  // namespace
}  // namespace ZeltoTouch::Reliability

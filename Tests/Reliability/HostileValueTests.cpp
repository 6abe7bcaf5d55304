// Whatever a property caller or the sensor sends, the pipeline does something defined: parameters
// store the documented conversion of any value, extreme parameters and wrapping clocks leave the
// gesture stream well-formed and reproducible, and reports of any length and ID are classified
// and recorded byte for byte.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Recording/PipelineRecording.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::Reliability {
namespace {

using namespace ServiceTest;
using Write = std::pair<std::string, PropertyValue>;

// Every kind of gesture, a firmware reset in the middle of a hold included.
constexpr const char* kSession =
    "idle 50ms\ntap volume-up 120ms\nidle 400ms\nhold play-pause 900ms\nidle 400ms\n"
    "slide volume-down volume-up 300ms\nidle 400ms\nbrush play-pause 250ms\nidle 300ms\npalm 300ms\n"
    "idle 400ms\nhold volume-down 700ms reset-after 300ms\nidle 300ms\ntap play-pause 100ms\nidle 400ms\n";

// Whether the events are a stream the gesture machine can say: each one the reset event or a
// gesture event with its documented mask, phase and region, and hold events nest (a change or
// an end only inside a hold, a start only outside one). The first violation, or "".
std::string gestureGrammarViolation(const std::vector<EventSummary>& events) {
    constexpr uint32_t kHoldMask = 2, kTapMask = 0x20000;
    bool holdOpen = false;
    for (size_t i = 0; i < events.size(); ++i) {
        const EventSummary& e = events[i];
        const bool hold = e.eventMask == kHoldMask, tap = e.eventMask == kTapMask;
        const bool cancelled = e.phase == kHIDEventPhaseCancelled;
        const bool holdGoesOn = e.phase == kHIDEventPhaseChanged || e.phase == kHIDEventPhaseEnded;
        const bool touchNews = e.eventMask == 0 && (e.phase == kHIDEventPhaseMayBegin || cancelled);
        const char* fault = nullptr;
        if (e.type == kHIDEventTypeVendorDefined) {  // a firmware reset has ended whatever was going on
            holdOpen = false;
            continue;
        }
        if (e.type != kHIDEventTypeDigitizer) fault = "not a digitizer event";
        else if (cancelled ? e.region != 0 : e.region != 1 && e.region != 2 && e.region != 3) fault = "region out of place";
        else if (hold && e.phase == kHIDEventPhaseBegan && holdOpen) fault = "hold start inside a hold";
        else if (hold && holdGoesOn && !holdOpen) fault = "hold change or end outside a hold";
        else if (hold && e.phase != kHIDEventPhaseBegan && !holdGoesOn) fault = "hold event with an unknown phase";
        else if (tap && e.phase != 0) fault = "tap with a phase";
        else if (!hold && !tap && !touchNews) fault = "unknown event";
        if (fault) return "event " + std::to_string(i) + " " + testing::PrintToString(e) + ": " + fault;
        if (hold) holdOpen = e.phase != kHIDEventPhaseEnded;
        if (cancelled) holdOpen = false;
    }
    return {};
}

// The session after the writes, run twice on fresh pipelines: it must come out the same both
// times (nothing undefined feeds into it) and be a stream the gesture machine can say.
std::vector<EventSummary> checkedSession(const std::vector<Write>& writes) {
    const std::vector<Bytes> reports = reportsOfScript(kSession);
    EventTrace first, second;
    for (EventTrace* trace : {&first, &second}) {
        for (const auto& [key, value] : writes) trace->pipeline->setState(0, "Algs." + key, value);
        trace->play(reports);
    }
    EXPECT_EQ(first.events, second.events) << "the same input gave two different event streams";
    EXPECT_EQ(gestureGrammarViolation(first.events), "");
    return first.events;
}

const std::vector<std::pair<const char*, PropertyValue>>& hostileValues() {
    using limits = std::numeric_limits<double>;
    static const std::vector<std::pair<const char*, PropertyValue>> values = {
        {"NaN", PropertyValue::fromDouble(limits::quiet_NaN())}, {"+inf", PropertyValue::fromDouble(limits::infinity())},
        {"float NaN", PropertyValue::fromFloat(std::numeric_limits<float>::quiet_NaN())},
        {"-inf", PropertyValue::fromFloat(-std::numeric_limits<float>::infinity())},
        {"-1", PropertyValue::fromInt32(-1)}, {"-0.0", PropertyValue::fromDouble(-0.0)},
        {"-2.5", PropertyValue::fromDouble(-2.5)}, {"denormal", PropertyValue::fromDouble(limits::denorm_min())},
        {"int64 min", PropertyValue::fromInt64(std::numeric_limits<int64_t>::min())},
        {"uint64 max", PropertyValue::fromUInt64(std::numeric_limits<uint64_t>::max())},
        {"1e300", PropertyValue::fromDouble(1e300)}, {"-1e300", PropertyValue::fromDouble(-1e300)},
        {"2^64 as double", PropertyValue::fromDouble(18446744073709551616.0)},
        {"string", PropertyValue::string("250")}, {"null", PropertyValue::null()}, {"no value", PropertyValue()},
        {"array", PropertyValue::array({PropertyValue::fromUInt32(1)})}, {"data", PropertyValue::data(Bytes{1, 2, 3})},
        {"dictionary", PropertyValue::dictionary({{"a", PropertyValue::fromUInt32(1)}})},
    };
    return values;
}

std::vector<float> factorTable(Pipeline& pipeline) {
    std::vector<float> factors;
    for (int n = 0; n < 23; ++n) {
        factors.push_back(pipeline.getState("Algs.VirtualNormalizationFactors." + std::to_string(n)).toFloat());
    }
    return factors;
}

TEST(HostileValues, EveryTunableKeyStoresTheDocumentedConversionOfAnyValue) {
    for (const std::string key : {"EnableHoldSuppression", "EnableTapSuppression", "HoldTimeoutMilliseconds",
                                  "ActivationThreshold", "VirtualNormalizationFactors.0", "VirtualNormalizationFactors.22",
                                  "VirtualNormalizationFactors.23", "VirtualNormalizationFactors.-1", "ResetEventStats",
                                  "EventStats", "DebugInfo"}) {
        for (const auto& [name, value] : hostileValues()) {
            SCOPED_TRACE(key + " = " + name);
            Pipeline pipeline;
            const PropertyValue before = pipeline.getState("Algs." + key);
            const std::vector<float> factorsBefore = factorTable(pipeline);
            pipeline.setState(0, "Algs." + key, value);
            // Non-numbers are written as 0.
            const PropertyValue number = value.isNumber() ? value : PropertyValue::fromUInt64(0);
            const PropertyValue read = pipeline.getState("Algs." + key);
            if (key == "EnableHoldSuppression" || key == "EnableTapSuppression") {
                EXPECT_EQ(read, PropertyValue::fromBool(number.toBool()));
            } else if (key == "HoldTimeoutMilliseconds") {
                EXPECT_EQ(read.toUInt64(), number.toUInt64() & 0xFFFFFFFFu);
            } else if (key == "ActivationThreshold" || key.ends_with(".0") || key.ends_with(".22")) {
                ASSERT_TRUE(read.isNumber());
                EXPECT_TRUE(std::isnan(number.toFloat()) ? std::isnan(read.toFloat()) : read.toFloat() == number.toFloat())
                    << read.toFloat() << " vs " << number.toFloat();
            } else if (key == "ResetEventStats" || key.ends_with(".23") || key.ends_with(".-1")) {
                EXPECT_FALSE(read.hasValue());
                EXPECT_EQ(factorTable(pipeline), factorsBefore);
            } else {  // read-only keys
                EXPECT_EQ(read, before);
            }
        }
    }
}

TEST(HostileValues, HostileAndExtremeParametersLeaveAWellFormedReproducibleGestureStream) {
    for (const char* key : {"ActivationThreshold", "HoldTimeoutMilliseconds", "EnableTapSuppression"}) {
        for (const auto& [name, value] : hostileValues()) {
            SCOPED_TRACE(std::string(key) + " = " + name);
            checkedSession({{key, value}});
        }
    }
    const std::pair<const char*, std::vector<Write>> extremes[] = {
        {"activation threshold 0", {{"ActivationThreshold", PropertyValue::fromFloat(0)}}},
        {"negative activation threshold", {{"ActivationThreshold", PropertyValue::fromFloat(-100)}}},
        {"activation threshold beyond any pixel", {{"ActivationThreshold", PropertyValue::fromFloat(1e30f)}}},
        {"hold timeout 0", {{"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(0)}}},
        {"no suppression", {{"EnableHoldSuppression", PropertyValue::fromBool(false)},
                            {"EnableTapSuppression", PropertyValue::fromBool(false)}}},
    };
    for (const auto& [name, writes] : extremes) {
        SCOPED_TRACE(name);
        checkedSession(writes);
    }
}

TEST(HostileValues, NoHoldBeginsWhenTheHoldTimeoutIsTheLongestThereIs) {
    const auto holdBegins = [](const std::vector<EventSummary>& events) {
        return std::ranges::any_of(events, [](const EventSummary& e) { return e.phase == kHIDEventPhaseBegan; });
    };
    EXPECT_FALSE(holdBegins(checkedSession({{"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(0xFFFFFFFFu)}})));
    EXPECT_TRUE(holdBegins(checkedSession({}))) << "the session holds long enough for a hold with the default timeout";
}

// Frame times are unsigned milliseconds taken modulo 2^32, frame numbers too: a session that
// wraps either clock says exactly what the same session says away from the wrap.
TEST(HostileValues, WrappingFrameTimesAndNumbersChangeNothing) {
    constexpr uint32_t kFrameNumberOffset = 0xFFFFFF80u;  // wraps within the first 128 frames
    EventTrace plain, wrapped;
    plain.play(reportsOfScript(kSession));
    std::vector<Bytes> reports = reportsOfScript(kSession, 0xFFFFFFFFu - 1500);  // wraps after 1.5 s
    for (Bytes& report : reports) {
        if (report[0] != InputReport::Image::kReportID) continue;
        uint32_t frameNumber = report[1] | report[2] << 8 | report[3] << 16 | static_cast<uint32_t>(report[4]) << 24;
        frameNumber += kFrameNumberOffset;
        for (int i = 0; i < 4; ++i) report[1 + i] = static_cast<uint8_t>(frameNumber >> (8 * i));
    }
    wrapped.play(reports);

    ASSERT_FALSE(plain.events.empty());
    ASSERT_EQ(wrapped.events.size(), plain.events.size());
    for (size_t i = 0; i < plain.events.size(); ++i) {
        EventSummary expected = plain.events[i];
        // Events that a firmware reset ends a touch with carry no frame's number.
        const bool fromReset = expected.frameNumber == 0 && wrapped.events[i].frameNumber == 0;
        if (expected.type == kHIDEventTypeDigitizer && !fromReset) {
            expected.frameNumber = static_cast<uint32_t>(static_cast<uint32_t>(expected.frameNumber) + kFrameNumberOffset);
        }
        EXPECT_EQ(wrapped.events[i], expected) << "event " << i;
    }
    EXPECT_EQ(wrapped.pipeline->getState("DebugInfo"), plain.pipeline->getState("DebugInfo"));
}

// Reports of every length from 0 to 600 with every report ID: each reaches exactly the probe its
// ID and length call for, and the recording keeps every byte through its container (checked for
// the IDs the system knows and the extremes; the container does not look at IDs).
TEST(HostileValues, ReportsOfEveryLengthAndID) {
    constexpr int kMaxLength = 600;
    uint32_t noise = 0x12345678;  // fills the reports with reproducible junk
    for (int id = 0; id < 256; ++id) {
        SCOPED_TRACE("report ID " + std::to_string(id));
        auto pipeline = std::make_shared<Pipeline>();
        int images = 0, firmwareEvents = 0, invalid = 0;
        pipeline->imageProbe = std::make_shared<std::function<void(uint64_t, const InputReport::Image&)>>(
            [&](uint64_t, const InputReport::Image&) { ++images; });
        pipeline->firmwareEventProbe = std::make_shared<std::function<void(uint64_t, const InputReport::FirmwareEvent&)>>(
            [&](uint64_t, const InputReport::FirmwareEvent&) { ++firmwareEvents; });
        pipeline->invalidInputReportProbe = std::make_shared<std::function<void(uint64_t, const uint8_t*, uint64_t)>>(
            [&](uint64_t, const uint8_t*, uint64_t) { ++invalid; });
        PipelineRecording recording;
        recording.pipeline = pipeline;
        for (int length = 0; length <= kMaxLength; ++length) {
            Bytes report(length);
            for (uint8_t& byte : report) byte = static_cast<uint8_t>((noise = noise * 1664525u + 1013904223u) >> 24);
            if (length) report[0] = static_cast<uint8_t>(id);
            recording.handleInputReport(length, report.data(), report.size());
        }
        EXPECT_EQ(images, id == InputReport::Image::kReportID ? kMaxLength + 1 - 73 : 0);
        EXPECT_EQ(firmwareEvents, id == InputReport::FirmwareEvent::kReportID ? kMaxLength + 1 - 10 : 0);
        EXPECT_EQ(images + firmwareEvents + invalid, kMaxLength + 1);
        if (id <= 3 || id == FeatureReport::FactoryResetHoldDuration::kReportID || id == 0xFF) {
            const PropertyValue written = recording.json();  // hex of the bytes as they came
            EXPECT_TRUE(PipelineRecording(written).json() == written) << "the bytes read back are not those written";
        }
    }
}

}  // namespace
}  // namespace ZeltoTouch::Reliability

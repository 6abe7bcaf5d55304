// Whatever a property caller or the sensor sends, the pipeline does something defined: parameters
// store the documented conversion of any number, extreme parameters and wrapping clocks leave
// the gesture stream well-formed and reproducible, and reports of any length and ID are classified.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

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

// Non-numbers are written as 0, a value the extreme parameters below include.
const std::vector<std::pair<const char*, PropertyValue>>& hostileValues() {
    using PV = PropertyValue;
    using D = std::numeric_limits<double>;
    using F = std::numeric_limits<float>;
    static const std::vector<std::pair<const char*, PV>> values = {
        {"NaN", PV::fromDouble(D::quiet_NaN())}, {"+inf", PV::fromDouble(D::infinity())}, {"-1", PV::fromInt32(-1)},
        {"float NaN", PV::fromFloat(F::quiet_NaN())}, {"-inf", PV::fromFloat(-F::infinity())},
        {"-2.5", PV::fromDouble(-2.5)}, {"-0.0", PV::fromDouble(-0.0)}, {"denormal", PV::fromDouble(D::denorm_min())},
        {"int64 min", PV::fromInt64(std::numeric_limits<int64_t>::min())}, {"1e300", PV::fromDouble(1e300)},
        {"-1e300", PV::fromDouble(-1e300)},
        {"uint64 max", PV::fromUInt64(std::numeric_limits<uint64_t>::max())},
        {"2^64 as double", PV::fromDouble(18446744073709551616.0)},
    };
    return values;
}

// Conversions of ordinary values, out-of-range factor indices and read-only keys are covered
// with the parameters' own tests; these are the numbers no conversion table lists.
TEST(HostileValues, WritableKeysStoreTheConversionOfNaNInfinitiesAndExtremeNumbers) {
    for (const std::string key :
         {"EnableTapSuppression", "HoldTimeoutMilliseconds", "ActivationThreshold", "VirtualNormalizationFactors.22"}) {
        for (const auto& [name, value] : hostileValues()) {
            SCOPED_TRACE(key + " = " + name);
            Pipeline pipeline;
            pipeline.setState(0, "Algs." + key, value);
            const PropertyValue read = pipeline.getState("Algs." + key);
            if (key == "EnableTapSuppression") {
                EXPECT_EQ(read, PropertyValue::fromBool(value.toBool()));
            } else if (key == "HoldTimeoutMilliseconds") {
                EXPECT_EQ(read.toUInt64(), value.toUInt64() & 0xFFFFFFFFu);
            } else {
                EXPECT_TRUE(std::isnan(value.toFloat()) ? std::isnan(read.toFloat()) : read.toFloat() == value.toFloat())
                    << read.toFloat() << " vs " << value.toFloat();
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
        put32(&report[1], get32(&report[1]) + kFrameNumberOffset);
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
// ID and length call for (an image from 73 bytes on, a firmware event from 10).
TEST(HostileValues, ReportsOfEveryLengthAndID) {
    constexpr int kMaxLength = 600;
    uint32_t noise = 0x12345678;  // fills the reports with reproducible junk
    for (int id = 0; id < 256; ++id) {
        SCOPED_TRACE("report ID " + std::to_string(id));
        Pipeline pipeline;
        int images = 0, firmwareEvents = 0, invalid = 0;
        pipeline.imageProbe = std::make_shared<std::function<void(uint64_t, const InputReport::Image&)>>(
            [&](uint64_t, const InputReport::Image&) { ++images; });
        pipeline.firmwareEventProbe = std::make_shared<std::function<void(uint64_t, const InputReport::FirmwareEvent&)>>(
            [&](uint64_t, const InputReport::FirmwareEvent&) { ++firmwareEvents; });
        pipeline.invalidInputReportProbe = std::make_shared<std::function<void(uint64_t, const uint8_t*, uint64_t)>>(
            [&](uint64_t, const uint8_t*, uint64_t) { ++invalid; });
        for (int length = 0; length <= kMaxLength; ++length) {
            Bytes report(length);
            for (uint8_t& byte : report) byte = static_cast<uint8_t>((noise = noise * 1664525u + 1013904223u) >> 24);
            if (length) report[0] = static_cast<uint8_t>(id);
            pipeline.handleInputReport(length, report.data(), report.size());
        }
        EXPECT_EQ(images, id == InputReport::Image::kReportID ? kMaxLength + 1 - 73 : 0);
        EXPECT_EQ(firmwareEvents, id == InputReport::FirmwareEvent::kReportID ? kMaxLength + 1 - 10 : 0);
        EXPECT_EQ(images + firmwareEvents + invalid, kMaxLength + 1);
    }
}

}  // namespace
}  // namespace ZeltoTouch::Reliability

#include "Shared/Algs/Algs.h"

#include <algorithm>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace ZeltoTouch {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

constexpr int A = 0, D = 3, G = 6;

// A gesture event as "Kind(region)".
std::string describe(const HIDEvent& event) {
    static const std::map<std::pair<uint32_t, uint32_t>, std::string> kinds = {  // by event mask and phase
        {{0x20000, 0}, "Tap"},
        {{2, kHIDEventPhaseBegan}, "HoldStart"},
        {{2, kHIDEventPhaseChanged}, "HoldChange"},
        {{2, kHIDEventPhaseEnded}, "HoldEnd"},
        {{0, kHIDEventPhaseMayBegin}, "MayBegin"},
        {{0, kHIDEventPhaseCancelled}, "Cancel"},
    };
    const auto kind = kinds.find({event.eventMask(), event.phase()});
    const std::string region = "(" + std::to_string(static_cast<int>(event.y())) + ")";
    return (kind == kinds.end() ? "Unexpected" : kind->second) + region;
}

// Drives an Algs with frames 10 ms apart (numbered from 101) and writes down every event as
// "Kind(region)@time".
class Session {
public:
    // Contact of `raw` on `channel` from `fromMs` to before `toMs`.
    Session& contact(int channel, int16_t raw, uint32_t fromMs, uint32_t toMs) {
        for (uint32_t t = fromMs; t < toMs; t += 10) frame(t, {{channel, raw}});
        return *this;
    }
    Session& idle(uint32_t fromMs, uint32_t toMs) { return contact(A, 0, fromMs, toMs); }
    HIDEventList frame(uint32_t timeMs, std::vector<std::pair<int, int16_t>> readings) {
        InputReport::Image image;
        image.frameNumber = ++_frameNumber;
        image.timestampMs = _timeMs = timeMs;
        for (const auto& [channel, raw] : readings) image.signedPixels[channel] = raw;
        _values = image.signedPixels;
        HIDEventList list = algs.handleImage(image);
        for (const HIDEventRef& event : list) events.push_back(describe(*event) + "@" + std::to_string(timeMs));
        return list;
    }
    std::string touchState() const { return algs.touchStateDescription(_values, _timeMs); }
    Session& withoutHoldSuppression() {
        algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
        return *this;
    }

    Algs algs;
    std::vector<std::string> events;

private:
    PixelValues _values{};
    uint32_t _timeMs = 0;
    uint32_t _frameNumber = 100;
};

// Each case: the frames, the events they produce and how the last frame's touch state ends.
TEST(AlgsTest, GestureSequencesAndStateLabels) {
    using Events = std::vector<std::string>;
    const Events mayBegin = {"MayBegin(1)@1000"};
    const Events holdStart = {"MayBegin(1)@1000", "HoldStart(1)@1510"};
    const struct {
        std::function<void(Session&)> run;
        Events events;
        const char* label;  // nullptr: not checked
    } cases[] = {
        {[](Session& s) { s.idle(0, 1000); }, {}, "] "},
        {[](Session& s) { s.contact(A, 300, 1000, 1010); }, mayBegin, "] STARTTOUCH 0ms ActiveRegion=1"},
        {[](Session& s) { s.contact(A, 300, 1000, 1010).contact(A, 300, 1040, 1050); }, mayBegin,
         "] TOUCHING 40ms ActiveRegion=1"},
        // A clock stepping back reads, modulo 2^32, as a very long touch.
        {[](Session& s) { s.contact(A, 300, 1000, 1010).contact(A, 300, 990, 1000); },
         {"MayBegin(1)@1000", "HoldStart(1)@990"}, "] STARTHOLD -10ms ActiveRegion=1"},
        {[](Session& s) { s.contact(A, 300, 1000, 1180).contact(A, 60, 1180, 1190); },
         {"MayBegin(1)@1000", "Tap(1)@1180"}, "] TAP 180ms ActiveRegion=1 ABOVENOISE"},
        {[](Session& s) { s.contact(A, 110, 1000, 1400).idle(1400, 1410); }, {"MayBegin(1)@1000", "Cancel(0)@1400"},
         "] SUPPRESSTAP 400ms ActiveRegion=1 BELOWNOISE"},
        {[](Session& s) { s.contact(A, 110, 1000, 1520); }, mayBegin, "] SUPPRESSHOLD 510ms ActiveRegion=1"},
        {[](Session& s) { s.contact(A, 110, 1000, 1600).idle(1600, 1610); }, {"MayBegin(1)@1000", "Cancel(0)@1600"},
         "] ENDTOUCH 600ms ActiveRegion=1 BELOWNOISE"},
        {[](Session& s) { s.withoutHoldSuppression().contact(A, 300, 1000, 1520); }, holdStart,
         "] STARTHOLD 510ms ActiveRegion=1"},
        {[](Session& s) { s.withoutHoldSuppression().contact(A, 300, 1000, 1530); }, holdStart,
         "] HOLDING 520ms ActiveRegion=1"},
        {[](Session& s) { s.withoutHoldSuppression().contact(A, 300, 1000, 1800).idle(1800, 1810); },
         {"MayBegin(1)@1000", "HoldStart(1)@1510", "HoldEnd(1)@1800"}, "] ENDHOLD 800ms ActiveRegion=1 BELOWNOISE"},
        {[](Session& s) {
             s.withoutHoldSuppression().contact(A, 300, 1000, 1600).contact(G, 300, 1600, 1700).idle(1700, 1710);
         },
         {"MayBegin(1)@1000", "HoldStart(1)@1510", "HoldChange(3)@1600", "HoldEnd(3)@1700"}, nullptr},
        {[](Session& s) {
             s.algs.setState("EnableTapSuppression", PropertyValue::fromInt32(0));
             s.contact(A, 110, 1000, 1400).idle(1400, 1410);
         },
         {"MayBegin(1)@1000", "Tap(1)@1400"}, nullptr},
        {[](Session& s) {  // a touch ending after an earlier event is not cancelled
             s.withoutHoldSuppression().contact(A, 300, 1000, 1600);
             s.algs.setState("HoldTimeoutMilliseconds", PropertyValue::fromUInt32(100000));  // ends the hold
             s.contact(A, 300, 1600, 2000).idle(2000, 2010);
         },
         {"MayBegin(1)@1000", "HoldStart(1)@1510", "HoldEnd(1)@1600"}, nullptr},
    };
    for (size_t i = 0; i < std::size(cases); ++i) {
        Session s;
        cases[i].run(s);
        EXPECT_EQ(s.events, cases[i].events) << "case " << i;
        if (cases[i].label) {
            EXPECT_THAT(s.touchState(), EndsWith(cases[i].label)) << "case " << i;
        }
    }
}

TEST(AlgsTest, TapCarriesItsFrameNumberAndIsCounted) {
    Session s;
    const HIDEventList first = s.idle(900, 1000).frame(1000, {{A, 300}});
    ASSERT_EQ(first.size(), 1u);
    EXPECT_EQ(first[0]->integerValue(kHIDEventFieldDigitizerFrameNumber), 111);
    s.contact(A, 300, 1010, 1300).idle(1300, 1310);
    EXPECT_EQ(s.algs.getState("EventStats").get("Dispatched").get("numPlayPause").toUInt64(), 1u);
    s.algs.setState("ResetEventStats", PropertyValue());
    EXPECT_EQ(s.algs.getState("EventStats").get("Dispatched").get("numTaps").toUInt64(), 0u);
}

TEST(AlgsTest, FirmwareResetEndsHold) {
    Session s;
    s.withoutHoldSuppression().contact(A, 300, 1000, 1600);
    const HIDEventList list = s.algs.handleReset();
    ASSERT_EQ(list.size(), 1u);
    EXPECT_EQ(describe(*list[0]), "HoldEnd(1)");
    EXPECT_EQ(list[0]->integerValue(kHIDEventFieldDigitizerFrameNumber), 0);
    EXPECT_TRUE(s.algs.handleReset().empty());
}

TEST(AlgsTest, VirtualSumPassesAsLow16Bits) {
    Session s;
    // "ADEF" sums A, D, E and F: 4 × ~10000 = 40000 wraps to a negative 16-bit value.
    s.frame(0, {{0, 5203}, {3, 5309}, {4, 5218}, {5, 5523}});
    const int32_t sum = 10000 + 10000 + 9999 + 9999;  // gain × raw, truncated
    EXPECT_EQ(s.algs.virtualPixels()[2].value, static_cast<int32_t>(0.6667f * static_cast<int16_t>(sum)));
    EXPECT_LT(s.algs.virtualPixels()[2].value, 0);
}

// The sequences above show each event's kind and region; the other fields are the same for all.
TEST(AlgsTest, EventsCarryFixedDigitizerFields) {
    EXPECT_EQ(Algs::createTapEvent(PixelRegion::VolumeUp)->description(),
              "HIDEvent digitizer ts=0 phase=0x0 options=0x0 transducer=2 index=0 identity=0 mask=0x20000 buttons=0x0 "
              "x=0 y=3 z=0 tip=0 barrel=0 range=0 touch=0 frame=0");
}

TEST(GestureDecisionTest, FirstApplicableRuleDecides) {
    using enum GestureEvent;
    using H = HandStats;
    const struct {
        const char* name;
        std::vector<bool HandStats::*> flags;
        uint16_t lastPhase;
        GestureDecision expected;
    } cases[] = {
        {"touch start beats everything", {&H::touching, &H::holding, &H::tap}, 0, {MayBegin, false}},
        {"hold start", {&H::touching, &H::wasTouching, &H::holding}, 128, {HoldStart, false}},
        {"hold goes on, tap flag still wins", {&H::touching, &H::wasTouching, &H::holding, &H::wasHolding, &H::tap},
         0, {Tap, true}},
        {"hold goes on", {&H::touching, &H::wasTouching, &H::holding, &H::wasHolding}, 1, {None, false}},
        {"hold end beats tap", {&H::wasTouching, &H::wasHolding, &H::tap}, 1, {HoldEnd, true}},
        {"touching", {&H::touching, &H::wasTouching}, 128, {None, false}},
        {"idle", {}, 128, {None, false}},
        {"touch ends after may-begin", {&H::wasTouching}, 128, {Cancel, true}},
        {"touch ends after another event", {&H::wasTouching}, 4, {None, true}},
    };
    for (const auto& c : cases) {
        HandStats hand;
        for (bool HandStats::*flag : c.flags) hand.*flag = true;
        EXPECT_EQ(decideGesture(hand, c.lastPhase), c.expected) << c.name;
    }
}

TEST(AlgsDescriptionTest, IdleTouchStateInFullAndPixelColumns) {
    Session s;
    s.idle(0, 10);
    std::string pixels;
    for (char letter = 'A'; letter <= 'O'; ++letter) {
        pixels += std::string(letter == 'A' ? "" : ", ") + letter + "=   0    0";
    }
    EXPECT_EQ(s.touchState(), "ts=0.000000, sd=0.000000, tsd=0.000000, NonActivePixels=21, "
                              "TimeDurationRatio=0.000000, TapSVMScore=1.549000, [" + pixels + "] ");
    s.frame(10, {{D, -5}});
    EXPECT_THAT(s.touchState(), HasSubstr(", D=  -5   -9, E="));
    s.frame(20, {{A, 300}});
    EXPECT_THAT(s.touchState(), HasSubstr("[A= 300  576<==ON, B=   0    0, "));
    const std::string virtualState = s.algs.virtualStateDescription(PixelValues{300}, 20);
    EXPECT_THAT(virtualState, HasSubstr("[ABE= 384<==ON, ABF= 255<==ON, ADEF= 384<==ON, AEGJ= 329<==ON, BCEF=   0"));
    EXPECT_THAT(virtualState, EndsWith(", MNO=   0] STARTTOUCH 0ms ActiveRegion=1"));
}

// Writes down what reaches the log; switches debug logging off after `enabledLines` lines.
struct CountingSink : LogSink {
    explicit CountingSink(size_t enabledLines) : enabledLines(enabledLines) {}
    bool isEnabled(std::string_view, LogLevel level) const noexcept override {
        return lines.size() < enabledLines && level == LogLevel::Debug;
    }
    void write(std::string_view category, LogLevel, std::string_view message) override {
        lines.push_back(std::string(category) + ": " + std::string(message));
    }
    size_t enabledLines;
    std::vector<std::string> lines;
};

TEST(AlgsLogTest, ThreeLinesPerFrameWhenDebugLoggingIsOnAndEachRechecksTheLevel) {
    for (const size_t enabledLines : {0u, 1u, 100u}) {
        CountingSink sink(enabledLines);
        Log::setSink(&sink);
        Session().contact(A, 300, 1000, 1020);
        Log::setSink(nullptr);
        ASSERT_EQ(sink.lines.size(), std::min<size_t>(enabledLines, 6)) << enabledLines;
        if (enabledLines < 6) continue;
        EXPECT_THAT(sink.lines[0], StartsWith("Algs: Frame 101 @1000ms, *** Event Stats ***\n"));
        EXPECT_THAT(sink.lines[1], StartsWith("Algs: Frame 101 @1000ms, *** Touch State Description ***\nts="));
        EXPECT_THAT(sink.lines[2], StartsWith("Algs: Frame 101 @1000ms, *** Virtual State Description ***\nts="));
        EXPECT_THAT(sink.lines[5], StartsWith("Algs: Frame 102 @1010ms, *** Virtual State Description ***\n"));
    }
}

}  // namespace
}  // namespace ZeltoTouch

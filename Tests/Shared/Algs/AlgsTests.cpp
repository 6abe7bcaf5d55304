#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr int A = 0, D = 3, G = 6;

// An image with the given raw readings; every other channel reads 0.
InputReport::Image image(uint32_t frameNumber, uint32_t timeMs, std::vector<std::pair<int, int16_t>> readings = {}) {
    InputReport::Image result;
    result.frameNumber = frameNumber;
    result.timestampMs = timeMs;
    for (const auto& [channel, raw] : readings) result.signedPixels[channel] = raw;
    return result;
}

// A gesture event as "Kind(region)".
std::string describe(const HIDEvent& event) {
    const auto region = std::to_string(static_cast<int>(event.y()));
    if (event.eventMask() == 0x20000 && event.phase() == 0) return "Tap(" + region + ")";
    if (event.eventMask() == 2 && event.phase() == kHIDEventPhaseBegan) return "HoldStart(" + region + ")";
    if (event.eventMask() == 2 && event.phase() == kHIDEventPhaseChanged) return "HoldChange(" + region + ")";
    if (event.eventMask() == 2 && event.phase() == kHIDEventPhaseEnded) return "HoldEnd(" + region + ")";
    if (event.eventMask() == 0 && event.phase() == kHIDEventPhaseMayBegin) return "MayBegin(" + region + ")";
    if (event.eventMask() == 0 && event.phase() == kHIDEventPhaseCancelled) return "Cancel(" + region + ")";
    return "Unexpected";
}

struct TimedEvent {
    uint32_t timeMs;
    std::string event;
    friend bool operator==(const TimedEvent&, const TimedEvent&) = default;
    friend std::ostream& operator<<(std::ostream& out, const TimedEvent& e) { return out << e.event << "@" << e.timeMs; }
};

// Drives an Algs with frames 10 ms apart and records every event with its frame time.
class Session {
public:
    // Contact of `raw` on `channel` from `fromMs` to before `toMs`.
    Session& contact(int channel, int16_t raw, uint32_t fromMs, uint32_t toMs) {
        for (uint32_t t = fromMs; t < toMs; t += 10) frame(t, {{channel, raw}});
        return *this;
    }
    Session& idle(uint32_t fromMs, uint32_t toMs) {
        for (uint32_t t = fromMs; t < toMs; t += 10) frame(t, {});
        return *this;
    }
    HIDEventList frame(uint32_t timeMs, std::vector<std::pair<int, int16_t>> readings) {
        HIDEventList list = algs.handleImage(image(++_frameNumber, timeMs, std::move(readings)));
        for (const HIDEventRef& event : list) events.push_back({timeMs, describe(*event)});
        return list;
    }

    Algs algs;
    std::vector<TimedEvent> events;

private:
    uint32_t _frameNumber = 100;
};

TEST(AlgsTest, IdleFramesProduceNothing) {
    Session s;
    s.idle(0, 1000);
    EXPECT_THAT(s.events, IsEmpty());
    EXPECT_EQ(s.algs.lastEventPhase(), 0);
}

TEST(AlgsTest, AcceptedTap) {
    Session s;
    s.idle(900, 1000);
    const HIDEventList first = s.frame(1000, {{A, 300}});
    ASSERT_EQ(first.size(), 1u);
    EXPECT_EQ(first[0]->integerValue(kHIDEventFieldDigitizerFrameNumber), 111);
    s.contact(A, 300, 1010, 1300).idle(1300, 1310);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1300, "Tap(1)"}));
    EXPECT_EQ(s.algs.lastEventPhase(), 0);
    // The tap reset the gesture state.
    EXPECT_EQ(s.algs.handStats().touchScore, 0.0f);
    EXPECT_EQ(s.algs.handStats().peakActiveValue, 0.0f);
    EXPECT_FALSE(s.algs.pixels()[A].everActive);
}

TEST(AlgsTest, HoldWithoutSuppression) {
    Session s;
    s.algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    s.contact(A, 300, 1000, 1800).idle(1800, 1810);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1510, "HoldStart(1)"},
                                      TimedEvent{1800, "HoldEnd(1)"}));
    EXPECT_TRUE(s.algs.handStats().tap) << "the hold end wins over a tap decided in the same frame";
    EXPECT_EQ(s.algs.lastEventPhase(), kHIDEventPhaseEnded);
}

TEST(AlgsTest, HoldMovingToAnotherRegion) {
    Session s;
    s.algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    s.contact(A, 300, 1000, 1600).contact(G, 300, 1600, 1700).idle(1700, 1710);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1510, "HoldStart(1)"},
                                      TimedEvent{1600, "HoldChange(3)"}, TimedEvent{1700, "HoldEnd(3)"}));
}

TEST(AlgsTest, RejectedTapIsCancelled) {
    Session s;
    s.contact(A, 110, 1000, 1400).idle(1400, 1410);  // too weak for its length
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1400, "Cancel(0)"}));
    EXPECT_EQ(s.algs.lastEventPhase(), kHIDEventPhaseCancelled);
}

TEST(AlgsTest, SuppressedHoldIsCancelled) {
    Session s;
    s.contact(A, 110, 1000, 1600);
    ASSERT_LT(s.algs.handStats().touchScore, 0.0f) << "the classifier must score this contact as accidental";
    EXPECT_TRUE(s.algs.handStats().holdSuppressed);
    s.idle(1600, 1610);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1600, "Cancel(0)"}));
}

TEST(AlgsTest, TapWithTapSuppressionOff) {
    Session s;
    s.algs.setState("EnableTapSuppression", PropertyValue::fromInt32(0));
    s.contact(A, 110, 1000, 1400).idle(1400, 1410);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1400, "Tap(1)"}));
}

TEST(AlgsTest, TouchEndingAfterEarlierEventIsNotCancelled) {
    Session s;
    s.algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    s.contact(A, 300, 1000, 1600);
    s.algs.setState("HoldTimeoutMilliseconds", PropertyValue::fromUInt32(100000));  // ends the hold
    s.contact(A, 300, 1600, 2000).idle(2000, 2010);
    EXPECT_THAT(s.events, ElementsAre(TimedEvent{1000, "MayBegin(1)"}, TimedEvent{1510, "HoldStart(1)"},
                                      TimedEvent{1600, "HoldEnd(1)"}));
    EXPECT_FALSE(s.algs.handStats().touching);
}

TEST(AlgsTest, FirmwareResetEndsHold) {
    Session s;
    s.algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    s.contact(A, 300, 1000, 1600);
    const HIDEventList list = s.algs.handleReset();
    ASSERT_EQ(list.size(), 1u);
    EXPECT_EQ(describe(*list[0]), "HoldEnd(1)");
    EXPECT_EQ(list[0]->integerValue(kHIDEventFieldDigitizerFrameNumber), 0);
    EXPECT_THAT(s.algs.handleReset(), IsEmpty());
}

TEST(AlgsTest, VirtualSumPassesAsLow16Bits) {
    Algs algs;
    // "ADEF" sums A, D, E and F: 4 × ~10000 = 40000 wraps to a negative 16-bit value.
    algs.handleImage(image(1, 0, {{0, 5203}, {3, 5309}, {4, 5218}, {5, 5523}}));
    const int32_t sum = 10000 + 10000 + 9999 + 9999;  // gain × raw, truncated
    EXPECT_EQ(algs.virtualPixels()[2].value, static_cast<int32_t>(0.6667f * static_cast<int16_t>(sum)));
    EXPECT_LT(algs.virtualPixels()[2].value, 0);
}

TEST(AlgsTest, EventShapes) {
    struct Case {
        HIDEventRef event;
        uint32_t mask, phase;
        double y;
    };
    const Case cases[] = {
        {Algs::createMayBeginEvent(PixelRegion::None), 0, 128, 0.0},
        {Algs::createHoldStartEvent(PixelRegion::PlayPause), 2, 1, 1.0},
        {Algs::createHoldChangeEvent(PixelRegion::VolumeDown), 2, 2, 2.0},
        {Algs::createHoldEndEvent(PixelRegion::VolumeUp), 2, 4, 3.0},
        {Algs::createTapEvent(PixelRegion::VolumeUp), 131072, 0, 3.0},
        {Algs::createCancelEvent(), 0, 8, 0.0},
    };
    for (const Case& c : cases) {
        ASSERT_TRUE(c.event);
        const HIDEvent& e = *c.event;
        EXPECT_EQ(e.type(), kHIDEventTypeDigitizer);
        EXPECT_EQ(e.eventMask(), c.mask);
        EXPECT_EQ(e.phase(), c.phase);
        EXPECT_EQ(e.y(), c.y);
        EXPECT_EQ(e.transducerType(), 2u);
        EXPECT_EQ(e.timestamp(), 0u);
        EXPECT_EQ(e.x(), 0.0);
        EXPECT_FALSE(e.range() || e.touch());
        EXPECT_EQ(e.tipPressure() + e.barrelPressure(), 0.0);
    }
}

TEST(GestureDecisionTest, FirstApplicableRuleDecides) {
    using enum GestureEvent;
    struct Case {
        const char* name;
        std::vector<bool HandStats::*> flags;
        uint16_t lastPhase;
        GestureDecision expected;
    };
    using H = HandStats;
    const Case cases[] = {
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
    for (const Case& c : cases) {
        HandStats hand;
        for (bool HandStats::*flag : c.flags) hand.*flag = true;
        EXPECT_EQ(decideGesture(hand, c.lastPhase), c.expected) << c.name;
    }
    HandStats moved;
    moved.holding = moved.wasHolding = moved.touching = moved.wasTouching = true;
    moved.previousRegion = PixelRegion::PlayPause;
    moved.activeRegion = PixelRegion::VolumeUp;
    EXPECT_EQ(decideGesture(moved, 1), (GestureDecision{HoldChange, false}));
}

TEST(AlgsTest, EventStatsCountTheTap) {
    Session s;
    s.contact(A, 300, 1000, 1300).idle(1300, 1310);
    const PropertyValue debugInfo = s.algs.getState("DebugInfo");
    EXPECT_EQ(debugInfo.get("EventStats").get("Dispatched").get("numTaps").toUInt64(), 1u);
    EXPECT_EQ(debugInfo.get("EventStats").get("Dispatched").get("numPlayPause").toUInt64(), 1u);
    EXPECT_EQ(s.algs.getState("EventStats"), debugInfo.get("EventStats"));

    s.algs.setState("ResetEventStats", PropertyValue());
    EXPECT_EQ(s.algs.getState("EventStats").get("Dispatched").get("numTaps").toUInt64(), 0u);
    EXPECT_FALSE(s.algs.getState("ResetEventStats"));
}

}  // namespace
}  // namespace ZeltoTouch

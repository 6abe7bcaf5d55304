#include <gtest/gtest.h>

#include <functional>

#include "Shared/Algs/Algs.h"
#include "Tools/EventLines.h"

namespace ZeltoTouch::Tools {
namespace {

HIDEventRef withFrameNumber(HIDEventRef event, int64_t frameNumber) {
    event->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, frameNumber);
    return event;
}

struct EventLineCase {
    const char* name;
    std::function<HIDEventRef()> make;
    const char* jsonLine;
    const char* textLine;
};

// The jsonl lines are a contract for scripts: key order and spacing included.
const EventLineCase kCases[] = {
    {"may-begin", [] { return withFrameNumber(Algs::createMayBeginEvent(PixelRegion::PlayPause), 12); },
     R"({"event": "may-begin", "region": 1, "phase": 128, "eventMask": 0, "frameNumber": 12, "t": 1500000000})",
     "     1.500 s  may-begin    play/pause    frame 12"},
    {"hold-start", [] { return withFrameNumber(Algs::createHoldStartEvent(PixelRegion::VolumeUp), 60); },
     R"({"event": "hold-start", "region": 3, "phase": 1, "eventMask": 2, "frameNumber": 60, "t": 1500000000})",
     "     1.500 s  hold-start   volume up     frame 60"},
    {"hold-change", [] { return withFrameNumber(Algs::createHoldChangeEvent(PixelRegion::VolumeDown), 61); },
     R"({"event": "hold-change", "region": 2, "phase": 2, "eventMask": 2, "frameNumber": 61, "t": 1500000000})",
     "     1.500 s  hold-change  volume down   frame 61"},
    {"hold-end", [] { return withFrameNumber(Algs::createHoldEndEvent(PixelRegion::VolumeDown), 4294967295); },
     R"({"event": "hold-end", "region": 2, "phase": 4, "eventMask": 2, "frameNumber": 4294967295, "t": 1500000000})",
     "     1.500 s  hold-end     volume down   frame 4294967295"},
    {"tap", [] { return withFrameNumber(Algs::createTapEvent(PixelRegion::VolumeUp), 0); },
     R"({"event": "tap", "region": 3, "phase": 0, "eventMask": 131072, "frameNumber": 0, "t": 1500000000})",
     "     1.500 s  tap          volume up     frame 0"},
    {"cancel", [] { return withFrameNumber(Algs::createCancelEvent(), 7); },
     R"({"event": "cancel", "region": 0, "phase": 8, "eventMask": 0, "frameNumber": 7, "t": 1500000000})",
     "     1.500 s  cancel       no region     frame 7"},
    {"firmware-reset", [] { return HIDEvent::createVendorDefinedEvent(0, 0xFF60, 2, 0, nullptr, 0, 0); },
     R"({"event": "firmware-reset", "usagePage": 65376, "usage": 2, "t": 1500000000})",
     "     1.500 s  firmware-reset"},
    {"other vendor event", [] { return HIDEvent::createVendorDefinedEvent(0, 0xFF00, 9, 0, nullptr, 0, 0); },
     R"({"event": "vendor-defined", "usagePage": 65280, "usage": 9, "t": 1500000000})",
     "     1.500 s  vendor-defined"},
};

TEST(EventLines, EachKindHasItsContractLine) {
    for (const EventLineCase& c : kCases) {
        SCOPED_TRACE(c.name);
        const HIDEventRef event = c.make();
        ASSERT_TRUE(event);
        EXPECT_EQ(eventJSONLine(*event, 1'500'000'000), c.jsonLine);
        EXPECT_EQ(eventTextLine(*event, 1'500'000'000), c.textLine);
    }
}

TEST(EventLines, TimestampKeepsAllSixtyFourBits) {
    const HIDEventRef event = Algs::createTapEvent(PixelRegion::PlayPause);
    EXPECT_NE(eventJSONLine(*event, UINT64_MAX).find("\"t\": 18446744073709551615}"), std::string::npos);
}

TEST(EventLines, DigitizerEventOutsideTheGestureTableIsNamedGenerically) {
    const HIDEventRef event = Algs::createHoldStartEvent(PixelRegion::PlayPause);
    event->setPhase(kHIDEventPhaseChanged | kHIDEventPhaseEnded);
    EXPECT_EQ(eventKind(*event), "digitizer");
}

}  // namespace
}  // namespace ZeltoTouch::Tools

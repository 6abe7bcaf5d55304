#include "Host/HIDEvent.h"

#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch {
namespace {

// Every field of the description has its own value, so the text also shows that each factory
// argument lands in its own field.
TEST(HIDEvent, DescriptionIsOneLineWithEveryFieldInOrder) {
    auto digitizer = HIDEvent::createDigitizerEvent(10, 1, 2, 3, 0x4, 0x5, 6, 7.5, -8, 0.25, 0.75, true, false, 0x9);
    ASSERT_TRUE(digitizer);
    digitizer->setPhase(kHIDEventPhaseMayBegin | kHIDEventPhaseBegan);
    digitizer->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 76);
    digitizer->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 77);  // a second write replaces the first
    EXPECT_EQ(digitizer->description(),
              "HIDEvent digitizer ts=10 phase=0x81 options=0x9 transducer=1 index=2 identity=3 mask=0x4 buttons=0x5 "
              "x=6 y=7.5 z=-8 tip=0.25 barrel=0.75 range=1 touch=0 frame=77");

    auto accelerometer = HIDEvent::createAccelerometerEvent(2, 0.5, -1, 9.75, 0);
    EXPECT_EQ(accelerometer->description(), "HIDEvent accelerometer ts=2 phase=0x0 options=0x0 x=0.5 y=-1 z=9.75");
    EXPECT_EQ(accelerometer->doubleValue(kHIDEventFieldAccelerometerZ), 9.75);
    EXPECT_EQ(accelerometer->integerValue(kHIDEventFieldAccelerometerZ), 0);  // doubles and integers apart
}

TEST(HIDEvent, VendorDefinedEventCopiesItsPayload) {
    std::vector<uint8_t> payload = {1, 2, 3};
    auto event = HIDEvent::createVendorDefinedEvent(7, 0xFF00, 0x0A, 1, payload.data(), payload.size(), 0);
    ASSERT_TRUE(event);
    payload[0] = 9;
    EXPECT_EQ(std::vector<uint8_t>(event->data().begin(), event->data().end()), (std::vector<uint8_t>{1, 2, 3}));
    EXPECT_EQ(event->data().size(), 3u);
    EXPECT_TRUE(HIDEvent::createVendorDefinedEvent(7, 1, 2, 0, nullptr, 0, 0));
    EXPECT_FALSE(HIDEvent::createVendorDefinedEvent(7, 1, 2, 0, nullptr, 4, 0));
}

}  // namespace
}  // namespace ZeltoTouch

#include "Host/HIDEvent.h"

#include <gtest/gtest.h>

namespace ZeltoTouch {
namespace {

TEST(HIDEvent, DigitizerEventKeepsEveryFieldInOrder) {
    auto event = HIDEvent::createDigitizerEvent(123456789, 2, 3, 4, 0x50, 0x6, 1.5, -2.5, 3.5, 0.25, 0.75, true,
                                                false, 0x9);
    ASSERT_TRUE(event);
    EXPECT_EQ(event->type(), kHIDEventTypeDigitizer);
    EXPECT_EQ(event->timestamp(), 123456789u);
    EXPECT_EQ(event->transducerType(), 2u);
    EXPECT_EQ(event->index(), 3u);
    EXPECT_EQ(event->identity(), 4u);
    EXPECT_EQ(event->eventMask(), 0x50u);
    EXPECT_EQ(event->buttonMask(), 0x6u);
    EXPECT_EQ(event->x(), 1.5);
    EXPECT_EQ(event->y(), -2.5);
    EXPECT_EQ(event->z(), 3.5);
    EXPECT_EQ(event->tipPressure(), 0.25);
    EXPECT_EQ(event->barrelPressure(), 0.75);
    EXPECT_TRUE(event->range());
    EXPECT_FALSE(event->touch());
    EXPECT_EQ(event->options(), 0x9u);
    EXPECT_EQ(event->phase(), kHIDEventPhaseUndefined);
}

TEST(HIDEvent, PhaseTimestampAndNumberedFieldsCanBeSet) {
    auto event = HIDEvent::createDigitizerEvent(1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, false, false, 0);
    ASSERT_TRUE(event);
    event->setPhase(kHIDEventPhaseMayBegin | kHIDEventPhaseBegan);
    event->setTimestamp(99);
    EXPECT_EQ(event->phase(), 129u);
    EXPECT_EQ(event->timestamp(), 99u);

    EXPECT_EQ(event->integerValue(kHIDEventFieldDigitizerFrameNumber), 0);
    EXPECT_EQ(event->doubleValue(kHIDEventFieldAccelerometerX), 0.0);
    event->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 41);
    event->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 42);
    event->setDoubleValue(0xB0001, -1.25);
    EXPECT_EQ(event->integerValue(kHIDEventFieldDigitizerFrameNumber), 42);
    EXPECT_EQ(event->doubleValue(0xB0001), -1.25);
    EXPECT_EQ(event->integerValue(0xB0001), 0);
}

TEST(HIDEvent, VendorDefinedEventCopiesItsPayload) {
    std::vector<uint8_t> payload = {1, 2, 3};
    auto event = HIDEvent::createVendorDefinedEvent(7, 0xFF00, 0x0A, 1, payload.data(), payload.size(), 0);
    ASSERT_TRUE(event);
    payload[0] = 9;
    EXPECT_EQ(event->type(), kHIDEventTypeVendorDefined);
    EXPECT_EQ(event->timestamp(), 7u);
    EXPECT_EQ(event->usagePage(), 0xFF00);
    EXPECT_EQ(event->usage(), 0x0A);
    EXPECT_EQ(event->version(), 1u);
    EXPECT_EQ(std::vector<uint8_t>(event->data().begin(), event->data().end()), (std::vector<uint8_t>{1, 2, 3}));

    EXPECT_TRUE(HIDEvent::createVendorDefinedEvent(7, 1, 2, 0, nullptr, 0, 0));
    EXPECT_FALSE(HIDEvent::createVendorDefinedEvent(7, 1, 2, 0, nullptr, 4, 0));
}

TEST(HIDEvent, AccelerometerEventStoresAxesAsDoubleFields) {
    auto event = HIDEvent::createAccelerometerEvent(5, 0.125, -1.0, 9.75, 0);
    ASSERT_TRUE(event);
    EXPECT_EQ(event->type(), kHIDEventTypeAccelerometer);
    EXPECT_EQ(event->doubleValue(kHIDEventFieldAccelerometerX), 0.125);
    EXPECT_EQ(event->doubleValue(kHIDEventFieldAccelerometerY), -1.0);
    EXPECT_EQ(event->doubleValue(kHIDEventFieldAccelerometerZ), 9.75);
}

TEST(HIDEvent, DescriptionIsOneLineWithTheRelevantFields) {
    auto digitizer = HIDEvent::createDigitizerEvent(10, 1, 2, 3, 0x4, 0, 0, 1, 0, 0.5, 0, true, true, 0);
    digitizer->setPhase(kHIDEventPhaseMayBegin);
    digitizer->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 77);
    EXPECT_EQ(digitizer->description(),
              "HIDEvent digitizer ts=10 phase=0x80 options=0x0 transducer=1 index=2 identity=3 mask=0x4 buttons=0x0 "
              "x=0 y=1 z=0 tip=0.5 barrel=0 range=1 touch=1 frame=77");

    uint8_t byte = 0;
    auto vendor = HIDEvent::createVendorDefinedEvent(1, 0xFF00, 0x1, 2, &byte, 1, 0);
    EXPECT_EQ(vendor->description(),
              "HIDEvent vendor-defined ts=1 phase=0x0 options=0x0 usagePage=0xff00 usage=0x1 version=2 length=1");

    auto accelerometer = HIDEvent::createAccelerometerEvent(2, 0.5, -1, 0, 0);
    EXPECT_EQ(accelerometer->description(), "HIDEvent accelerometer ts=2 phase=0x0 options=0x0 x=0.5 y=-1 z=0");
}

}  // namespace
}  // namespace ZeltoTouch

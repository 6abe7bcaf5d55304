#include <gtest/gtest.h>

#include "Platform/DeviceRegistry.h"
#include "Platform/SimulatedSensor.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch::Platform {
namespace {

TEST(SimulatedSensor, AnswersEveryFirmwareFeatureReport) {
    SimulatedSensor sensor;
    for (uint32_t reportID : {0x04u, 0x10u, 0x11u, 0x12u, 0x13u, 0x1Du, 0x32u, 0x3Bu, 0x3Cu, 0x3Fu, 0x1Fu}) {
        uint8_t buffer[128] = {};
        uint64_t length = sizeof buffer;
        ASSERT_EQ(sensor.getReport(kHIDReportTypeFeature, reportID, buffer, length), kZeltoSuccess) << reportID;
        EXPECT_GE(length, 2u);
        EXPECT_LT(length, sizeof buffer);
        EXPECT_EQ(buffer[0], reportID);
    }
}

TEST(SimulatedSensor, ReportsItsFactoryResetHoldDuration) {
    SimulatedSensor sensor;
    uint8_t buffer[32] = {};
    uint64_t length = sizeof buffer;
    ASSERT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x1F, buffer, length), kZeltoSuccess);
    EXPECT_EQ(FeatureReport::FactoryResetHoldDuration::parse(buffer, length), SimulatedSensor::kFactoryResetHoldDurationMs);
}

TEST(SimulatedSensor, FeatureReportFailuresAreConfigurablePerReport) {
    SimulatedSensor sensor;
    sensor.failFeatureReport(0x04, static_cast<ZeltoReturn>(0xE00002D8u));
    uint8_t buffer[128];
    uint64_t length = sizeof buffer;
    EXPECT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x04, buffer, length), static_cast<ZeltoReturn>(0xE00002D8u));
    length = sizeof buffer;
    EXPECT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x10, buffer, length), kZeltoSuccess);
    sensor.clearFeatureReportFailures();
    length = sizeof buffer;
    EXPECT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x04, buffer, length), kZeltoSuccess);
}

TEST(SimulatedSensor, RefusesUnknownReportsShortBuffersAndOtherReportTypes) {
    SimulatedSensor sensor;
    uint8_t buffer[128];
    uint64_t length = sizeof buffer;
    EXPECT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x77, buffer, length), SimulatedSensor::kStatusNotFound);
    length = 3;  // report 0x04 needs 8 bytes: never cut silently
    EXPECT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x04, buffer, length), SimulatedSensor::kStatusBadArgument);
    length = sizeof buffer;
    EXPECT_EQ(sensor.getReport(kHIDReportTypeInput, 0x04, buffer, length), kZeltoUnsupported);
}

TEST(SimulatedSensor, KeepsAPropertyStoreWithReadOnlyIdentity) {
    SimulatedSensor sensor;
    EXPECT_EQ(sensor.copyProperty("Product").stringView(), "ZeltoTouch Simulated Sensor");
    EXPECT_TRUE(sensor.copyProperty("VendorID").isNumber());
    EXPECT_FALSE(sensor.copyProperty("Missing").hasValue());
    EXPECT_FALSE(sensor.setProperty("Product", PropertyValue::string("Other")));
    EXPECT_EQ(sensor.copyProperty("Product").stringView(), "ZeltoTouch Simulated Sensor");
    EXPECT_TRUE(sensor.setProperty("Version", PropertyValue::fromInt32(3)));
    EXPECT_EQ(sensor.copyProperty("Version").toUInt64(), 3u);
    EXPECT_TRUE(sensor.setProperty("Version", PropertyValue()));
    EXPECT_FALSE(sensor.copyProperty("Version").hasValue());
}

TEST(SimulatedSensor, OpenStatusIsConfigurable) {
    SimulatedSensor sensor;
    sensor.setOpenStatus(kZeltoNoResources);
    EXPECT_EQ(sensor.open(0), kZeltoNoResources);
    EXPECT_FALSE(sensor.isOpen());
    sensor.setOpenStatus(kZeltoSuccess);
    EXPECT_EQ(sensor.open(0), kZeltoSuccess);
    EXPECT_TRUE(sensor.isOpen());
    sensor.close(0);
    EXPECT_FALSE(sensor.isOpen());
}

TEST(DeviceRegistry, CreatesDevicesByServiceHandleAndNothingForUnknownHandles) {
    auto sensor = std::make_shared<SimulatedSensor>();
    uint32_t handle = 0;
    {
        ScopedDeviceService service([sensor] { return sensor; });
        handle = service.handle();
        EXPECT_NE(handle, 0u);
        EXPECT_EQ(DeviceRegistry::shared().createDevice(handle), sensor);
        EXPECT_EQ(DeviceRegistry::shared().createDevice(handle + 1000), nullptr);
    }
    EXPECT_EQ(DeviceRegistry::shared().createDevice(handle), nullptr);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

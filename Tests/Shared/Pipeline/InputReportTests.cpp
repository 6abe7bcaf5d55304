#include <gtest/gtest.h>

#include <vector>

#include "Shared/Pipeline/InputReport.h"

using namespace ZeltoTouch;

namespace {

std::vector<uint8_t> report(uint8_t id, size_t length) {
    std::vector<uint8_t> bytes(length, 0);
    if (length > 0) bytes[0] = id;
    return bytes;
}

}  // namespace

TEST(InputReport, ParsesOnlyReportsOfTheirIdAndMinimumLength) {
    struct Case {
        uint8_t id;
        size_t length;
        bool image, firmwareEvent, holdDuration;
    };
    const Case cases[] = {
        {1, 73, true, false, false},  {1, 72, false, false, false}, {1, 100, true, false, false},
        {2, 10, false, true, false},  {2, 9, false, false, false},  {2, 80, false, true, false},
        {31, 5, false, false, true},  {31, 4, false, false, false}, {0, 0, false, false, false},
        {3, 200, false, false, false},
    };
    for (const Case& c : cases) {
        const auto bytes = report(c.id, c.length);
        SCOPED_TRACE(testing::Message() << "id " << int(c.id) << " length " << c.length);
        EXPECT_EQ(InputReport::Image::parse(bytes.data(), bytes.size()).has_value(), c.image);
        EXPECT_EQ(InputReport::FirmwareEvent::parse(bytes.data(), bytes.size()).has_value(), c.firmwareEvent);
        EXPECT_EQ(FeatureReport::FactoryResetHoldDuration::parse(bytes.data(), bytes.size()).has_value(),
                  c.holdDuration);
    }
}

TEST(InputReport, ZeroLengthReportIsNeverRead) {
    EXPECT_FALSE(InputReport::Image::parse(nullptr, 0));
    EXPECT_FALSE(InputReport::FirmwareEvent::parse(nullptr, 0));
    EXPECT_FALSE(FeatureReport::FactoryResetHoldDuration::parse(nullptr, 0));
}

TEST(InputReport, ImageFieldsAreLittleEndianAndPixelsSignedOrUnsigned) {
    auto bytes = report(1, 100);
    const uint8_t header[] = {0xFF, 0xFF, 0xFF, 0xFF, 0xE8, 0x03, 0, 0, 9, 8, 7, 6};
    std::copy(std::begin(header), std::end(header), bytes.begin() + 1);
    bytes[13] = 0xFF, bytes[14] = 0xFF;                  // unsigned A
    bytes[43] = 0xFF, bytes[44] = 0xFF;                  // signed A
    bytes[43 + 28] = 0x34, bytes[43 + 29] = 0x12;        // signed O
    std::fill(bytes.begin() + 73, bytes.end(), 0xAB);    // ignored tail

    const auto image = InputReport::Image::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(image);
    EXPECT_EQ(image->frameNumber, 4294967295u);
    EXPECT_EQ(image->timestampMs, 1000u);
    EXPECT_EQ(image->aux, (std::array<uint8_t, 4>{9, 8, 7, 6}));
    EXPECT_EQ(image->unsignedPixels[0], 65535);
    EXPECT_EQ(image->signedPixels[0], -1);
    EXPECT_EQ(image->signedPixels[14], 0x1234);
    EXPECT_EQ(image->unsignedPixels[14], 0);
}

TEST(InputReport, FirmwareEventKeepsContextInReportOrder) {
    const uint8_t bytes[] = {2, 0, 1, 2, 3, 4, 5, 6, 7, 8};
    const auto event = InputReport::FirmwareEvent::parse(bytes, sizeof bytes);
    ASSERT_TRUE(event);
    EXPECT_EQ(event->event, 0);
    EXPECT_EQ(event->context, (std::array<uint8_t, 8>{1, 2, 3, 4, 5, 6, 7, 8}));
}

TEST(InputReport, HoldDurationReadsLittleEndian) {
    const uint8_t bytes[] = {0x1F, 0x10, 0x27, 0x00, 0x00};
    EXPECT_EQ(FeatureReport::FactoryResetHoldDuration::parse(bytes, sizeof bytes), 10000u);
}

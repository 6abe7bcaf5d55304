#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch {

namespace {

uint16_t readU16(const uint8_t* p) noexcept { return static_cast<uint16_t>(p[0] | (p[1] << 8)); }

uint32_t readU32(const uint8_t* p) noexcept {
    return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 | static_cast<uint32_t>(p[2]) << 16 |
           static_cast<uint32_t>(p[3]) << 24;
}

// The length is tested before byte 0 is read, so an empty report is never touched.
bool hasShape(const uint8_t* bytes, uint64_t length, uint64_t minimumLength, uint8_t reportID) noexcept {
    return length >= minimumLength && bytes[0] == reportID;
}

}  // namespace

namespace InputReport {

std::optional<Image> Image::parse(const uint8_t* bytes, uint64_t length) noexcept {
    if (!hasShape(bytes, length, kLength, kReportID)) return std::nullopt;
    Image image;
    image.frameNumber = readU32(bytes + 1);
    image.timestampMs = readU32(bytes + 5);
    for (int i = 0; i < 4; ++i) image.aux[i] = bytes[9 + i];
    for (int i = 0; i < kPixelCount; ++i) {
        image.unsignedPixels[i] = readU16(bytes + 13 + 2 * i);
        image.signedPixels[i] = static_cast<int16_t>(readU16(bytes + 43 + 2 * i));
    }
    return image;
}

std::optional<FirmwareEvent> FirmwareEvent::parse(const uint8_t* bytes, uint64_t length) noexcept {
    if (!hasShape(bytes, length, kLength, kReportID)) return std::nullopt;
    FirmwareEvent event;
    event.event = bytes[1];
    for (int i = 0; i < 8; ++i) event.context[i] = bytes[2 + i];
    return event;
}

}  // namespace InputReport

namespace FeatureReport {

std::optional<uint32_t> FactoryResetHoldDuration::parse(const uint8_t* bytes, uint64_t length) noexcept {
    if (!hasShape(bytes, length, kLength, kReportID)) return std::nullopt;
    return readU32(bytes + 1);
}

}  // namespace FeatureReport

}  // namespace ZeltoTouch

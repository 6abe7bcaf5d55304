#pragma once

#include <array>
#include <cstdint>
#include <optional>

namespace ZeltoTouch {

inline constexpr int kPixelCount = 15;  // channels A to O

namespace InputReport {

// One frame of the fifteen channels (input report ID 1, 73 bytes, little-endian).
struct Image {
    static constexpr uint8_t kReportID = 1;
    static constexpr uint64_t kLength = 73;

    uint32_t frameNumber = 0;
    uint32_t timestampMs = 0;
    std::array<uint8_t, 4> aux{};
    std::array<uint16_t, kPixelCount> unsignedPixels{};
    std::array<int16_t, kPixelCount> signedPixels{};

    static std::optional<Image> parse(const uint8_t* bytes, uint64_t length) noexcept;
};

// An event raised by the firmware (input report ID 2, 10 bytes); event 0 is a reset.
struct FirmwareEvent {
    static constexpr uint8_t kReportID = 2;
    static constexpr uint64_t kLength = 10;
    static constexpr uint8_t kReset = 0;

    uint8_t event = 0;
    std::array<uint8_t, 8> context{};

    static std::optional<FirmwareEvent> parse(const uint8_t* bytes, uint64_t length) noexcept;
};

}  // namespace InputReport

namespace FeatureReport {

// The device's factory-reset hold duration (feature report ID 0x1F, at least 5 bytes).
struct FactoryResetHoldDuration {
    static constexpr uint8_t kReportID = 0x1F;
    static constexpr uint64_t kLength = 5;

    static std::optional<uint32_t> parse(const uint8_t* bytes, uint64_t length) noexcept;
};

}  // namespace FeatureReport

}  // namespace ZeltoTouch

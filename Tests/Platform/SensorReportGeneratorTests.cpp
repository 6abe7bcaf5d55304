#include <gtest/gtest.h>

#include "Platform/FingerModel.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch::Platform {
namespace {

std::vector<SimulatedReport> reportsOf(const char* script, SensorReportGenerator::Options options = {}) {
    return SensorReportGenerator(GestureScriptParser::parse(script), options).generateAll();
}

TEST(SensorReportGenerator, SendsOneWellFormedImagePerFramePeriod) {
    const auto reports = reportsOf("idle 100ms\ntap volume-up 120ms\nidle 80ms", {.framePeriodMs = 10, .startTimeMs = 5000});
    ASSERT_EQ(reports.size(), 30u);
    for (size_t i = 0; i < reports.size(); ++i) {
        const auto& bytes = reports[i].bytes;
        ASSERT_EQ(bytes.size(), 73u);
        auto image = InputReport::Image::parse(bytes.data(), bytes.size());
        ASSERT_TRUE(image);
        EXPECT_EQ(image->frameNumber, i);
        EXPECT_EQ(image->timestampMs, 5000 + 10 * i);
        EXPECT_EQ(reports[i].scriptTimeMs, 10 * i);
        for (size_t channel = 0; channel < kPixelCount; ++channel) {
            EXPECT_EQ(image->unsignedPixels[channel], SensorReportGenerator::kBaselineCounts + image->signedPixels[channel]);
        }
    }
}

TEST(SensorReportGenerator, IdleFramesStayBelowNoiseAndATouchRisesFarAboveIt) {
    const auto reports = reportsOf("idle 500ms\nhold volume-down 600ms");
    for (const auto& report : reports) {
        const auto image = *InputReport::Image::parse(report.bytes.data(), report.bytes.size());
        int32_t strongest = 0;
        for (size_t channel = 0; channel < kPixelCount; ++channel) {
            const int32_t scaled = static_cast<int32_t>(channelGain(static_cast<int>(channel)) * image.signedPixels[channel]);
            strongest = std::max(strongest, scaled);
        }
        if (report.scriptTimeMs < 500) {
            EXPECT_LE(strongest, kNoiseLevel) << report.scriptTimeMs;
        } else if (report.scriptTimeMs >= 520 && report.scriptTimeMs <= 1080) {
            EXPECT_GT(strongest, 600) << report.scriptTimeMs;
        }
    }
}

TEST(SensorReportGenerator, AResetIsAFirmwareEventAndRestartsTheFrameCounter) {
    const auto reports = reportsOf("idle 30ms\nreset\nidle 20ms\nreset");
    ASSERT_EQ(reports.size(), 7u);
    const std::vector<uint8_t> expectedIDs = {1, 1, 1, 2, 1, 1, 2};
    const std::vector<uint32_t> expectedFrames = {0, 1, 2, 0, 0, 1, 0};
    for (size_t i = 0; i < reports.size(); ++i) {
        EXPECT_EQ(reports[i].bytes[0], expectedIDs[i]) << i;
        if (auto image = InputReport::Image::parse(reports[i].bytes.data(), reports[i].bytes.size())) {
            EXPECT_EQ(image->frameNumber, expectedFrames[i]) << i;
        } else {
            auto event = InputReport::FirmwareEvent::parse(reports[i].bytes.data(), reports[i].bytes.size());
            ASSERT_TRUE(event) << i;
            EXPECT_EQ(reports[i].bytes.size(), 10u);
            EXPECT_EQ(event->event, InputReport::FirmwareEvent::kReset);
        }
    }
    EXPECT_EQ(reports[3].scriptTimeMs, 30u);
    EXPECT_EQ(reports[6].scriptTimeMs, 50u);
}

TEST(SensorReportGenerator, HoldWithResetAfterPutsTheResetInsideTheHold) {
    const auto reports = reportsOf("hold play-pause 100ms reset-after 45ms");
    std::vector<uint32_t> resetTimes;
    for (const auto& report : reports) {
        if (report.bytes[0] == InputReport::FirmwareEvent::kReportID) resetTimes.push_back(report.scriptTimeMs);
    }
    EXPECT_EQ(resetTimes, std::vector<uint32_t>{45});
    EXPECT_EQ(reports.size(), 11u);
}

TEST(SensorReportGenerator, TheSameSeedGivesTheSameReports) {
    const char* script = "tap volume-up 100ms\nidle 50ms";
    EXPECT_EQ(reportsOf(script, {.noiseSeed = 7})[3].bytes, reportsOf(script, {.noiseSeed = 7})[3].bytes);
    EXPECT_NE(reportsOf(script, {.noiseSeed = 7})[3].bytes, reportsOf(script, {.noiseSeed = 8})[3].bytes);
}

TEST(FingerModel, AFingerOnARegionDrivesThatRegionsChannelsHardest) {
    const struct {
        PixelRegion region;
        int strongestChannel;
    } cases[] = {{PixelRegion::PlayPause, 10}, {PixelRegion::VolumeUp, 8}, {PixelRegion::VolumeDown, 12}};
    for (const auto& testCase : cases) {
        const Contact finger{centreOfRegion(testCase.region), 2.5f, 900.0f};
        const auto signals = FingerModel::channelSignals(std::span(&finger, 1));
        const auto strongest = std::max_element(signals.begin(), signals.end()) - signals.begin();
        EXPECT_EQ(strongest, testCase.strongestChannel);
        EXPECT_EQ(regionOfChannel(static_cast<int32_t>(strongest)), testCase.region);
    }
}

TEST(NoiseSource, HasRoughlyZeroMeanAndUnitDeviation) {
    NoiseSource noise(42);
    double sum = 0, squares = 0;
    constexpr int kCount = 20000;
    for (int i = 0; i < kCount; ++i) {
        const double value = noise.next();
        sum += value;
        squares += value * value;
    }
    EXPECT_NEAR(sum / kCount, 0.0, 0.05);
    EXPECT_NEAR(std::sqrt(squares / kCount), 1.0, 0.05);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

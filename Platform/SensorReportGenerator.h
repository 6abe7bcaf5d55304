#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <vector>

#include "Platform/FingerModel.h"
#include "Platform/GestureScript.h"

namespace ZeltoTouch::Platform {

// One input report of the simulated sensor and when it is sent.
struct SimulatedReport {
    uint32_t scriptTimeMs = 0;   // since the start of the script
    std::vector<uint8_t> bytes;  // image report (ID 1, 73 bytes) or firmware reset (ID 2, 10 bytes)
};

// Turns a gesture script into the sensor's input reports, without waiting for real time:
// one image report per frame period while the script lasts, and a firmware event report (event
// 0, a reset) for each reset step and each hold's reset-after. Frame numbers count up by one
// from 0 and start again at 0 after a reset, as the firmware's counter does; the image time
// (timestampMs) is startTimeMs + script time. Noise is reproducible from the seed.
class SensorReportGenerator {
public:
    struct Options {
        uint32_t framePeriodMs = 10;
        uint32_t startTimeMs = 0;
        uint64_t noiseSeed = 0x5EED;
    };

    explicit SensorReportGenerator(GestureScript script);
    SensorReportGenerator(GestureScript script, Options options);

    // The next report, or nothing once the script is over.
    std::optional<SimulatedReport> next();
    // The script time of the next report, or nothing once the script is over.
    std::optional<uint32_t> nextReportTimeMs() const;
    bool finished() const { return !nextReportTimeMs(); }
    // Everything still to come (a whole recording when called on a fresh generator).
    std::vector<SimulatedReport> generateAll();

    // What rests on the sensor at script time timeMs.
    std::vector<Contact> contactsAt(uint32_t timeMs) const;

    // Baseline of the unsigned (raw count) pixels; the signed pixels are the delta to it.
    static constexpr uint16_t kBaselineCounts = 12000;

private:
    bool resetIsNext() const;
    SimulatedReport imageReport(uint32_t timeMs);
    SimulatedReport resetReport(uint32_t timeMs);

    GestureScript _script;
    Options _options;
    std::vector<uint32_t> _stepStartsMs;
    std::vector<uint32_t> _resetTimesMs;  // ascending
    uint32_t _durationMs = 0;             // the script's, summed once
    size_t _nextReset = 0;
    uint64_t _nextFrameMs = 0;
    uint32_t _frameNumber = 0;
    uint8_t _resetCount = 0;
    NoiseSource _noise;
};

}  // namespace ZeltoTouch::Platform

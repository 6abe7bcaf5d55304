#include "Platform/SensorReportGenerator.h"

#include <algorithm>
#include <limits>

namespace ZeltoTouch::Platform {

namespace {

// The finger model's tuning. Strengths are in scaled channel units; the algorithm activates a
// channel above 200 and calls a value above 75 noise.
constexpr float kFingerSpread = 2.5f;
constexpr float kFirmStrength = 900.0f;
constexpr float kBrushStrength = 260.0f;  // reaches activation only at the top of the graze
constexpr float kBrushHover = 0.5f;       // fraction of kBrushStrength while hovering: above noise only
constexpr float kPalmSpread = 8.0f;
constexpr float kPalmStrength = 115.0f;  // light but broad: most channels above noise, few active
constexpr uint32_t kLandingMs = 20;
constexpr float kSlideMoveMs = 30.0f;  // a firm finger lands and lifts within two frames
constexpr float kRawNoiseDeviation = 3.0f;

// Pressure over a firm contact: up over the landing time, flat, down over the same time.
float firmEnvelope(uint32_t elapsedMs, uint32_t durationMs) {
    const float ramp = static_cast<float>(std::min(kLandingMs, std::max(durationMs / 4, 1u)));
    const float rising = static_cast<float>(elapsedMs) / ramp;
    const float falling = static_cast<float>(durationMs - elapsedMs) / ramp;
    return std::clamp(std::min(rising, falling), 0.0f, 1.0f);
}

// A light brush: in over the first tenth to hover level, hovering, one short graze to full
// strength between 80% and 90%, out over the last tenth. It stays above noise far longer than
// it is active, which is what makes the tap rejection refuse it.
float brushEnvelope(uint32_t elapsedMs, uint32_t durationMs) {
    const float phase = static_cast<float>(elapsedMs) / static_cast<float>(durationMs);
    if (phase < 0.1f) return kBrushHover * phase / 0.1f;
    if (phase < 0.8f) return kBrushHover;
    if (phase < 0.9f) return kBrushHover + (1.0f - kBrushHover) * (1.0f - std::abs(phase - 0.85f) / 0.05f);
    return kBrushHover * (1.0f - phase) / 0.1f;
}

SurfacePoint between(SurfacePoint from, SurfacePoint to, float fraction) {
    return {from.x + (to.x - from.x) * fraction, from.y + (to.y - from.y) * fraction};
}

// Where a slide's finger is: on the first region until half time, then moving quickly (within
// kSlideMoveMs) to the second. The hold's region follows only a clear shift of strength from one
// frame to the next, which a slow drift never makes.
SurfacePoint slidePosition(const GestureStep& step, uint32_t elapsedMs) {
    const float moveStart = static_cast<float>(step.durationMs / 2);
    const float fraction = std::clamp((static_cast<float>(elapsedMs) - moveStart) / kSlideMoveMs, 0.0f, 1.0f);
    return between(centreOfRegion(step.region), centreOfRegion(step.toRegion), fraction);
}

void putLE32(std::vector<uint8_t>& bytes, size_t offset, uint32_t value) {
    for (size_t i = 0; i < 4; ++i) bytes[offset + i] = static_cast<uint8_t>(value >> (8 * i));
}

void putLE16(std::vector<uint8_t>& bytes, size_t offset, uint16_t value) {
    bytes[offset] = static_cast<uint8_t>(value);
    bytes[offset + 1] = static_cast<uint8_t>(value >> 8);
}

}  // namespace

SensorReportGenerator::SensorReportGenerator(GestureScript script) : SensorReportGenerator(std::move(script), Options{}) {}

SensorReportGenerator::SensorReportGenerator(GestureScript script, Options options)
    : _script(std::move(script)), _options(options), _noise(options.noiseSeed) {
    if (_options.framePeriodMs == 0) _options.framePeriodMs = 1;
    uint32_t start = 0;
    for (const GestureStep& step : _script.steps) {
        _stepStartsMs.push_back(start);
        if (step.kind == GestureStep::Kind::Reset) _resetTimesMs.push_back(start);
        if (step.resetAfterMs) _resetTimesMs.push_back(start + *step.resetAfterMs);
        start += step.durationMs;
    }
    _durationMs = start;
    std::stable_sort(_resetTimesMs.begin(), _resetTimesMs.end());
}

// A reset comes before the frame at its time; resets after the last frame still come.
bool SensorReportGenerator::resetIsNext() const {
    return _nextReset < _resetTimesMs.size() &&
           (_resetTimesMs[_nextReset] <= _nextFrameMs || _nextFrameMs >= _durationMs);
}

std::optional<uint32_t> SensorReportGenerator::nextReportTimeMs() const {
    if (resetIsNext()) return _resetTimesMs[_nextReset];
    if (_nextFrameMs < _durationMs) return static_cast<uint32_t>(_nextFrameMs);
    return std::nullopt;
}

std::optional<SimulatedReport> SensorReportGenerator::next() {
    if (resetIsNext()) return resetReport(_resetTimesMs[_nextReset++]);
    if (_nextFrameMs >= _durationMs) return std::nullopt;
    const auto timeMs = static_cast<uint32_t>(_nextFrameMs);
    _nextFrameMs += _options.framePeriodMs;
    return imageReport(timeMs);
}

std::vector<SimulatedReport> SensorReportGenerator::generateAll() {
    std::vector<SimulatedReport> reports;
    while (auto report = next()) reports.push_back(std::move(*report));
    return reports;
}

std::vector<Contact> SensorReportGenerator::contactsAt(uint32_t timeMs) const {
    const auto after = std::upper_bound(_stepStartsMs.begin(), _stepStartsMs.end(), timeMs);
    for (auto start = after; start != _stepStartsMs.begin();) {
        --start;
        const GestureStep& step = _script.steps[static_cast<size_t>(start - _stepStartsMs.begin())];
        if (step.durationMs == 0) continue;  // a reset takes no time
        if (timeMs - *start >= step.durationMs) return {};
        const uint32_t elapsed = timeMs - *start;
        const float firm = firmEnvelope(elapsed, step.durationMs);
        switch (step.kind) {
            case GestureStep::Kind::Tap:
            case GestureStep::Kind::Hold:
                return {{centreOfRegion(step.region), kFingerSpread, kFirmStrength * firm}};
            case GestureStep::Kind::Slide:
                return {{slidePosition(step, elapsed), kFingerSpread, kFirmStrength * firm}};
            case GestureStep::Kind::Brush:
                return {{centreOfRegion(step.region), kFingerSpread, kBrushStrength * brushEnvelope(elapsed, step.durationMs)}};
            case GestureStep::Kind::Palm:
                return {{kSurfaceCentre, kPalmSpread, kPalmStrength * firm}};
            case GestureStep::Kind::Idle:
            case GestureStep::Kind::Reset:
                return {};
        }
    }
    return {};
}

SimulatedReport SensorReportGenerator::imageReport(uint32_t timeMs) {
    std::array<float, kPixelCount> noise{};
    for (float& value : noise) value = kRawNoiseDeviation * _noise.next();
    const std::vector<Contact> contacts = contactsAt(timeMs);
    const std::array<int16_t, kPixelCount> raw = FingerModel::rawValues(FingerModel::channelSignals(contacts), noise);

    SimulatedReport report{timeMs, std::vector<uint8_t>(InputReport::Image::kLength, 0)};
    report.bytes[0] = InputReport::Image::kReportID;
    putLE32(report.bytes, 1, _frameNumber++);
    putLE32(report.bytes, 5, _options.startTimeMs + timeMs);
    for (size_t channel = 0; channel < raw.size(); ++channel) {
        const int32_t counts = std::clamp<int32_t>(kBaselineCounts + raw[channel], 0, 65535);
        putLE16(report.bytes, 13 + 2 * channel, static_cast<uint16_t>(counts));
        putLE16(report.bytes, 43 + 2 * channel, static_cast<uint16_t>(raw[channel]));
    }
    return report;
}

SimulatedReport SensorReportGenerator::resetReport(uint32_t timeMs) {
    SimulatedReport report{timeMs, std::vector<uint8_t>(InputReport::FirmwareEvent::kLength, 0)};
    report.bytes[0] = InputReport::FirmwareEvent::kReportID;
    report.bytes[1] = InputReport::FirmwareEvent::kReset;
    report.bytes[9] = ++_resetCount;  // context: the firmware's reset counter
    _frameNumber = 0;
    return report;
}

}  // namespace ZeltoTouch::Platform

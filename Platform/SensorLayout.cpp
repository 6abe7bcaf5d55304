#include "Platform/SensorLayout.h"

#include <vector>

namespace ZeltoTouch::Platform {

namespace {

// From the sensor picture: column centre ÷ 2 and row (0 at the top).
const std::array<std::vector<SurfacePoint>, kPixelCount> kElectrodes = {{
    {{14.75f, 2}, {1.25f, 5}},   // A
    {{3.25f, 2}, {16.75f, 5}},   // B
    {{16.75f, 7}, {3.25f, 10}},  // C
    {{1.25f, 7}, {14.75f, 10}},  // D
    {{14.75f, 4}, {3.25f, 8}},   // E
    {{3.25f, 4}, {14.75f, 8}},   // F
    {{11.25f, 0}},               // G
    {{6.25f, 0}},                // H
    {{8.75f, 1}},                // I
    {{5.25f, 3}, {12.75f, 3}},   // J
    {{8.75f, 6}},                // K
    {{5.25f, 9}, {12.75f, 9}},   // L
    {{8.75f, 11}},               // M
    {{6.25f, 12}},               // N
    {{11.25f, 12}},              // O
}};

}  // namespace

std::span<const SurfacePoint> electrodesOfChannel(int channel) {
    if (channel < 0 || channel >= kPixelCount) return {};
    return kElectrodes[static_cast<size_t>(channel)];
}

SurfacePoint centreOfRegion(PixelRegion region) {
    switch (region) {
        case PixelRegion::VolumeUp: return {8.75f, 1.5f};
        case PixelRegion::VolumeDown: return {8.75f, 10.5f};
        case PixelRegion::PlayPause:
        case PixelRegion::None: break;
    }
    return kSurfaceCentre;
}

}  // namespace ZeltoTouch::Platform

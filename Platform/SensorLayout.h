#pragma once

#include <array>
#include <span>

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch::Platform {

// A point on the sensor surface. Units: the picture of the sensor as the image text rendering
// draws it, one unit per row and per two columns, so that both axes have about the same scale.
// The surface spans x 0 to 18 and y 0 to 12; K sits in the middle.
struct SurfacePoint {
    float x = 0;
    float y = 0;
};

// Where each channel's electrodes sit. Channels A to F, J and L have two electrodes each,
// wired together; the others one.
std::span<const SurfacePoint> electrodesOfChannel(int channel);

// Where a finger rests to touch a region: the middle of its electrodes (K for play/pause).
SurfacePoint centreOfRegion(PixelRegion region);

// The middle of the surface.
inline constexpr SurfacePoint kSurfaceCentre{8.75f, 6.0f};

}  // namespace ZeltoTouch::Platform

#pragma once

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch::Util {

// A text picture of one image: the fifteen pixel values at their places on the sensor, under
// a header with the frame number and time. Shows `unsignedPixels` when useUnsignedPixels is
// true, `signedPixels` otherwise.
PropertyValue stringFromImage(const InputReport::Image& image, bool useUnsignedPixels);

}  // namespace ZeltoTouch::Util

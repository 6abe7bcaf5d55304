// Diagnostic one-line descriptions of the state a frame left behind.
#include "Host/Format.h"
#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {

namespace {

constexpr const char* kActiveMark = "<==ON";

int32_t signedMs(uint32_t difference) { return static_cast<int32_t>(difference); }
int32_t regionNumber(PixelRegion region) { return static_cast<int32_t>(region); }

// The six hand statistics both descriptions start with.
std::string handSummary(const HandStats& h) {
    return format("ts=%f, sd=%f, tsd=%f, NonActivePixels=%d, TimeDurationRatio=%f, TapSVMScore=%f, ",
                  static_cast<double>(h.touchScore), static_cast<double>(h.sd), static_cast<double>(h.tsd),
                  h.nonActivePixels, static_cast<double>(h.timeDurationRatio), static_cast<double>(h.tapSVMScore));
}

}  // namespace

// The gesture state's label; rows in order, the first that applies decides.
std::string Algs::stateLabel(uint32_t now) const {
    const HandStats& h = _handStats;
    const int32_t sinceStart = signedMs(now - h.touchStartMs);
    const int32_t touchLength = signedMs(h.touchEndMs - h.touchStartMs);
    const int32_t region = regionNumber(h.activeRegion);
    const char* noise = h.aboveNoise ? "ABOVENOISE" : "BELOWNOISE";

    if (h.touching && !h.wasTouching) return format("STARTTOUCH %dms ActiveRegion=%d", sinceStart, region);    // 1
    if (h.holding && h.wasHolding) return format("HOLDING %dms ActiveRegion=%d", sinceStart, region);          // 2
    if (h.holding && !h.wasHolding) return format("STARTHOLD %dms ActiveRegion=%d", sinceStart, region);       // 3
    if (h.holdSuppressed) return format("SUPPRESSHOLD %dms ActiveRegion=%d", sinceStart, region);              // 4
    if (h.touching) return format("TOUCHING %dms ActiveRegion=%d", sinceStart, region);                        // 5
    if (h.wasHolding) return format("ENDHOLD %dms ActiveRegion=%d %s", touchLength, region, noise);            // 6
    if (h.tapCandidate && !h.tap) return format("SUPPRESSTAP %dms ActiveRegion=%d %s", sinceStart, region, noise);  // 7
    if (h.tap) return format("TAP %dms ActiveRegion=%d %s", touchLength, region, noise);                       // 8
    if (h.wasTouching) return format("ENDTOUCH %dms ActiveRegion=%d %s", touchLength, region, noise);          // 9
    return {};                                                                                                 // 10
}

std::string Algs::touchStateDescription(const PixelValues& values, uint32_t timeMs) const {
    std::string text = handSummary(_handStats);
    text += '[';
    for (size_t i = 0; i < _pixels.size(); ++i) {
        const Pixel& pixel = _pixels[i];
        appendFormat(text, "%s%c=%4d %4d%s", i == 0 ? "" : ", ", static_cast<char>('A' + pixel.index),
                     static_cast<int32_t>(values.at(i)), pixel.value, pixel.active ? kActiveMark : "");
    }
    appendFormat(text, "] %@", PropertyValue::string(stateLabel(timeMs)));
    return text;
}

std::string Algs::virtualStateDescription(const PixelValues&, uint32_t timeMs) const {
    std::string text = handSummary(_handStats);
    text += '[';
    for (size_t i = 0; i < _virtualPixels.size(); ++i) {
        const VirtualPixel& pixel = _virtualPixels[i];
        appendFormat(text, "%s%s=%4d%s", i == 0 ? "" : ", ", pixel.name, pixel.value,
                     pixel.active ? kActiveMark : "");
    }
    appendFormat(text, "] %@", PropertyValue::string(stateLabel(timeMs)));
    return text;
}

}  // namespace ZeltoTouch

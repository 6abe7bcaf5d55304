#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "Shared/Algs/Pixel.h"
#include "Shared/Algs/SVM.h"

namespace ZeltoTouch {

// The hand as the touch algorithm sees it: touch and above-noise periods, the accumulated
// touch score with the hold decision, the tap features with the tap decision, and the
// region of the touch, together with the parameters that govern them.
//
// All times are frame times in milliseconds; every difference between them is taken
// modulo 2^32.
struct HandStats {
    // Sets touchScore, peakAmplitude, peakActiveValue and peakActiveIndex to 0.
    void Reset() noexcept;
    // Restores the touch score decay's base constant (e²).
    void SetDecayParameters() noexcept;

    // The frame step, once per image after the pixels have been updated. The pixel vectors
    // are taken by reference rather than copied: the step only reads them.
    void updateHandState(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                         uint32_t timeMs);
    void updateTouchScore(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                          uint32_t timeMs);
    void decayTouchScore(uint32_t timeMs) noexcept;
    void updateTapRejection(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels) noexcept;
    // The same from the number of channels above noise but never active in this gesture.
    void updateTapRejection(int32_t aboveNoiseNeverActive) noexcept;

    // Region tracking.
    PixelRegion updateActiveRegion(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                                   uint32_t timeMs);
    PixelRegion changeActiveRegion(const std::vector<Pixel>& pixels, int32_t strongestIndex) noexcept;
    void updateRegionMax(const std::vector<Pixel>& pixels) noexcept;
    float updateTimeBiasFactor(uint32_t timeMs) const noexcept;
    static float fuzzify(float x, float x0, float x1, float y0, float y1) noexcept;
    static float fuzzifyAndClip(float x, float x0, float x1, float y0, float y1) noexcept;

    SVM svm;
    float touchScore = 0;
    float decayBase = 7.389056f;  // e²
    float activationThreshold = 200.0f;
    uint32_t holdTimeoutMs = 500;
    float holdScoreThreshold = 0.0f;
    float touchScoreLimit = 100.0f;
    float peakAmplitude = 0;
    bool enableHoldSuppression = true;
    bool enableTapSuppression = true;
    bool touching = false;
    bool wasTouching = false;
    bool aboveNoise = false;
    bool wasAboveNoise = false;
    bool holding = false;
    bool wasHolding = false;
    bool holdSuppressed = false;
    bool wasHoldSuppressed = false;
    bool tapCandidate = false;
    bool tap = false;
    bool tapRejected = false;
    bool holdTimeElapsed = false;  // maintained only while hold suppression is on
    bool wasHoldTimeElapsed = false;
    uint32_t touchStartMs = 0;
    uint32_t touchEndMs = 0;
    uint32_t aboveNoiseStartMs = 0;
    uint32_t aboveNoiseEndMs = 0;
    uint32_t lastGestureMs = 0;  // last tap or hold end
    float sd = 0;
    float tsd = 0;
    float timeDurationRatio = 0;
    int32_t nonActivePixels = 0;
    float tapSVMScore = 0;
    PixelRegion activeRegion = PixelRegion::None;
    PixelRegion previousRegion = PixelRegion::None;
    PixelRegion lastGestureRegion = PixelRegion::None;
    float peakActiveValue = 0;  // since the last Reset
    int32_t peakActiveIndex = 0;
    std::array<float, kRegionCount> regionMax{};  // per region, the largest excess over noise
    float regionSwitchGain = 1.3f;
};

}  // namespace ZeltoTouch

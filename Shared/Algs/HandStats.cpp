#include "Shared/Algs/HandStats.h"

#include <algorithm>
#include <cmath>

namespace ZeltoTouch {

namespace {

// Linear tap score: weights of the features and the offset.
constexpr float kTapNonActivePixelsWeight = 0.1886f;
constexpr float kTapSdWeight = 0.2772f;
constexpr float kTapTimeDurationRatioWeight = 2.7205f;
constexpr float kTapScoreOffset = 2.4116f;
// Channels allowed to rise above noise without activating before a tap looks accidental.
constexpr int32_t kNonActivePixelAllowance = 21;

struct FrameScan {
    bool anyAboveNoise = false;
    bool anyActive = false;
    int32_t strongestIndex = 0;  // pixel A when no channel is above 0
    float strongestValue = 0;
    int32_t aboveNoiseNeverActive = 0;  // channels above noise in this gesture, never active
};

}  // namespace

void HandStats::Reset() noexcept {
    touchScore = 0;
    peakAmplitude = 0;
    peakActiveValue = 0;
    peakActiveIndex = 0;
}

void HandStats::SetDecayParameters() noexcept { decayBase = 7.389056f; }

void HandStats::updateHandState(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                                uint32_t timeMs) {
    FrameScan scan;
    // Kept in locals while scanning: the pixels' floats might alias the members otherwise.
    float peakValue = peakActiveValue;
    int32_t peakIndex = peakActiveIndex;
    const auto scanChannel = [&](const Pixel& channel) {
        const float n = channel.normalizedValue < 0 ? 0.0f : channel.normalizedValue;
        scan.anyAboveNoise |= channel.aboveNoise;
        scan.anyActive |= channel.active;
        scan.aboveNoiseNeverActive += channel.everAboveNoise && !channel.everActive;
        const bool newPeak = channel.active && n > peakValue;
        peakValue = newPeak ? n : peakValue;
        peakIndex = newPeak ? channel.index : peakIndex;
        const bool strongest = n > scan.strongestValue;
        scan.strongestValue = strongest ? n : scan.strongestValue;
        scan.strongestIndex = strongest ? channel.index : scan.strongestIndex;
    };
    for (const Pixel& pixel : pixels) scanChannel(pixel);
    for (const VirtualPixel& pixel : virtualPixels) scanChannel(pixel);
    peakActiveValue = peakValue;
    peakActiveIndex = peakIndex;

    wasTouching = touching;
    touching = scan.anyActive;
    wasAboveNoise = aboveNoise;
    aboveNoise = scan.anyAboveNoise;

    if (touching) {
        // `holding` is still the previous frame's decision here.
        activeRegion = holding ? changeActiveRegion(pixels, scan.strongestIndex)
                               : updateActiveRegion(pixels, virtualPixels, timeMs);
    }

    if (aboveNoise && !wasAboveNoise) aboveNoiseStartMs = timeMs;
    if (wasAboveNoise && !aboveNoise) aboveNoiseEndMs = timeMs;
    if (touching && !wasTouching) touchStartMs = timeMs;
    if (wasTouching && !touching) touchEndMs = timeMs;

    updateTouchScore(pixels, virtualPixels, timeMs);
    updateTapRejection(scan.aboveNoiseNeverActive);

    wasHolding = holding;
    wasHoldTimeElapsed = holdTimeElapsed;
    wasHoldSuppressed = holdSuppressed;

    // Hold decision. A granted hold survives a later drop of the score; a suppressed hold
    // turns into a hold once the score reaches the threshold.
    const bool overHoldTime = touching && static_cast<uint32_t>(timeMs - touchStartMs) > holdTimeoutMs;
    if (enableHoldSuppression) {
        const bool scoreTooLow = touchScore < holdScoreThreshold;
        holding = overHoldTime && (wasHolding || !scoreTooLow);
        holdSuppressed = overHoldTime && scoreTooLow && !wasHolding;
        holdTimeElapsed = overHoldTime;
    } else {
        holding = overHoldTime;
    }

    // Tap decision, from the verdict updateTapRejection just gave for this frame.
    const bool touchEnded = !touching && wasTouching;
    tapCandidate = touchEnded && !wasHoldTimeElapsed;
    if (enableTapSuppression) {
        tap = tapCandidate && !tapRejected;
        // The verdict outlives this step only on the frame that ends a tap candidate.
        if (!tapCandidate) tapRejected = false;
    } else {
        tap = tapCandidate;
    }

    if (tap || (wasHolding && !holding)) {
        lastGestureMs = timeMs;
        lastGestureRegion = activeRegion;
    }
}

void HandStats::updateTouchScore(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                                 uint32_t timeMs) {
    svm.updateSVMScore(pixels, virtualPixels, activationThreshold, timeMs);
    if (aboveNoise && !wasAboveNoise && touchScore != 0) decayTouchScore(timeMs);
    touchScore = touchScore + svm.getSVMScore();
    if (touchScore > touchScoreLimit) {
        touchScore = touchScoreLimit;
    } else if (touchScore < -touchScoreLimit) {
        touchScore = -touchScoreLimit;
    }
}

void HandStats::decayTouchScore(uint32_t timeMs) noexcept {
    const double sign = std::signbit(touchScore) ? -1.0 : 1.0;
    // Milliseconds since the last above-noise period ended, less one; an end at this very
    // frame wraps to 2^32 - 1.
    const double elapsed = static_cast<double>(static_cast<uint32_t>(timeMs - aboveNoiseEndMs - 1u));
    const double divisor = static_cast<double>(decayBase - 1.0f);
    double kept = (1.0 - std::exp(elapsed) / divisor) * std::fabs(static_cast<double>(touchScore));
    kept = kept > 0.0 ? kept : 0.0;  // also maps NaN to 0
    touchScore = static_cast<float>(sign * kept);
}

void HandStats::updateTapRejection(const std::vector<Pixel>& pixels,
                                   const std::vector<VirtualPixel>& virtualPixels) noexcept {
    int32_t aboveNoiseNeverActive = 0;
    const auto count = [&](const Pixel& channel) {
        if (channel.everAboveNoise && !channel.everActive) ++aboveNoiseNeverActive;
    };
    for (const Pixel& pixel : pixels) count(pixel);
    for (const VirtualPixel& pixel : virtualPixels) count(pixel);
    updateTapRejection(aboveNoiseNeverActive);
}

void HandStats::updateTapRejection(int32_t aboveNoiseNeverActive) noexcept {
    peakAmplitude = peakActiveValue * activationThreshold;

    // Above-noise time of this touch, counted from the last gesture if that ended later.
    const uint32_t aboveNoiseMs = std::min(static_cast<uint32_t>(touchEndMs - aboveNoiseStartMs),
                                           static_cast<uint32_t>(touchEndMs - lastGestureMs));
    const uint32_t touchMs = touchEndMs - touchStartMs;

    sd = 0;
    tsd = 0;
    timeDurationRatio = 0;
    nonActivePixels = 0;
    if (aboveNoiseMs != 0) {
        sd = peakAmplitude / static_cast<float>(aboveNoiseMs) - 0.51f;
        timeDurationRatio = static_cast<float>(touchMs) / static_cast<float>(aboveNoiseMs) - 0.25f;
    }
    if (touchMs != 0) tsd = peakAmplitude / static_cast<float>(touchMs) - 0.65f;
    nonActivePixels = kNonActivePixelAllowance - aboveNoiseNeverActive;

    tapSVMScore = (static_cast<float>(nonActivePixels) * kTapNonActivePixelsWeight) +
                  (sd * kTapSdWeight + timeDurationRatio * kTapTimeDurationRatioWeight) - kTapScoreOffset;

    tapRejected = tsd <= 0 || sd < 0 || nonActivePixels < 0 || timeDurationRatio < 0 || tapSVMScore < 0;
}

}  // namespace ZeltoTouch

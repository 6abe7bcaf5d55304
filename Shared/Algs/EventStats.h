#pragma once

#include <cstdint>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

struct HandStats;

// Per-frame counters of what the gesture logic dispatched and rejected, split by region.
// They count frames, not gestures: a hold adds to its counters on every frame it lasts.
struct EventStats {
    void Reset() noexcept { *this = EventStats(); }
    void update(const HandStats& handStats) noexcept;
    // {"Dispatched": {12 counters}, "Rejected": {12 counters}}, unsigned 64-bit numbers.
    PropertyValue statsDictionary() const;

    uint64_t numTaps = 0;
    uint64_t numBeginHold = 0;
    uint64_t numIncrementHold = 0;
    uint64_t numEndHold = 0;
    uint64_t numVolumeUp = 0;
    uint64_t numVolumeDown = 0;
    uint64_t numPlayPause = 0;
    uint64_t numOrviCall = 0;
    uint64_t numOrviCallIncrement = 0;
    uint64_t numVolumeIncrement = 0;
    uint64_t numVolumeDecrement = 0;
    uint64_t numRejectedTap = 0;
    uint64_t numRejectedBeginHold = 0;
    uint64_t numRejectedIncrementHold = 0;
    uint64_t numRejectedEndHold = 0;
    uint64_t numRejectedVolumeUp = 0;
    uint64_t numRejectedVolumeDown = 0;
    uint64_t numRejectedPlayPause = 0;
    uint64_t numRejectedOrviCall = 0;
    uint64_t numRejectedOrviCallIncrement = 0;
    uint64_t numRejectedVolumeIncrement = 0;
    uint64_t numRejectedVolumeDecrement = 0;
    uint64_t numSuppressed2Holding = 0;
    uint64_t numHolding2Suppressed = 0;
};

}  // namespace ZeltoTouch

#include "Shared/Algs/EventStats.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {

namespace {

// The counter, if any, that a kind of frame adds to for each region.
struct ByRegion {
    uint64_t EventStats::*playPause = nullptr;
    uint64_t EventStats::*volumeDown = nullptr;
    uint64_t EventStats::*volumeUp = nullptr;
};

void addByRegion(EventStats& stats, PixelRegion region, const ByRegion& counters) noexcept {
    uint64_t EventStats::*counter = nullptr;
    switch (region) {
        case PixelRegion::PlayPause: counter = counters.playPause; break;
        case PixelRegion::VolumeDown: counter = counters.volumeDown; break;
        case PixelRegion::VolumeUp: counter = counters.volumeUp; break;
        case PixelRegion::None: break;
    }
    if (counter != nullptr) ++(stats.*counter);
}

using E = EventStats;
constexpr ByRegion kRejectedIncrementHold{&E::numRejectedOrviCallIncrement, &E::numRejectedVolumeDecrement,
                                          &E::numRejectedVolumeIncrement};
constexpr ByRegion kRejectedBeginHold{&E::numRejectedOrviCall, &E::numRejectedVolumeDecrement,
                                      &E::numRejectedVolumeIncrement};
constexpr ByRegion kRejectedBeforeHoldTime{nullptr, &E::numRejectedVolumeDecrement, &E::numRejectedVolumeIncrement};
constexpr ByRegion kIncrementHold{&E::numOrviCallIncrement, &E::numVolumeDecrement, &E::numVolumeIncrement};
constexpr ByRegion kBeginHold{&E::numOrviCall, &E::numVolumeDecrement, &E::numVolumeIncrement};
constexpr ByRegion kTap{&E::numPlayPause, &E::numVolumeDown, &E::numVolumeUp};
constexpr ByRegion kRejectedTap{&E::numRejectedPlayPause, &E::numRejectedVolumeDown, &E::numRejectedVolumeUp};

using Entry = std::pair<std::string_view, uint64_t EventStats::*>;

constexpr Entry kDispatched[] = {
    {"numTaps", &E::numTaps},
    {"numBeginHold", &E::numBeginHold},
    {"numIncrementHold", &E::numIncrementHold},
    {"numEndHold", &E::numEndHold},
    {"numHolding2Suppressed", &E::numHolding2Suppressed},
    {"numVolumeUp", &E::numVolumeUp},
    {"numVolumeIncrement", &E::numVolumeIncrement},
    {"numVolumeDown", &E::numVolumeDown},
    {"numVolumeDecrement", &E::numVolumeDecrement},
    {"numPlayPause", &E::numPlayPause},
    {"numOrviCall", &E::numOrviCall},
    {"numOrviCallIncrement", &E::numOrviCallIncrement},
};

constexpr Entry kRejected[] = {
    {"numRejectedTap", &E::numRejectedTap},
    {"numRejectedBeginHold", &E::numRejectedBeginHold},
    {"numRejectedIncrementHold", &E::numRejectedIncrementHold},
    {"numRejectedEndHold", &E::numRejectedEndHold},
    {"numSuppressed2Holding", &E::numSuppressed2Holding},
    {"numRejectedVolumeUp", &E::numRejectedVolumeUp},
    {"numRejectedVolumeIncrement", &E::numRejectedVolumeIncrement},
    {"numRejectedVolumeDown", &E::numRejectedVolumeDown},
    {"numRejectedVolumeDecrement", &E::numRejectedVolumeDecrement},
    {"numRejectedPlayPause", &E::numRejectedPlayPause},
    {"numRejectedOrviCall", &E::numRejectedOrviCall},
    {"numRejectedOrviCallIncrement", &E::numRejectedOrviCallIncrement},
};

template <size_t N>
PropertyValue counterDictionary(const EventStats& stats, const Entry (&entries)[N]) {
    std::vector<std::string> keys;
    std::vector<PropertyValue> values;
    for (const auto& [key, counter] : entries) {
        keys.emplace_back(key);
        values.push_back(PropertyValue::fromUInt64(stats.*counter));
    }
    return PropertyValue::dictionary(keys, values);
}

}  // namespace

void EventStats::update(const HandStats& h) noexcept {
    const PixelRegion region = h.activeRegion;
    if (h.touching && !h.wasTouching) return;  // a touch starts: nothing to count yet
    if (h.holdSuppressed) {
        if (h.wasHolding) ++numHolding2Suppressed;
        if (h.holdTimeElapsed && h.wasHoldTimeElapsed) {
            ++numRejectedIncrementHold;
            addByRegion(*this, region, kRejectedIncrementHold);
        } else if (h.holdTimeElapsed) {
            ++numRejectedBeginHold;
            addByRegion(*this, region, kRejectedBeginHold);
        } else {
            addByRegion(*this, region, kRejectedBeforeHoldTime);
        }
        return;
    }
    if (h.holding) {
        if (h.wasHolding) {
            ++numIncrementHold;
            addByRegion(*this, region, kIncrementHold);
        } else {
            if (h.wasHoldSuppressed) ++numSuppressed2Holding;
            ++numBeginHold;
            addByRegion(*this, region, kBeginHold);
        }
        return;
    }
    if (h.wasHolding) {
        ++numEndHold;
        return;
    }
    if (!h.holdTimeElapsed && h.wasHoldTimeElapsed) {
        ++numRejectedEndHold;
        return;
    }
    if (h.tap) {
        ++numTaps;
        addByRegion(*this, region, kTap);
        return;
    }
    if (h.tapCandidate) {
        ++numRejectedTap;
        addByRegion(*this, region, kRejectedTap);
    }
}

PropertyValue EventStats::statsDictionary() const {
    return PropertyValue::dictionary({
        {"Dispatched", counterDictionary(*this, kDispatched)},
        {"Rejected", counterDictionary(*this, kRejected)},
    });
}

}  // namespace ZeltoTouch

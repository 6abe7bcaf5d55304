#include "Shared/Algs/EventStats.h"

#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {
namespace {

using Counts = std::map<std::string, uint64_t>;
using H = HandStats;

// A frame given as the flags that are set, in the given active region.
struct Frame {
    std::vector<bool HandStats::*> flags;
    PixelRegion region;
};

// The non-zero counters after the frames, read through the dictionary form.
Counts countFrames(const std::vector<Frame>& frames) {
    EventStats stats;
    for (const Frame& frame : frames) {
        HandStats hand;
        for (bool HandStats::*flag : frame.flags) hand.*flag = true;
        hand.activeRegion = frame.region;
        stats.update(hand);
    }
    Counts counts;
    const PropertyValue dictionary = stats.statsDictionary();
    for (const char* group : {"Dispatched", "Rejected"}) {
        const PropertyValue counters = dictionary.get(group);
        for (const std::string& key : counters.keys()) {
            if (const uint64_t n = counters.get(key).toUInt64()) counts[key] = n;
        }
    }
    return counts;
}

TEST(EventStatsTest, CountsFramesByRule) {
    constexpr PixelRegion P = PixelRegion::PlayPause, D = PixelRegion::VolumeDown, U = PixelRegion::VolumeUp;
    const std::vector<bool HandStats::*> holdStart{&H::touching, &H::wasTouching, &H::holding};
    const std::vector<bool HandStats::*> holdGoesOn{&H::touching, &H::wasTouching, &H::holding, &H::wasHolding};
    const std::vector<bool HandStats::*> holdEnds{&H::wasTouching, &H::wasHolding};
    const struct {
        const char* name;
        std::vector<Frame> frames;
        Counts expected;
    } cases[] = {
        {"tap in region 3", {{{&H::tap, &H::tapCandidate, &H::wasTouching}, U}}, {{"numTaps", 1}, {"numVolumeUp", 1}}},
        {"touch start counts nothing", {{{&H::touching, &H::holding, &H::tap, &H::holdSuppressed}, U}}, {}},
        {"hold of four frames in region 1",
         {{holdStart, P}, {holdGoesOn, P}, {holdGoesOn, P}, {holdGoesOn, P}, {holdEnds, P}},
         {{"numBeginHold", 1}, {"numOrviCall", 1}, {"numIncrementHold", 3}, {"numOrviCallIncrement", 3},
          {"numEndHold", 1}}},
        {"hold of four frames in region 2", {{holdStart, D}, {holdGoesOn, D}, {holdGoesOn, D}, {holdGoesOn, D}},
         {{"numBeginHold", 1}, {"numIncrementHold", 3}, {"numVolumeDecrement", 4}}},
        {"rejected tap without region", {{{&H::tapCandidate, &H::wasTouching}, PixelRegion::None}},
         {{"numRejectedTap", 1}}},
        {"rejected tap in region 2", {{{&H::tapCandidate, &H::wasTouching}, D}},
         {{"numRejectedTap", 1}, {"numRejectedVolumeDown", 1}}},
        {"suppressed hold turns into a hold",
         {{{&H::touching, &H::wasTouching, &H::holding, &H::wasHoldSuppressed}, U}},
         {{"numSuppressed2Holding", 1}, {"numBeginHold", 1}, {"numVolumeIncrement", 1}}},
        {"suppressed hold begins, goes on, ends",
         {{{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::holdTimeElapsed}, P},
          {{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::holdTimeElapsed, &H::wasHoldTimeElapsed}, D},
          {{&H::wasTouching, &H::wasHoldTimeElapsed}, D}},
         {{"numRejectedBeginHold", 1}, {"numRejectedOrviCall", 1}, {"numRejectedIncrementHold", 1},
          {"numRejectedVolumeDecrement", 1}, {"numRejectedEndHold", 1}}},
        {"hold becomes suppressed", {{{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::wasHolding}, U}},
         {{"numHolding2Suppressed", 1}, {"numRejectedVolumeIncrement", 1}}},
        {"hold end comes before tap", {{{&H::wasHolding, &H::tap}, U}}, {{"numEndHold", 1}}},
    };
    for (const auto& c : cases) EXPECT_EQ(countFrames(c.frames), c.expected) << c.name;
}

TEST(EventStatsTest, DictionaryHasTwelveUnsignedCountersPerGroupAndResetClearsThem) {
    EventStats stats;
    stats.numTaps = 5;
    stats.Reset();
    const PropertyValue dictionary = stats.statsDictionary();
    const std::pair<const char*, std::vector<std::string>> groups[] = {
        {"Dispatched",
         {"numBeginHold", "numEndHold", "numHolding2Suppressed", "numIncrementHold", "numOrviCall",
          "numOrviCallIncrement", "numPlayPause", "numTaps", "numVolumeDecrement", "numVolumeDown",
          "numVolumeIncrement", "numVolumeUp"}},
        {"Rejected",
         {"numRejectedBeginHold", "numRejectedEndHold", "numRejectedIncrementHold", "numRejectedOrviCall",
          "numRejectedOrviCallIncrement", "numRejectedPlayPause", "numRejectedTap", "numRejectedVolumeDecrement",
          "numRejectedVolumeDown", "numRejectedVolumeIncrement", "numRejectedVolumeUp", "numSuppressed2Holding"}},
    };
    EXPECT_EQ(dictionary.keys(), (std::vector<std::string>{"Dispatched", "Rejected"}));
    for (const auto& [group, keys] : groups) {
        const PropertyValue counters = dictionary.get(group);
        EXPECT_EQ(counters.keys(), keys) << group;
        for (const std::string& key : keys) {
            EXPECT_EQ(counters.get(key).numberKind(), PropertyValue::NumberKind::UInt64) << key;
            EXPECT_EQ(counters.get(key).toUInt64(), 0u) << key;
        }
    }
}

}  // namespace
}  // namespace ZeltoTouch

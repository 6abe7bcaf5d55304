#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "Shared/Algs/EventStats.h"
#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {
namespace {

using Counts = std::map<std::string, uint64_t>;

// The non-zero counters, read through the dictionary form.
Counts nonZeroCounters(const EventStats& stats) {
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

// Frames given as the flags that are set; activeRegion as given.
struct Frame {
    std::vector<bool HandStats::*> flags;
    PixelRegion region = PixelRegion::None;
};

Counts countFrames(const std::vector<Frame>& frames) {
    EventStats stats;
    for (const Frame& frame : frames) {
        HandStats hand;
        for (bool HandStats::*flag : frame.flags) hand.*flag = true;
        hand.activeRegion = frame.region;
        stats.update(hand);
    }
    return nonZeroCounters(stats);
}

using H = HandStats;
constexpr PixelRegion kPlayPause = PixelRegion::PlayPause, kDown = PixelRegion::VolumeDown,
                      kUp = PixelRegion::VolumeUp, kNone = PixelRegion::None;

TEST(EventStatsTest, CountsFramesByRule) {
    struct Case {
        const char* name;
        std::vector<Frame> frames;
        Counts expected;
    };
    const Frame holdStart{{&H::touching, &H::wasTouching, &H::holding}, kPlayPause};
    const Frame holdGoesOn{{&H::touching, &H::wasTouching, &H::holding, &H::wasHolding}, kPlayPause};
    const Frame holdEnds{{&H::wasTouching, &H::wasHolding}, kPlayPause};
    const std::vector<Case> cases = {
        {"tap in region 3", {{{&H::tap, &H::tapCandidate, &H::wasTouching}, kUp}}, {{"numTaps", 1}, {"numVolumeUp", 1}}},
        {"touch start counts nothing", {{{&H::touching, &H::holding, &H::tap, &H::holdSuppressed}, kUp}}, {}},
        {"hold of four frames in region 1",
         {holdStart, holdGoesOn, holdGoesOn, holdGoesOn, holdEnds},
         {{"numBeginHold", 1}, {"numOrviCall", 1}, {"numIncrementHold", 3}, {"numOrviCallIncrement", 3},
          {"numEndHold", 1}}},
        {"hold of four frames in region 2",
         {{holdStart.flags, kDown}, {holdGoesOn.flags, kDown}, {holdGoesOn.flags, kDown}, {holdGoesOn.flags, kDown}},
         {{"numBeginHold", 1}, {"numIncrementHold", 3}, {"numVolumeDecrement", 4}}},
        {"rejected tap without region", {{{&H::tapCandidate, &H::wasTouching}, kNone}}, {{"numRejectedTap", 1}}},
        {"rejected tap in region 2", {{{&H::tapCandidate, &H::wasTouching}, kDown}},
         {{"numRejectedTap", 1}, {"numRejectedVolumeDown", 1}}},
        {"suppressed hold turns into a hold",
         {{{&H::touching, &H::wasTouching, &H::holding, &H::wasHoldSuppressed}, kUp}},
         {{"numSuppressed2Holding", 1}, {"numBeginHold", 1}, {"numVolumeIncrement", 1}}},
        {"suppressed hold begins, goes on, ends",
         {{{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::holdTimeElapsed}, kPlayPause},
          {{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::holdTimeElapsed, &H::wasHoldTimeElapsed}, kDown},
          {{&H::wasTouching, &H::wasHoldTimeElapsed}, kDown}},
         {{"numRejectedBeginHold", 1}, {"numRejectedOrviCall", 1}, {"numRejectedIncrementHold", 1},
          {"numRejectedVolumeDecrement", 1}, {"numRejectedEndHold", 1}}},
        {"hold becomes suppressed", {{{&H::touching, &H::wasTouching, &H::holdSuppressed, &H::wasHolding}, kUp}},
         {{"numHolding2Suppressed", 1}, {"numRejectedVolumeIncrement", 1}}},
        {"hold end comes before tap", {{{&H::wasHolding, &H::tap}, kUp}}, {{"numEndHold", 1}}},
    };
    for (const Case& c : cases) EXPECT_EQ(countFrames(c.frames), c.expected) << c.name;
}

TEST(EventStatsTest, DictionaryHasTwelveUnsignedCountersPerGroup) {
    EventStats stats;
    stats.numTaps = 5;
    stats.Reset();
    const PropertyValue dictionary = stats.statsDictionary();
    EXPECT_EQ(dictionary.keys().size(), 2u);
    const std::vector<std::string> dispatched = {
        "numTaps",      "numBeginHold",       "numIncrementHold", "numEndHold",   "numHolding2Suppressed",
        "numVolumeUp",  "numVolumeIncrement", "numVolumeDown",    "numVolumeDecrement", "numPlayPause",
        "numOrviCall",  "numOrviCallIncrement"};
    const std::vector<std::string> rejected = {
        "numRejectedTap",          "numRejectedBeginHold",       "numRejectedIncrementHold",
        "numRejectedEndHold",      "numSuppressed2Holding",      "numRejectedVolumeUp",
        "numRejectedVolumeIncrement", "numRejectedVolumeDown",   "numRejectedVolumeDecrement",
        "numRejectedPlayPause",    "numRejectedOrviCall",        "numRejectedOrviCallIncrement"};
    for (const auto& [group, keys] : {std::pair{"Dispatched", dispatched}, std::pair{"Rejected", rejected}}) {
        const PropertyValue counters = dictionary.get(group);
        EXPECT_EQ(counters.count(), 12u) << group;
        for (const std::string& key : keys) {
            const PropertyValue counter = counters.get(key);
            ASSERT_TRUE(counter.isNumber()) << key;
            EXPECT_EQ(counter.numberKind(), PropertyValue::NumberKind::UInt64) << key;
            EXPECT_EQ(counter.toUInt64(), 0u) << key;
        }
    }
}

}  // namespace
}  // namespace ZeltoTouch

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

constexpr int A = 0, D = 3;

class Frames {
public:
    explicit Frames(Algs& algs) : _algs(algs) {}
    // One frame with A at `raw` (and D at `rawD`); returns its touch state description.
    std::string frame(uint32_t timeMs, int16_t raw, int16_t rawD = 0) {
        _values = {};
        _values[A] = raw;
        _values[D] = rawD;
        InputReport::Image image;
        image.timestampMs = timeMs;
        image.signedPixels = _values;
        _algs.handleImage(image);
        _timeMs = timeMs;
        return touchState();
    }
    // Frames every 10 ms from fromMs to before toMs.
    std::string contact(int16_t raw, uint32_t fromMs, uint32_t toMs) {
        for (uint32_t t = fromMs; t < toMs; t += 10) frame(t, raw);
        return touchState();
    }
    std::string touchState() const { return _algs.touchStateDescription(_values, _timeMs); }
    std::string virtualState() const { return _algs.virtualStateDescription(_values, _timeMs); }

private:
    Algs& _algs;
    PixelValues _values{};
    uint32_t _timeMs = 0;
};

TEST(AlgsDescriptionTest, IdleTouchStateInFull) {
    Algs algs;
    Frames frames(algs);
    std::string pixels;
    for (char letter = 'A'; letter <= 'O'; ++letter) {
        pixels += std::string(letter == 'A' ? "" : ", ") + letter + "=   0    0";
    }
    EXPECT_EQ(frames.frame(0, 0),
              "ts=0.000000, sd=0.000000, tsd=0.000000, NonActivePixels=21, TimeDurationRatio=0.000000, "
              "TapSVMScore=1.549000, [" + pixels + "] ");
}

TEST(AlgsDescriptionTest, PixelColumns) {
    Algs algs;
    Frames frames(algs);
    EXPECT_THAT(frames.frame(0, 0, -5), HasSubstr(", D=  -5   -9, E="));
    EXPECT_THAT(frames.frame(10, 300), HasSubstr("[A= 300  576<==ON, B=   0    0, "));
    EXPECT_THAT(frames.virtualState(), StartsWith("ts="));
    EXPECT_THAT(frames.virtualState(), HasSubstr(", TapSVMScore="));
    EXPECT_THAT(frames.virtualState(), HasSubstr("[ABE= 384<==ON, ABF= 255<==ON, ADEF= 384<==ON, AEGJ= 329<==ON, BCEF=   0, "));
    EXPECT_THAT(frames.virtualState(), HasSubstr(", MNO=   0] STARTTOUCH 0ms ActiveRegion=1"));
}

TEST(AlgsDescriptionTest, StateLabels) {
    struct Case {
        const char* expected;
        std::function<std::string(Frames&, Algs&)> run;
    };
    const auto noHoldSuppression = [](Algs& algs) {
        algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    };
    const Case cases[] = {
        {"] ", [](Frames& f, Algs&) { return f.frame(0, 0); }},
        {"] STARTTOUCH 0ms ActiveRegion=1", [](Frames& f, Algs&) { return f.frame(1000, 300); }},
        {"] TOUCHING 40ms ActiveRegion=1", [](Frames& f, Algs&) { f.frame(1000, 300); return f.frame(1040, 300); }},
        // A clock stepping back reads, modulo 2^32, as a very long touch.
        {"] STARTHOLD -10ms ActiveRegion=1", [](Frames& f, Algs&) { f.frame(1000, 300); return f.frame(990, 300); }},
        {"] TAP 180ms ActiveRegion=1 ABOVENOISE",
         [](Frames& f, Algs&) { f.contact(300, 1000, 1180); return f.frame(1180, 60); }},
        {"] SUPPRESSTAP 400ms ActiveRegion=1 BELOWNOISE",
         [](Frames& f, Algs&) { f.contact(110, 1000, 1400); return f.frame(1400, 0); }},
        {"] SUPPRESSHOLD 510ms ActiveRegion=1", [](Frames& f, Algs&) { return f.contact(110, 1000, 1520); }},
        {"] ENDTOUCH 600ms ActiveRegion=1 BELOWNOISE",
         [](Frames& f, Algs&) { f.contact(110, 1000, 1600); return f.frame(1600, 0); }},
        {"] STARTHOLD 510ms ActiveRegion=1",
         [=](Frames& f, Algs& a) { noHoldSuppression(a); return f.contact(300, 1000, 1520); }},
        {"] HOLDING 520ms ActiveRegion=1",
         [=](Frames& f, Algs& a) { noHoldSuppression(a); return f.contact(300, 1000, 1530); }},
        {"] ENDHOLD 800ms ActiveRegion=1 BELOWNOISE",
         [=](Frames& f, Algs& a) { noHoldSuppression(a); f.contact(300, 1000, 1800); return f.frame(1800, 0); }},
    };
    for (const Case& c : cases) {
        Algs algs;
        Frames frames(algs);
        EXPECT_THAT(c.run(frames, algs), EndsWith(c.expected));
    }
}

// Counts what reaches the log; optionally switches debug logging off after some lines.
class CountingSink : public LogSink {
public:
    explicit CountingSink(bool enabled, int disableAfter = -1) : _enabled(enabled), _disableAfter(disableAfter) {}
    bool isEnabled(std::string_view, LogLevel level) const noexcept override {
        return _enabled && level == LogLevel::Debug;
    }
    void write(std::string_view category, LogLevel, std::string_view message) override {
        categories.emplace_back(category);
        lines.emplace_back(message);
        if (static_cast<int>(lines.size()) == _disableAfter) _enabled = false;
    }

    std::vector<std::string> categories;
    std::vector<std::string> lines;

private:
    bool _enabled;
    int _disableAfter;
};

class AlgsLogTest : public testing::Test {
protected:
    void TearDown() override { Log::setSink(nullptr); }

    static void runFrames(Algs& algs, int count) {
        for (int i = 0; i < count; ++i) {
            InputReport::Image image;
            image.frameNumber = 7 + i;
            image.timestampMs = 1000 + 10 * i;
            image.signedPixels[A] = 300;
            algs.handleImage(image);
        }
    }
};

TEST_F(AlgsLogTest, NothingWhenDebugLoggingIsOff) {
    CountingSink sink(false);
    Log::setSink(&sink);
    Algs algs;
    runFrames(algs, 3);
    EXPECT_TRUE(sink.lines.empty());
}

TEST_F(AlgsLogTest, ThreeLinesPerFrameWhenOn) {
    CountingSink sink(true);
    Log::setSink(&sink);
    Algs algs;
    runFrames(algs, 2);
    ASSERT_EQ(sink.lines.size(), 6u);
    EXPECT_THAT(sink.lines[0], StartsWith("Frame 7 @1000ms, *** Event Stats ***\n"));
    EXPECT_THAT(sink.lines[0], HasSubstr("numTaps"));
    EXPECT_THAT(sink.lines[1], StartsWith("Frame 7 @1000ms, *** Touch State Description ***\nts="));
    EXPECT_THAT(sink.lines[1], EndsWith("] STARTTOUCH 0ms ActiveRegion=1"));
    EXPECT_THAT(sink.lines[2], StartsWith("Frame 7 @1000ms, *** Virtual State Description ***\nts="));
    EXPECT_THAT(sink.lines[5], StartsWith("Frame 8 @1010ms, *** Virtual State Description ***\n"));
    EXPECT_EQ(sink.categories, std::vector<std::string>(6, "Algs"));
}

TEST_F(AlgsLogTest, EachLineRechecksTheLevel) {
    CountingSink sink(true, 1);
    Log::setSink(&sink);
    Algs algs;
    runFrames(algs, 2);
    EXPECT_EQ(sink.lines.size(), 1u);
}

}  // namespace
}  // namespace ZeltoTouch

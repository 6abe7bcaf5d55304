#include "Platform/GestureScript.h"

#include <array>
#include <charconv>
#include <limits>
#include <stdexcept>

namespace ZeltoTouch::Platform {

namespace {

using Kind = GestureStep::Kind;

// The shape of each step line: its regions, whether it takes a duration, and its usage text.
struct StepSyntax {
    Kind kind;
    std::string_view keyword;
    int regionCount;
    bool takesDuration;
    bool takesResetAfter;
    std::string_view usage;
};

constexpr std::array<StepSyntax, 7> kStepSyntax = {{
    {Kind::Tap, "tap", 1, true, false, "tap REGION DURATION"},
    {Kind::Hold, "hold", 1, true, true, "hold REGION DURATION [reset-after TIME]"},
    {Kind::Slide, "slide", 2, true, false, "slide FROM TO DURATION"},
    {Kind::Brush, "brush", 1, true, false, "brush REGION DURATION"},
    {Kind::Palm, "palm", 0, true, false, "palm DURATION"},
    {Kind::Idle, "idle", 0, true, false, "idle DURATION"},
    {Kind::Reset, "reset", 0, false, false, "reset"},
}};

constexpr std::array<PixelRegion, 3> kScriptRegions = {PixelRegion::PlayPause, PixelRegion::VolumeUp,
                                                       PixelRegion::VolumeDown};

constexpr std::string_view kResetAfter = "reset-after";

[[noreturn]] void fail(int line, const std::string& message) {
    throw std::invalid_argument("line " + std::to_string(line) + ": " + message);
}

std::string quoted(std::string_view text) { return "\"" + std::string(text) + "\""; }

const StepSyntax& syntaxOf(std::string_view keyword, int line) {
    for (const StepSyntax& syntax : kStepSyntax) {
        if (syntax.keyword == keyword) return syntax;
    }
    fail(line, "unknown step " + quoted(keyword) + " (expected tap, hold, slide, brush, palm, idle or reset)");
}

PixelRegion parseRegion(std::string_view word, int line) {
    for (PixelRegion region : kScriptRegions) {
        if (regionScriptName(region) == word) return region;
    }
    fail(line, "unknown region " + quoted(word) + " (expected play-pause, volume-up or volume-down)");
}

uint32_t parseDuration(std::string_view word, int line) {
    const auto badDuration = [&]() {
        fail(line, "bad duration " + quoted(word) + " (expected a positive whole number with ms or s, e.g. 120ms or 2s)");
    };
    uint64_t number = 0;
    const auto [end, error] = std::from_chars(word.data(), word.data() + word.size(), number);
    if (error != std::errc() || end == word.data()) badDuration();
    const std::string_view unit(end, static_cast<size_t>(word.data() + word.size() - end));
    uint64_t scale = 0;
    if (unit == "ms") scale = 1;
    if (unit == "s") scale = 1000;
    if (scale == 0 || number == 0 || number > std::numeric_limits<uint32_t>::max() / scale) badDuration();
    return static_cast<uint32_t>(number * scale);
}

std::vector<std::string_view> splitWords(std::string_view line) {
    std::vector<std::string_view> words;
    size_t position = 0;
    while (position < line.size()) {
        const size_t start = line.find_first_not_of(" \t\r", position);
        if (start == std::string_view::npos) break;
        const size_t end = line.find_first_of(" \t\r", start);
        words.push_back(line.substr(start, end == std::string_view::npos ? std::string_view::npos : end - start));
        position = end == std::string_view::npos ? line.size() : end;
    }
    return words;
}

}  // namespace

uint32_t GestureScript::durationMs() const noexcept {
    uint64_t total = 0;
    for (const GestureStep& step : steps) total += step.durationMs;
    return total > std::numeric_limits<uint32_t>::max() ? std::numeric_limits<uint32_t>::max()
                                                        : static_cast<uint32_t>(total);
}

std::string_view gestureStepKeyword(GestureStep::Kind kind) noexcept {
    for (const StepSyntax& syntax : kStepSyntax) {
        if (syntax.kind == kind) return syntax.keyword;
    }
    return {};
}

std::string_view regionScriptName(PixelRegion region) noexcept {
    switch (region) {
        case PixelRegion::PlayPause: return "play-pause";
        case PixelRegion::VolumeUp: return "volume-up";
        case PixelRegion::VolumeDown: return "volume-down";
        case PixelRegion::None: break;
    }
    return "none";
}

GestureScript GestureScriptParser::parse(std::string_view text) {
    GestureScript script;
    int lineNumber = 0;
    while (!text.empty()) {
        ++lineNumber;
        const size_t lineEnd = text.find('\n');
        std::string_view line = text.substr(0, lineEnd);
        text.remove_prefix(lineEnd == std::string_view::npos ? text.size() : lineEnd + 1);
        line = line.substr(0, line.find('#'));
        const std::vector<std::string_view> words = splitWords(line);
        if (!words.empty()) script.steps.push_back(parseLine(words, lineNumber));
    }
    return script;
}

GestureStep GestureScriptParser::parseLine(const std::vector<std::string_view>& words, int line) {
    const StepSyntax& syntax = syntaxOf(words[0], line);
    const size_t plainCount = 1 + static_cast<size_t>(syntax.regionCount) + (syntax.takesDuration ? 1 : 0);
    const bool hasResetAfter = syntax.takesResetAfter && words.size() == plainCount + 2 && words[plainCount] == kResetAfter;
    if (words.size() != plainCount && !hasResetAfter) {
        fail(line, "wrong arguments for " + std::string(syntax.keyword) + " (expected " + quoted(syntax.usage) + ")");
    }

    GestureStep step;
    step.kind = syntax.kind;
    step.line = line;
    if (syntax.regionCount >= 1) step.region = parseRegion(words[1], line);
    if (syntax.regionCount == 2) {
        step.toRegion = parseRegion(words[2], line);
        if (step.toRegion == step.region) fail(line, "slide needs two different regions");
    }
    if (syntax.takesDuration) step.durationMs = parseDuration(words[plainCount - 1], line);
    if (hasResetAfter) {
        step.resetAfterMs = parseDuration(words[plainCount + 1], line);
        if (*step.resetAfterMs >= step.durationMs) {
            fail(line, "reset-after " + std::string(words[plainCount + 1]) + " is not within the hold of " +
                           std::string(words[plainCount - 1]));
        }
    }
    return step;
}

}  // namespace ZeltoTouch::Platform

// Arbitrary text into the recording container reader. It either yields a recording, which must
// write back into a container that reads as the same frames, or raises one of its documented
// errors; any other outcome (another exception, another message, a crash) is a finding.
// The reader takes the containers our writer produces straight from the text and everything
// else through the parsed tree; the two ways must agree, so the same JSON with its keys sorted
// (which puts "Frames" before "Version" and so can only go the tree's way) must read the same.

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>

#include "Shared/Recording/PipelineRecording.h"

using namespace ZeltoTouch;

namespace {

// Every message the reader and its migration may raise ("invalid container version: " takes a
// number after it).
constexpr std::array<std::string_view, 10> kMigrationMessages = {
    "invalid container",     "invalid version",       "frame lacks Timestamp", "frame lacks ReportData",
    "frame lacks Type",      "frame Type isn't a string", "frame lacks Report", "Reports isn't an array",
    "Frames isn't an array", "frame isn't an object",
};
constexpr std::array<std::string_view, 11> kReaderMessages = {
    "json not supplied",          "invalid frames",       "invalid frame",      "invalid frame type",
    "invalid frame timestamp",    "invalid state key",    "invalid state value class",
    "invalid report",             "invalid hex string",   "invalid metadata key",
    "invalid metadata value class",
};
constexpr std::string_view kVersionMessage = "invalid container version: ";
constexpr std::string_view kMigrationFailed = "migrateSerializedContainer failed: ";

[[noreturn]] void fail(const char* what, std::string_view detail = {}) {
    fprintf(stderr, "invariant broken: %s %.*s\n", what, static_cast<int>(detail.size()), detail.data());
    abort();
}

bool isDecimal(std::string_view text) {
    return !text.empty() && text.find_first_not_of("0123456789") == std::string_view::npos;
}

bool isMigrationMessage(std::string_view message) {
    for (std::string_view known : kMigrationMessages) {
        if (message == known) return true;
    }
    return message.starts_with(kVersionMessage) && isDecimal(message.substr(kVersionMessage.size()));
}

bool isReaderMessage(std::string_view message) {
    for (std::string_view known : kReaderMessages) {
        if (message == known) return true;
    }
    return false;
}

bool sameFrames(const PipelineRecording::FrameList& a, const PipelineRecording::FrameList& b) {
    if (a.size() != b.size()) return false;
    for (auto x = a.begin(), y = b.begin(); x != a.end(); ++x, ++y) {
        if (x->type != y->type || x->timestamp != y->timestamp || x->key != y->key || !(x->value == y->value) ||
            !(x->data == y->data)) {
            return false;
        }
    }
    return true;
}

// What reading a container gave: its frames, or the message of the error it raised.
struct Outcome {
    std::optional<PipelineRecording> recording;
    std::string error;
};

Outcome read(const PropertyValue& text) {
    try {
        return {PipelineRecording(text), {}};
    } catch (const std::invalid_argument& error) {
        if (!isReaderMessage(error.what())) fail("undocumented invalid-argument error:", error.what());
        return {std::nullopt, error.what()};
    } catch (const std::runtime_error& error) {
        const std::string_view message = error.what();
        if (!message.starts_with(kMigrationFailed) || !isMigrationMessage(message.substr(kMigrationFailed.size()))) {
            fail("undocumented runtime error:", message);
        }
        return {std::nullopt, error.what()};
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const PropertyValue text = PropertyValue::data(std::span(data, size));
    Outcome outcome = read(text);
    if (const PropertyValue tree = PropertyValue::fromJSON(text)) {
        const Outcome sorted = read(tree.toJSON());
        if (sorted.error != outcome.error) fail("the sorted container reads differently:", sorted.error);
        if (sorted.recording && !sameFrames(sorted.recording->frames(), outcome.recording->frames())) {
            fail("the sorted container reads as other frames");
        }
    }
    if (outcome.recording) {
        // The writer sorts; what it writes must read back as the sorted frames, unchanged.
        const PropertyValue written = outcome.recording->json();
        if (!written) fail("a recording read from JSON could not be written back");
        if (!sameFrames(PipelineRecording(written).frames(), outcome.recording->frames())) fail("write and read disagree");
    }
    return 0;
}

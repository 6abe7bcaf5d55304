#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/PipelineInput.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Hex.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"

namespace ZeltoTouch::RecordingTest {

using Frame = PipelineRecording::Frame;
using Type = Frame::Type;
using Bytes = std::vector<uint8_t>;

// A clock whose time the test sets and whose sleeps are only written down. Its timebase of
// 125/3 makes every conversion visible.
class FakeClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {125, 3}; }
    uint64_t machTimeNow() const noexcept override { return now; }
    void sleepMicroseconds(uint64_t microseconds) const noexcept override { sleeps.push_back(microseconds); }

    uint64_t now = 0;
    mutable std::vector<uint64_t> sleeps;
};

// Installed before any test runs, so the process-wide timebase is the fake's.
inline FakeClock& fakeClock() {
    static FakeClock clock;
    return clock;
}
inline const bool kFakeClockInstalled = [] {
    Util::setHostClock(&fakeClock());
    return Util::nanosecondsFromMachTime(3) == 125;
}();

// A call or frame as one line: "State 30 Key=value", "InputReport 60 01 02 ", "Metadata 90 Key=value".
inline std::string describe(Type type, uint64_t timestamp, const std::string& key, const PropertyValue& value,
                            std::span<const uint8_t> bytes) {
    if (type == Type::InputReport) {
        std::string text = "InputReport " + std::to_string(timestamp) + " ";
        Util::appendHexText(text, bytes);
        return text;
    }
    return (type == Type::State ? "State " : "Metadata ") + std::to_string(timestamp) + " " + key + "=" +
           value.description();
}

inline std::vector<std::string> describe(const PipelineRecording::FrameList& frames) {
    std::vector<std::string> lines;
    for (const Frame& f : frames) lines.push_back(describe(f.type, f.timestamp, f.key, f.value, f.data.span()));
    return lines;
}

// A downstream stage that writes down every call it receives.
class CallLog final : public PipelineInput {
public:
    void setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override {
        calls.push_back(describe(Type::State, timestampMach, key, value, {}));
    }
    void handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) override {
        calls.push_back(describe(Type::InputReport, timestampMach, {}, {}, {bytes, length}));
    }
    void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override {
        calls.push_back(describe(Type::Metadata, timestampMach, key, value, {}));
    }

    std::vector<std::string> calls;
};

// What `f` throws as an E, or "(no error)".
template <typename E, typename F>
std::string messageOf(F f) {
    try {
        f();
    } catch (const E& error) {
        return error.what();
    }
    return "(no error)";
}

inline Frame stateFrame(uint64_t timestamp, std::string key, PropertyValue value) {
    return {Type::State, timestamp, std::move(key), std::move(value), {}};
}
inline Frame metadataFrame(uint64_t timestamp, std::string key, PropertyValue value) {
    return {Type::Metadata, timestamp, std::move(key), std::move(value), {}};
}
inline Frame reportFrame(uint64_t timestamp, const Bytes& bytes) {
    return {Type::InputReport, timestamp, {}, {}, ReportBytes(bytes)};
}

}  // namespace ZeltoTouch::RecordingTest

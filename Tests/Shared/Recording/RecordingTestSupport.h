#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/PipelineInput.h"
#include "Shared/Recording/PipelineRecording.h"
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

// A downstream stage that writes down every call it receives.
class CallLog final : public PipelineInput {
public:
    struct Call {
        Type type;
        uint64_t timestampMach;
        std::string key;
        PropertyValue value;
        Bytes bytes;
        bool operator==(const Call&) const = default;
    };

    void setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override {
        calls.push_back({Type::State, timestampMach, key, value, {}});
    }
    void handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) override {
        calls.push_back({Type::InputReport, timestampMach, {}, {}, Bytes(bytes, bytes + length)});
    }
    void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override {
        calls.push_back({Type::Metadata, timestampMach, key, value, {}});
    }

    std::vector<Call> calls;
};

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

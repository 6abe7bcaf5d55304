#include "Tools/EventLines.h"

#include <array>
#include <cstdio>
#include <optional>

#include "Tools/RegionNames.h"

namespace ZeltoTouch::Tools {
namespace {

constexpr uint32_t kEventMaskHold = 2;
constexpr uint32_t kEventMaskTap = 0x20000;
constexpr uint16_t kFirmwareResetUsagePage = 0xFF60;
constexpr uint16_t kFirmwareResetUsage = 2;

// Digitizer events by phase and, where it matters, event mask; the first match decides.
struct DigitizerKind {
    std::string_view kind;
    uint32_t phase;
    std::optional<uint32_t> eventMask;
};
constexpr std::array<DigitizerKind, 6> kDigitizerKinds = {{
    {"may-begin", kHIDEventPhaseMayBegin, std::nullopt},
    {"hold-start", kHIDEventPhaseBegan, kEventMaskHold},
    {"hold-change", kHIDEventPhaseChanged, kEventMaskHold},
    {"hold-end", kHIDEventPhaseEnded, kEventMaskHold},
    {"tap", kHIDEventPhaseUndefined, kEventMaskTap},
    {"cancel", kHIDEventPhaseCancelled, std::nullopt},
}};

bool isDigitizer(const HIDEvent& event) { return event.type() == kHIDEventTypeDigitizer; }
bool isVendorDefined(const HIDEvent& event) { return event.type() == kHIDEventTypeVendorDefined; }

int64_t regionOf(const HIDEvent& event) { return static_cast<int64_t>(event.y()); }
int64_t frameNumberOf(const HIDEvent& event) {
    return event.integerValue(kHIDEventFieldDigitizerFrameNumber);
}

}  // namespace

std::string_view eventKind(const HIDEvent& event) {
    if (isDigitizer(event)) {
        for (const DigitizerKind& entry : kDigitizerKinds) {
            if (event.phase() == entry.phase && (!entry.eventMask || event.eventMask() == *entry.eventMask)) {
                return entry.kind;
            }
        }
        return "digitizer";
    }
    if (isVendorDefined(event)) {
        const bool reset = event.usagePage() == kFirmwareResetUsagePage && event.usage() == kFirmwareResetUsage;
        return reset ? "firmware-reset" : "vendor-defined";
    }
    return "other";
}

std::string eventJSONLine(const HIDEvent& event, uint64_t timestampNs) {
    const std::string_view kind = eventKind(event);
    char line[256];
    if (isDigitizer(event)) {
        std::snprintf(line, sizeof line,
                      "{\"event\": \"%.*s\", \"region\": %lld, \"phase\": %u, \"eventMask\": %u, "
                      "\"frameNumber\": %lld, \"t\": %llu}",
                      static_cast<int>(kind.size()), kind.data(), static_cast<long long>(regionOf(event)),
                      event.phase(), event.eventMask(), static_cast<long long>(frameNumberOf(event)),
                      static_cast<unsigned long long>(timestampNs));
    } else if (isVendorDefined(event)) {
        std::snprintf(line, sizeof line, "{\"event\": \"%.*s\", \"usagePage\": %u, \"usage\": %u, \"t\": %llu}",
                      static_cast<int>(kind.size()), kind.data(), static_cast<unsigned>(event.usagePage()),
                      static_cast<unsigned>(event.usage()), static_cast<unsigned long long>(timestampNs));
    } else {
        std::snprintf(line, sizeof line, "{\"event\": \"%.*s\", \"type\": %u, \"t\": %llu}",
                      static_cast<int>(kind.size()), kind.data(), event.type(),
                      static_cast<unsigned long long>(timestampNs));
    }
    return line;
}

std::string eventTextLine(const HIDEvent& event, uint64_t timeNs) {
    const std::string_view kind = eventKind(event);
    char line[256];
    const double seconds = static_cast<double>(timeNs) / 1e9;
    if (isDigitizer(event)) {
        std::snprintf(line, sizeof line, "%10.3f s  %-12.*s %-12s  frame %lld", seconds,
                      static_cast<int>(kind.size()), kind.data(), regionName(regionOf(event)).c_str(),
                      static_cast<long long>(frameNumberOf(event)));
    } else {
        std::snprintf(line, sizeof line, "%10.3f s  %.*s", seconds, static_cast<int>(kind.size()), kind.data());
    }
    return line;
}

}  // namespace ZeltoTouch::Tools

#include "Tools/RecordingSummary.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/JSONWriter.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch::Tools {
namespace {

// Lists longer than this are cut short in the text form; the JSON form has everything.
constexpr size_t kTextListLimit = 20;

void appendLine(std::string& text, const char* format, ...) __attribute__((format(printf, 2, 3)));
void appendLine(std::string& text, const char* format, ...) {
    char line[512];
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(line, sizeof line, format, arguments);
    va_end(arguments);
    text += line;
    text += '\n';
}

const char* plural(uint64_t count, const char* singular, const char* pluralForm) {
    return count == 1 ? singular : pluralForm;
}

std::string valueText(const PropertyValue& value) {
    if (!value) return "(no value)";
    std::string json;
    return value.toJSON(json) ? json : value.description();
}

// A container only holds JSON values; anything else shows as its description.
void writeValue(rapidjson::Writer<rapidjson::StringBuffer>& writer, const PropertyValue& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> valueWriter(buffer);
    if (writeJSON(valueWriter, value)) {
        writer.RawValue(buffer.GetString(), buffer.GetSize(), rapidjson::kObjectType);
    } else {
        const std::string description = value.description();
        writer.String(description.c_str(), static_cast<rapidjson::SizeType>(description.size()));
    }
}

}  // namespace

RecordingSummary::RecordingSummary(uint64_t containerVersion) : _containerVersion(containerVersion) {}

RecordingSummary RecordingSummary::of(const PipelineRecording::FrameList& frames, uint64_t containerVersion) {
    std::vector<const PipelineRecording::Frame*> ordered;
    ordered.reserve(frames.size());
    for (const PipelineRecording::Frame& frame : frames) ordered.push_back(&frame);
    std::stable_sort(ordered.begin(), ordered.end(),
                     [](const auto* a, const auto* b) { return a->timestamp < b->timestamp; });

    RecordingSummary summary(containerVersion);
    for (const PipelineRecording::Frame* frame : ordered) summary.add(*frame);
    return summary;
}

void RecordingSummary::add(const PipelineRecording::Frame& frame) {
    if (!_firstTimestampNs) _firstTimestampNs = frame.timestamp;
    _lastTimestampNs = std::max(_lastTimestampNs, frame.timestamp);
    switch (frame.type) {
        case PipelineRecording::Frame::Type::State:
            ++_stateFrames;
            _stateWrites.push_back({frame.timestamp, frame.key, frame.value});
            break;
        case PipelineRecording::Frame::Type::InputReport:
            addInputReport(frame);
            break;
        case PipelineRecording::Frame::Type::Metadata:
            ++_metadataFrames;
            ++_metadataKeys[frame.key];
            break;
    }
}

// The same reading of the report, and the same gap rule, as the pipeline's.
void RecordingSummary::addInputReport(const PipelineRecording::Frame& frame) {
    ++_inputReportFrames;
    if (const auto event = InputReport::FirmwareEvent::parse(frame.data.data(), frame.data.size())) {
        ++_firmwareEventFrames;
        _firmwareEvents.push_back({frame.timestamp, event->event});
        return;
    }
    const auto image = InputReport::Image::parse(frame.data.data(), frame.data.size());
    if (!image) return;
    ++_imageFrames;
    if (!_firstFrameNumber) {
        _firstFrameNumber = image->frameNumber;
    } else if (image->frameNumber != static_cast<uint32_t>(_lastFrameNumber + 1)) {
        _gaps.push_back({frame.timestamp, _lastFrameNumber, image->frameNumber});
    }
    _lastFrameNumber = image->frameNumber;
}

uint64_t RecordingSummary::resetCount() const noexcept {
    return static_cast<uint64_t>(std::count_if(_firmwareEvents.begin(), _firmwareEvents.end(), [](const auto& e) {
        return e.event == InputReport::FirmwareEvent::kReset;
    }));
}

std::string RecordingSummary::text() const {
    const auto seconds = [this](uint64_t timestampNs) {
        return static_cast<double>(timestampNs - _firstTimestampNs.value_or(0)) / 1e9;
    };
    const auto more = [](std::string& text, size_t count) {
        if (count > kTextListLimit) appendLine(text, "  ... and %zu more (--format json lists all)", count - kTextListLimit);
    };
    std::string text;
    appendLine(text, "Container version: %llu", static_cast<unsigned long long>(_containerVersion));
    appendLine(text, "Frames: %llu", static_cast<unsigned long long>(frameCount()));
    appendLine(text, "  state:        %llu", static_cast<unsigned long long>(_stateFrames));
    appendLine(text, "  input report: %llu (%llu %s, %llu firmware %s, %llu other)",
               static_cast<unsigned long long>(_inputReportFrames), static_cast<unsigned long long>(_imageFrames),
               plural(_imageFrames, "image", "images"), static_cast<unsigned long long>(_firmwareEventFrames),
               plural(_firmwareEventFrames, "event", "events"),
               static_cast<unsigned long long>(_inputReportFrames - _imageFrames - _firmwareEventFrames));
    std::string keys;
    for (const auto& [key, count] : _metadataKeys) {
        keys += (keys.empty() ? " (" : ", ") + key + " " + std::to_string(count);
    }
    appendLine(text, "  metadata:     %llu%s%s", static_cast<unsigned long long>(_metadataFrames), keys.c_str(),
               keys.empty() ? "" : ")");
    if (_firstTimestampNs) {
        appendLine(text, "Time span: %.3f s (timestamps %llu to %llu ns)", static_cast<double>(durationNs()) / 1e9,
                   static_cast<unsigned long long>(*_firstTimestampNs),
                   static_cast<unsigned long long>(_lastTimestampNs));
    } else {
        appendLine(text, "Time span: none (no frames)");
    }
    if (_firstFrameNumber) {
        appendLine(text, "Image frame numbers: first %u, last %u, %zu %s", *_firstFrameNumber, _lastFrameNumber, _gaps.size(),
                   plural(_gaps.size(), "gap", "gaps"));
    } else {
        appendLine(text, "Image frame numbers: none (no images)");
    }
    for (size_t i = 0; i < std::min(_gaps.size(), kTextListLimit); ++i) {
        appendLine(text, "  at %.3f s: frame %u after frame %u", seconds(_gaps[i].timestampNs), _gaps[i].frameNumber,
                   _gaps[i].previousFrameNumber);
    }
    more(text, _gaps.size());

    std::map<std::string, std::pair<uint64_t, const PropertyValue*>> writesByKey;  // count, last value
    for (const StateWrite& write : _stateWrites) {
        auto& [count, last] = writesByKey[write.key];
        ++count;
        last = &write.value;
    }
    appendLine(text, "State keys written: %zu", writesByKey.size());
    for (const auto& [key, entry] : writesByKey) {
        appendLine(text, "  %s: %llu %s, last %s", key.c_str(), static_cast<unsigned long long>(entry.first),
                   plural(entry.first, "write", "writes"), valueText(*entry.second).c_str());
    }
    appendLine(text, "Firmware events: %zu (%llu %s)", _firmwareEvents.size(),
               static_cast<unsigned long long>(resetCount()), plural(resetCount(), "reset", "resets"));
    for (size_t i = 0; i < std::min(_firmwareEvents.size(), kTextListLimit); ++i) {
        const FirmwareEvent& event = _firmwareEvents[i];
        appendLine(text, "  at %.3f s: event %u%s", seconds(event.timestampNs), event.event,
                   event.event == InputReport::FirmwareEvent::kReset ? " (reset)" : "");
    }
    more(text, _firmwareEvents.size());
    return text;
}

std::string RecordingSummary::json() const {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    const auto number = [&writer](const char* key, uint64_t value) {
        writer.Key(key);
        writer.Uint64(value);
    };
    writer.StartObject();
    number("containerVersion", _containerVersion);
    number("frames", frameCount());
    number("stateFrames", _stateFrames);
    number("inputReportFrames", _inputReportFrames);
    number("imageFrames", _imageFrames);
    number("firmwareEventFrames", _firmwareEventFrames);
    number("otherReportFrames", _inputReportFrames - _imageFrames - _firmwareEventFrames);
    number("metadataFrames", _metadataFrames);
    writer.Key("metadataKeys");
    writer.StartObject();
    for (const auto& [key, count] : _metadataKeys) number(key.c_str(), count);
    writer.EndObject();
    number("firstTimestampNs", _firstTimestampNs.value_or(0));
    number("lastTimestampNs", _lastTimestampNs);
    number("durationNs", durationNs());
    if (_firstFrameNumber) {
        number("firstFrameNumber", *_firstFrameNumber);
        number("lastFrameNumber", _lastFrameNumber);
    }
    writer.Key("gaps");
    writer.StartArray();
    for (const Gap& gap : _gaps) {
        writer.StartObject();
        number("t", gap.timestampNs);
        number("previousFrameNumber", gap.previousFrameNumber);
        number("frameNumber", gap.frameNumber);
        writer.EndObject();
    }
    writer.EndArray();
    writer.Key("stateWrites");
    writer.StartArray();
    for (const StateWrite& write : _stateWrites) {
        writer.StartObject();
        number("t", write.timestampNs);
        writer.Key("key");
        writer.String(write.key.c_str(), static_cast<rapidjson::SizeType>(write.key.size()));
        if (write.value) {  // a write without a value has no "value"
            writer.Key("value");
            writeValue(writer, write.value);
        }
        writer.EndObject();
    }
    writer.EndArray();
    writer.Key("firmwareEvents");
    writer.StartArray();
    for (const FirmwareEvent& event : _firmwareEvents) {
        writer.StartObject();
        number("t", event.timestampNs);
        number("event", event.event);
        writer.EndObject();
    }
    writer.EndArray();
    number("resets", resetCount());
    writer.EndObject();
    return {buffer.GetString(), buffer.GetSize()};
}

}  // namespace ZeltoTouch::Tools

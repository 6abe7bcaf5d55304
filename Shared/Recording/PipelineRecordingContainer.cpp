#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/JSONWriter.h"
#include "Host/UTF8.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Hex.h"

namespace ZeltoTouch {

namespace {

using Frame = PipelineRecording::Frame;
using JSONWriter = rapidjson::Writer<rapidjson::StringBuffer>;

constexpr uint64_t kContainerVersion = 2;

std::string_view typeName(Frame::Type type) {
    switch (type) {
        case Frame::Type::State: return "State";
        case Frame::Type::InputReport: return "InputReport";
        case Frame::Type::Metadata: return "Metadata";
    }
    return "?";
}

// Enough for the usual frames, so the buffer rarely grows while writing.
size_t estimatedContainerSize(const PipelineRecording::FrameList& frames) {
    size_t size = 64;
    for (const Frame& frame : frames) size += 64 + frame.key.size() + 3 * frame.data.size() + (frame.value ? 96 : 0);
    return size;
}

void writeString(JSONWriter& writer, std::string_view text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

// Writes frame objects into the container. A State or Metadata value is written to a scratch
// buffer first, so a frame that JSON cannot hold is found before any of it reaches the container.
class FrameWriter {
public:
    explicit FrameWriter(JSONWriter& writer) : _writer(writer), _valueWriter(_value) {}

    // Writes the frame, or writes nothing and says why JSON cannot hold it.
    std::optional<std::string_view> write(const Frame& frame) {
        if (frame.type != Frame::Type::InputReport) {
            if (!isValidUTF8(frame.key)) return "its key is not valid UTF-8";
            _value.Clear();
            _valueWriter.Reset(_value);
            if (frame.value && !writeJSON(_valueWriter, frame.value, 2)) return "its value cannot be represented in JSON";
        }
        _writer.StartObject();
        _writer.Key("Type");
        writeString(_writer, typeName(frame.type));
        _writer.Key("Timestamp");
        _writer.Uint64(frame.timestamp);
        if (frame.type == Frame::Type::InputReport) {
            // Hex text needs no escaping, so it goes in raw.
            _hex.assign(1, '"');
            Util::appendHexText(_hex, frame.data);
            _hex += '"';
            _writer.Key("Data");
            _writer.RawValue(_hex.data(), _hex.size(), rapidjson::kStringType);
        } else {
            _writer.Key("Key");
            writeString(_writer, frame.key);
            if (frame.value) {
                _writer.Key("Value");
                _writer.RawValue(_value.GetString(), _value.GetSize(), rapidjson::kObjectType);
            }
        }
        _writer.EndObject();
        return std::nullopt;
    }

private:
    JSONWriter& _writer;
    rapidjson::StringBuffer _value;
    JSONWriter _valueWriter;
    std::string _hex;
};

// ---- Reading ----

// The elements of container[key]; an absent entry has none, anything but an array is refused.
std::span<const PropertyValue> arrayEntry(const PropertyValue& container, std::string_view key) {
    const PropertyValue entry = container.get(key);
    if (entry && !entry.isArray()) throw std::invalid_argument(std::string(key) + " isn't an array");
    return entry.elements();
}

void requireObject(const PropertyValue& element) {
    if (!element.isDictionary()) throw std::invalid_argument("frame isn't an object");
}

// Version 0 held only reports, as {"Timestamp", "ReportData"}.
PropertyValue migrateFromVersion0(const PropertyValue& container) {
    PropertyValue frames = PropertyValue::mutableArray();
    for (const PropertyValue& report : arrayEntry(container, "Reports")) {
        requireObject(report);
        PropertyValue timestamp = report.get("Timestamp");
        if (!timestamp) throw std::invalid_argument("frame lacks Timestamp");
        PropertyValue reportData = report.get("ReportData");
        if (!reportData) throw std::invalid_argument("frame lacks ReportData");
        frames.append(PropertyValue::dictionary(
            {{"Timestamp", timestamp}, {"Type", PropertyValue::string("InputReport")}, {"Report", reportData}}));
    }
    return PropertyValue::dictionary({{"Version", PropertyValue::fromUInt64(1)}, {"Frames", frames}});
}

// Version 1 kept a report's hex text under "Report" instead of "Data".
PropertyValue migrateFromVersion1(const PropertyValue& container) {
    PropertyValue frames = PropertyValue::mutableArray();
    for (const PropertyValue& frame : arrayEntry(container, "Frames")) {
        requireObject(frame);
        const PropertyValue type = frame.get("Type");
        if (!type) throw std::invalid_argument("frame lacks Type");
        if (!type.isString()) throw std::invalid_argument("frame Type isn't a string");
        if (type.stringView() != "InputReport") {
            frames.append(frame);
            continue;
        }
        PropertyValue report = frame.get("Report");
        if (!report) throw std::invalid_argument("frame lacks Report");
        PropertyValue migrated = frame.mutableCopy();
        migrated.remove("Report");
        migrated.set("Data", report);
        frames.append(migrated);
    }
    return PropertyValue::dictionary(
        {{"Version", PropertyValue::fromUInt64(kContainerVersion)}, {"Frames", frames}});
}

// Key and value of a State or Metadata frame. Every value parsed from JSON is a PropertyValue,
// so beyond presence of the key there is nothing to refuse.
void readKeyAndValue(const PropertyValue& object, Frame& frame, const char* invalidKeyMessage) {
    const PropertyValue key = object.get("Key");
    if (!key.isString()) throw std::invalid_argument(invalidKeyMessage);
    frame.key = key.stringView();
    frame.value = object.get("Value");
}

// One version 2 frame object. `scratch` is reused for decoding report bytes.
Frame readFrame(const PropertyValue& object, std::vector<uint8_t>& scratch) {
    if (!object.isDictionary()) throw std::invalid_argument("invalid frame");
    const PropertyValue type = object.get("Type");
    if (!type.isString()) throw std::invalid_argument("invalid frame type");
    const PropertyValue timestamp = object.get("Timestamp");
    if (!timestamp.isNumber()) throw std::invalid_argument("invalid frame timestamp");

    Frame frame;
    frame.timestamp = timestamp.toUInt64();
    const std::string_view kind = type.stringView();
    if (kind == "State") {
        frame.type = Frame::Type::State;
        readKeyAndValue(object, frame, "invalid state key");
    } else if (kind == "Metadata") {
        frame.type = Frame::Type::Metadata;
        readKeyAndValue(object, frame, "invalid metadata key");
    } else if (kind == "InputReport") {
        frame.type = Frame::Type::InputReport;
        const PropertyValue data = object.get("Data");
        if (!data.isString()) throw std::invalid_argument("invalid report");
        scratch.clear();
        Util::appendBytesFromHexText(data.stringView(), scratch);
        frame.data = ReportBytes(scratch);
    } else {
        throw std::invalid_argument("invalid frame type");
    }
    return frame;
}

}  // namespace

PropertyValue PipelineRecording::json() {
    try {
        return jsonOrThrow();
    } catch (const std::runtime_error&) {
        return {};
    }
}

PropertyValue PipelineRecording::jsonOrThrow() {
    return writeContainer([](size_t index, const Frame& frame, std::string_view why) {
        throw std::runtime_error("cannot write frame " + std::to_string(index) + " (" + std::string(typeName(frame.type)) +
                                 " \"" + frame.key + "\"): " + std::string(why));
    });
}

PropertyValue PipelineRecording::jsonLeavingOutUnwritable(size_t& leftOut) {
    leftOut = 0;
    return writeContainer([&leftOut](size_t, const Frame&, std::string_view) { ++leftOut; });
}

PropertyValue PipelineRecording::writeContainer(const UnwritableFrameHandler& unwritable) {
    if (_maxFrameCount != 0) trimFrames(_frames, _maxFrameCount);
    sortFrames(_frames);
    endPlayback();

    rapidjson::StringBuffer buffer(nullptr, estimatedContainerSize(_frames));
    JSONWriter writer(buffer);
    writer.StartObject();
    writer.Key("Version");
    writer.Uint64(kContainerVersion);
    writer.Key("Frames");
    writer.StartArray();
    FrameWriter frames(writer);
    size_t index = 0;
    for (const Frame& frame : _frames) {
        if (const auto why = frames.write(frame)) unwritable(index, frame, *why);
        ++index;
    }
    writer.EndArray();
    writer.EndObject();
    return PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(buffer.GetString()), buffer.GetSize()));
}

PropertyValue PipelineRecording::migrateSerializedContainer(const PropertyValue& container) {
    if (!container.isDictionary()) throw std::invalid_argument("invalid container");
    const PropertyValue versionValue = container.get("Version");
    if (!versionValue.isNumber()) throw std::invalid_argument("invalid version");
    switch (const uint64_t version = versionValue.toUInt64()) {
        case 0: return migrateFromVersion1(migrateFromVersion0(container));
        case 1: return migrateFromVersion1(container);
        case kContainerVersion: return container;
        default: throw std::invalid_argument("invalid container version: " + std::to_string(version));
    }
}

PipelineRecording::PipelineRecording(const PropertyValue& data) {
    if (!data) throw std::invalid_argument("json not supplied");
    PropertyValue container;
    try {
        container = migrateSerializedContainer(PropertyValue::fromJSON(data));
    } catch (const std::invalid_argument& error) {
        throw std::runtime_error(std::string("migrateSerializedContainer failed: ") + error.what());
    }
    const PropertyValue frames = container.get("Frames");
    if (!frames.isArray()) throw std::invalid_argument("invalid frames");
    std::vector<uint8_t> scratch;
    for (const PropertyValue& object : frames.elements()) _frames.push_back(readFrame(object, scratch));
}

}  // namespace ZeltoTouch

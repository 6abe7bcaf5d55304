#include <charconv>
#include <cstdint>
#include <cstring>
#include <functional>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/JSONReader.h"
#include "Host/JSONWriter.h"
#include "Host/UTF8.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Hex.h"

namespace ZeltoTouch {

namespace {

using Frame = PipelineRecording::Frame;

// RapidJSON copies a raw value one character at a time; report data and frame values are most
// of a container's text, so they are copied in one go.
class JSONWriter final : public rapidjson::Writer<rapidjson::StringBuffer> {
public:
    using Writer::Writer;

    void rawValue(std::string_view json, rapidjson::Type type) {
        Prefix(type);
        std::memcpy(os_->Push(json.size()), json.data(), json.size());
        EndValue(true);
    }
};

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
            _writer.rawValue(_hex, rapidjson::kStringType);
        } else {
            _writer.Key("Key");
            writeString(_writer, frame.key);
            if (frame.value) {
                _writer.Key("Value");
                _writer.rawValue({_value.GetString(), _value.GetSize()}, rapidjson::kObjectType);
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

// Reads a container of the current version straight from the JSON events into frames, with
// no tree in between. It takes only the shape this writer produces (Version 2 first, then
// Frames; each frame with exactly the members of its type, none twice, timestamps as plain
// integers); on anything else it stops, and the caller reads the text the general way, which
// accepts every form and names every error.
class Version2Reader final : public JSONEventHandler {
public:
    explicit Version2Reader(PipelineRecording::FrameList& frames) : _frames(frames) {}

    bool null() override { return takesValue() && feedValue(_value.null()); }
    bool boolean(bool value) override { return takesValue() && feedValue(_value.boolean(value)); }
    bool number(std::string_view text) override {
        if (takesValue()) return feedValue(_value.number(text));
        if (_state == State::Version) return text == "2" && enter(State::Root);
        return _state == State::Timestamp && readTimestamp(text) && enter(State::InFrame);
    }
    bool string(std::string_view text) override {
        if (takesValue()) return feedValue(_value.string(text));
        switch (_state) {
            case State::Type: return readType(text) && enter(State::InFrame);
            case State::Key:
                _frame.key = text;
                return enter(State::InFrame);
            case State::Data: return readData(text) && enter(State::InFrame);
            default: return false;
        }
    }
    bool key(std::string_view text) override {
        if (takesValue()) return _value.key(text);
        if (_state == State::Root) return readRootMember(text);
        return _state == State::InFrame && readFrameMember(text);
    }
    bool startObject() override {
        if (takesValue()) return _value.startObject();
        if (_state == State::Start) return enter(State::Root);
        if (_state != State::InFrames) return false;
        _frame = Frame{};
        _seen = 0;
        return enter(State::InFrame);
    }
    bool startArray() override {
        if (takesValue()) return _value.startArray();
        return _state == State::Frames && enter(State::InFrames);
    }
    bool endObject(size_t count) override {
        if (takesValue()) return feedValue(_value.endObject(count));
        if (_state == State::Root) return _framesRead && enter(State::Done);
        return _state == State::InFrame && finishFrame() && enter(State::InFrames);
    }
    bool endArray(size_t count) override {
        if (takesValue()) return feedValue(_value.endArray(count));
        return _state == State::InFrames && enter(State::Root);
    }

    bool finished() const noexcept { return _state == State::Done; }

private:
    enum class State { Start, Root, Version, Frames, InFrames, InFrame, Type, Timestamp, Key, Data, Value, InValue, Done };
    enum MemberBit : uint8_t { kType = 1, kTimestamp = 2, kKey = 4, kData = 8, kValue = 16 };
    struct Member {
        std::string_view name;
        uint8_t bit;
        State state;
    };
    static constexpr Member kMembers[] = {
        {"Type", kType, State::Type}, {"Timestamp", kTimestamp, State::Timestamp}, {"Key", kKey, State::Key},
        {"Data", kData, State::Data}, {"Value", kValue, State::Value},
    };

    bool enter(State state) {
        _state = state;
        return true;
    }
    bool readRootMember(std::string_view name) {
        if (name == "Version" && !_versionRead) {
            _versionRead = true;
            return enter(State::Version);
        }
        if (name != "Frames" || !_versionRead || _framesRead) return false;
        _framesRead = true;
        return enter(State::Frames);
    }
    bool readFrameMember(std::string_view name) {
        for (const Member& member : kMembers) {
            if (name != member.name) continue;
            if (_seen & member.bit) return false;
            _seen |= member.bit;
            return enter(member.state);
        }
        return false;
    }
    // True while the events belong to a frame's value, which goes to the value builder.
    bool takesValue() {
        if (_state == State::Value) _state = State::InValue;
        return _state == State::InValue;
    }
    // The value is complete once none of its containers is open any more.
    bool feedValue(bool accepted) {
        if (accepted && _value.isBetweenValues()) {
            _frame.value = _value.takeResult();
            _state = State::InFrame;
        }
        return accepted;
    }
    bool readType(std::string_view text) {
        for (const Frame::Type type : {Frame::Type::State, Frame::Type::InputReport, Frame::Type::Metadata}) {
            if (text != typeName(type)) continue;
            _frame.type = type;
            return true;
        }
        return false;
    }
    bool readTimestamp(std::string_view text) {
        const auto result = std::from_chars(text.data(), text.data() + text.size(), _frame.timestamp);
        return result.ec == std::errc() && result.ptr == text.data() + text.size();
    }
    // Bad hex text stops this reader (the frame may not even be a report); the general way
    // then tells whether it is an error.
    bool readData(std::string_view text) {
        _scratch.clear();
        try {
            Util::appendBytesFromHexText(text, _scratch);
        } catch (const std::invalid_argument&) {
            return false;
        }
        _frame.data = ReportBytes(_scratch);
        return true;
    }
    bool finishFrame() {
        const uint8_t expected = _frame.type == Frame::Type::InputReport ? kType | kTimestamp | kData
                                                                         : kType | kTimestamp | kKey | (_seen & kValue);
        if (!(_seen & kType) || _seen != expected) return false;
        _frames.push_back(std::move(_frame));
        return true;
    }

    PipelineRecording::FrameList& _frames;
    State _state = State::Start;
    bool _versionRead = false;
    bool _framesRead = false;
    Frame _frame;
    uint8_t _seen = 0;
    JSONValueBuilder _value;
    std::vector<uint8_t> _scratch;
};

// The JSON text inside a data or string value.
std::optional<std::string_view> textOf(const PropertyValue& value) {
    if (value.isString()) return value.stringView();
    if (!value.isData()) return std::nullopt;
    const std::span<const uint8_t> bytes = value.bytes();
    return std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size());
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
    if (const std::optional<std::string_view> text = textOf(data)) {
        Version2Reader reader(_frames);
        if (readJSON(*text, reader) && reader.finished()) return;
        _frames.clear();
    }
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

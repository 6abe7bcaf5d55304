#include "Tools/InspectTrace.h"

#include <charconv>
#include <cmath>
#include <cstdio>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/JSONWriter.h"
#include "Platform/SensorLayout.h"
#include "Tools/EventLines.h"
#include "Tools/RegionNames.h"

namespace ZeltoTouch::Tools {
namespace {

using Writer = rapidjson::Writer<rapidjson::StringBuffer>;

void writeString(Writer& writer, std::string_view text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

// The shortest text that reads back as the same float; JSON has no NaN or infinity: null.
void writeFloat(Writer& writer, float value) {
    if (!std::isfinite(value)) {
        writer.Null();
        return;
    }
    char text[32];
    const auto end = std::to_chars(text, text + sizeof text, value).ptr;
    writer.RawValue(text, static_cast<size_t>(end - text), rapidjson::kNumberType);
}

// Milliseconds with microsecond precision, without trailing zeros.
void writeMilliseconds(Writer& writer, uint64_t nanoseconds) {
    char text[32];
    int length = std::snprintf(text, sizeof text, "%llu.%03llu", static_cast<unsigned long long>(nanoseconds / 1'000'000),
                               static_cast<unsigned long long>(nanoseconds / 1'000 % 1'000));
    while (text[length - 1] == '0') --length;
    if (text[length - 1] == '.') --length;
    writer.RawValue(text, static_cast<size_t>(length), rapidjson::kNumberType);
}

// One array holding one field of every element.
template <typename Element, typename Write>
void writeColumn(Writer& writer, const char* key, const std::vector<Element>& elements, Write write) {
    writer.Key(key);
    writer.StartArray();
    for (const Element& element : elements) write(element);
    writer.EndArray();
}

void writeChannels(Writer& writer) {
    writer.Key("channels");
    writer.StartArray();
    for (int channel = 0; channel < kPixelCount; ++channel) {
        writer.StartObject();
        writer.Key("name");
        const char name = static_cast<char>('A' + channel);
        writer.String(&name, 1);
        writer.Key("region");
        writer.Uint(static_cast<uint32_t>(regionOfChannel(channel)));
        writer.Key("electrodes");  // in the text picture's units: x 0 to 18, y 0 to 12
        writer.StartArray();
        for (const Platform::SurfacePoint& point : Platform::electrodesOfChannel(channel)) {
            writer.StartArray();
            writeFloat(writer, point.x);
            writeFloat(writer, point.y);
            writer.EndArray();
        }
        writer.EndArray();
        writer.EndObject();
    }
    writer.EndArray();
}

}  // namespace

std::string_view stateLabelOfDescription(std::string_view description) {
    const size_t end = description.rfind("] ");
    return end == std::string_view::npos ? std::string_view() : description.substr(end + 2);
}

void InspectTrace::addImage(uint64_t timestampNs, const InputReport::Image& image, const Algs& algs) {
    const HandStats& hand = algs.handStats();
    ImageFrame frame;
    frame.timestampNs = timestampNs;
    frame.frameNumber = image.frameNumber;
    frame.timeMs = image.timestampMs;
    frame.raw = image.signedPixels;
    for (size_t i = 0; i < frame.scaled.size() && i < algs.pixels().size(); ++i) {
        frame.scaled[i] = algs.pixels()[i].value;
        if (algs.pixels()[i].active) frame.activeChannels |= static_cast<uint16_t>(1u << i);
    }
    frame.touchScore = hand.touchScore;
    frame.frameScore = hand.svm.score;
    frame.tapScore = hand.tapSVMScore;
    frame.sd = hand.sd;
    frame.tsd = hand.tsd;
    frame.timeDurationRatio = hand.timeDurationRatio;
    frame.nonActivePixels = hand.nonActivePixels;
    frame.region = static_cast<uint32_t>(hand.activeRegion);
    frame.label = stateLabelOfDescription(algs.touchStateDescription(image.signedPixels, image.timestampMs));
    _images.push_back(std::move(frame));
}

void InspectTrace::addEvents(uint64_t timestampNs, const HIDEventList& events) {
    for (const HIDEventRef& event : events) {
        if (!event) continue;
        const bool digitizer = event->type() == kHIDEventTypeDigitizer;
        _events.push_back({timestampNs, std::string(eventKind(*event)), digitizer ? static_cast<int64_t>(event->y()) : 0,
                           digitizer ? event->integerValue(kHIDEventFieldDigitizerFrameNumber) : 0, digitizer});
    }
}

void InspectTrace::addMetadata(uint64_t timestampNs, std::string_view key, const PropertyValue& value) {
    if (key != "Accel" || !value.isDictionary()) return;
    _accel.push_back({timestampNs, value.get("X").toFloat(), value.get("Y").toFloat(), value.get("Z").toFloat()});
}

std::string InspectTrace::json(std::string_view source, const RecordingSummary& summary,
                               const PropertyValue& finalStats) const {
    const uint64_t origin = summary.firstTimestampNs().value_or(0);
    const auto ms = [origin](uint64_t timestampNs) { return timestampNs - origin; };

    rapidjson::StringBuffer buffer;
    Writer writer(buffer);
    writer.StartObject();
    writer.Key("source");
    writeString(writer, source);
    writer.Key("summary");
    const std::string summaryJSON = summary.json();
    writer.RawValue(summaryJSON.data(), summaryJSON.size(), rapidjson::kObjectType);
    writer.Key("finalStats");
    if (!writeJSON(writer, finalStats, 1)) writer.Null();
    writeChannels(writer);

    writer.Key("frames");
    writer.StartObject();
    writeColumn(writer, "t", _images, [&](const ImageFrame& f) { writeMilliseconds(writer, ms(f.timestampNs)); });
    writeColumn(writer, "frame", _images, [&](const ImageFrame& f) { writer.Uint(f.frameNumber); });
    writeColumn(writer, "timeMs", _images, [&](const ImageFrame& f) { writer.Uint(f.timeMs); });
    writeColumn(writer, "raw", _images, [&](const ImageFrame& f) {
        writer.StartArray();
        for (int16_t value : f.raw) writer.Int(value);
        writer.EndArray();
    });
    writeColumn(writer, "scaled", _images, [&](const ImageFrame& f) {
        writer.StartArray();
        for (int32_t value : f.scaled) writer.Int(value);
        writer.EndArray();
    });
    writeColumn(writer, "active", _images, [&](const ImageFrame& f) { writer.Uint(f.activeChannels); });
    writeColumn(writer, "touchScore", _images, [&](const ImageFrame& f) { writeFloat(writer, f.touchScore); });
    writeColumn(writer, "frameScore", _images, [&](const ImageFrame& f) { writeFloat(writer, f.frameScore); });
    writeColumn(writer, "tapScore", _images, [&](const ImageFrame& f) { writeFloat(writer, f.tapScore); });
    writeColumn(writer, "sd", _images, [&](const ImageFrame& f) { writeFloat(writer, f.sd); });
    writeColumn(writer, "tsd", _images, [&](const ImageFrame& f) { writeFloat(writer, f.tsd); });
    writeColumn(writer, "timeDurationRatio", _images,
                [&](const ImageFrame& f) { writeFloat(writer, f.timeDurationRatio); });
    writeColumn(writer, "nonActivePixels", _images, [&](const ImageFrame& f) { writer.Int(f.nonActivePixels); });
    writeColumn(writer, "region", _images, [&](const ImageFrame& f) { writer.Uint(f.region); });
    writeColumn(writer, "label", _images, [&](const ImageFrame& f) { writeString(writer, f.label); });
    writer.EndObject();

    writeColumn(writer, "events", _events, [&](const Event& e) {
        writer.StartObject();
        writer.Key("t");
        writeMilliseconds(writer, ms(e.timestampNs));
        writer.Key("ns");  // exact, as text: beyond 2^53 a page's numbers lose digits
        writeString(writer, std::to_string(e.timestampNs));
        writer.Key("kind");
        writeString(writer, e.kind);
        if (e.digitizer) {
            writer.Key("region");
            writer.Int64(e.region);
            writer.Key("regionName");
            writeString(writer, regionName(e.region));
            writer.Key("frame");
            writer.Int64(e.frameNumber);
        }
        writer.EndObject();
    });

    writer.Key("accel");
    writer.StartObject();
    writeColumn(writer, "t", _accel, [&](const AccelSample& s) { writeMilliseconds(writer, ms(s.timestampNs)); });
    writeColumn(writer, "x", _accel, [&](const AccelSample& s) { writeFloat(writer, s.x); });
    writeColumn(writer, "y", _accel, [&](const AccelSample& s) { writeFloat(writer, s.y); });
    writeColumn(writer, "z", _accel, [&](const AccelSample& s) { writeFloat(writer, s.z); });
    writer.EndObject();

    // The summary's markers again, on the page's time axis.
    writeColumn(writer, "stateWrites", summary.stateWrites(), [&](const RecordingSummary::StateWrite& w) {
        writer.StartObject();
        writer.Key("t");
        writeMilliseconds(writer, ms(w.timestampNs));
        writer.Key("key");
        writeString(writer, w.key);
        writer.Key("value");
        std::string value;
        writeString(writer, !w.value ? "(no value)" : w.value.toJSON(value) ? value : w.value.description());
        writer.EndObject();
    });
    writeColumn(writer, "firmwareEvents", summary.firmwareEvents(), [&](const RecordingSummary::FirmwareEvent& e) {
        writer.StartObject();
        writer.Key("t");
        writeMilliseconds(writer, ms(e.timestampNs));
        writer.Key("event");
        writer.Uint(e.event);
        writer.EndObject();
    });
    writeColumn(writer, "gaps", summary.gaps(), [&](const RecordingSummary::Gap& g) {
        writer.StartObject();
        writer.Key("t");
        writeMilliseconds(writer, ms(g.timestampNs));
        writer.Key("previousFrameNumber");
        writer.Uint(g.previousFrameNumber);
        writer.Key("frameNumber");
        writer.Uint(g.frameNumber);
        writer.EndObject();
    });
    writer.EndObject();
    return {buffer.GetString(), buffer.GetSize()};
}

}  // namespace ZeltoTouch::Tools

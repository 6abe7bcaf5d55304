// Writes the fuzzers' seed corpora from our own code: a short session of the simulated sensor,
// its recording as a container of each version, its reports as hex text, and the JSON the
// system itself produces. Usage: zelto-fuzz-seeds CORPUS_DIR (one subfolder per fuzzer).

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Hex.h"

using namespace ZeltoTouch;

namespace {

using Bytes = std::vector<uint8_t>;

class SeedWriter {
public:
    explicit SeedWriter(std::filesystem::path root) : _root(std::move(root)) {}

    void write(std::string_view fuzzer, std::string_view name, std::span<const uint8_t> bytes) const {
        const std::filesystem::path dir = _root / fuzzer;
        std::filesystem::create_directories(dir);
        std::ofstream(dir / name, std::ios::binary).write(reinterpret_cast<const char*>(bytes.data()), bytes.size());
    }
    void write(std::string_view fuzzer, std::string_view name, std::string_view text) const {
        write(fuzzer, name, std::span(reinterpret_cast<const uint8_t*>(text.data()), text.size()));
    }

private:
    std::filesystem::path _root;
};

std::vector<Bytes> sessionReports(std::string_view script) {
    Platform::SensorReportGenerator generator(Platform::GestureScriptParser::parse(script));
    std::vector<Bytes> reports;
    for (Platform::SimulatedReport& report : generator.generateAll()) reports.push_back(std::move(report.bytes));
    return reports;
}

std::string text(const PropertyValue& value) {
    if (value.isString()) return std::string(value.stringView());
    const auto bytes = value.bytes();
    return std::string(reinterpret_cast<const char*>(bytes.data()), bytes.size());
}

// A recording of a session with a parameter write and a metadata sample, through a real pipeline.
PipelineRecording recordSession(const std::vector<Bytes>& reports, const std::shared_ptr<Pipeline>& pipeline) {
    PipelineRecording recording;
    recording.pipeline = pipeline;
    uint64_t now = 1'000'000;
    recording.setState(now, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300));
    recording.handleMetadata(now, "Accel", PropertyValue::array({PropertyValue::fromDouble(0.01), PropertyValue::fromDouble(-0.98)}));
    for (const Bytes& report : reports) recording.handleInputReport(now += 10'000'000, report.data(), report.size());
    recording.setState(now, "Algs.ResetEventStats", PropertyValue());
    return recording;
}

// The same reports in the older container versions, built as those versions laid them out.
std::string olderContainer(const std::vector<Bytes>& reports, int version) {
    PropertyValue frames = PropertyValue::mutableArray();
    uint64_t timestamp = 0;
    for (const Bytes& report : reports) {
        timestamp += 10'000'000;
        const PropertyValue hex = Util::hexStringFromBytes(report);
        frames.append(version == 0 ? PropertyValue::dictionary({{"Timestamp", PropertyValue::fromUInt64(timestamp)},
                                                                {"ReportData", hex}})
                                   : PropertyValue::dictionary({{"Timestamp", PropertyValue::fromUInt64(timestamp)},
                                                                {"Type", PropertyValue::string("InputReport")},
                                                                {"Report", hex}}));
    }
    return text(PropertyValue::dictionary(
                    {{"Version", PropertyValue::fromUInt64(version)}, {version == 0 ? "Reports" : "Frames", frames}})
                    .toJSON());
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        fprintf(stderr, "usage: %s CORPUS_DIR\n", argv[0]);
        return 2;
    }
    const SeedWriter seeds(argv[1]);
    const std::vector<Bytes> tap = sessionReports("idle 30ms\ntap volume-up 120ms\nidle 60ms\n");
    const std::vector<Bytes> holdWithReset = sessionReports("hold play-pause 250ms reset-after 150ms\nidle 40ms\n");

    // Pipeline: the raw bytes of sensor reports, which the fuzzer reads as its choices and pixels.
    for (const auto& [name, reports] : {std::pair{"tap", &tap}, std::pair{"hold-reset", &holdWithReset}}) {
        Bytes joined;
        for (const Bytes& report : *reports) joined.insert(joined.end(), report.begin(), report.end());
        joined.resize(std::min<size_t>(joined.size(), 4096));
        seeds.write("fuzz-pipeline-reports", name, joined);
    }

    // Containers: what the writer writes, and the two older versions it migrates from.
    auto pipeline = std::make_shared<Pipeline>();
    const PipelineRecording recording = recordSession(tap, pipeline);
    PipelineRecording written = recording;
    const std::string container = text(written.json());
    seeds.write("fuzz-container-reader", "version-2-tap", container);
    seeds.write("fuzz-container-reader", "version-1", olderContainer({tap.begin(), tap.begin() + 3}, 1));
    seeds.write("fuzz-container-reader", "version-0", olderContainer({tap.begin(), tap.begin() + 3}, 0));
    seeds.write("fuzz-container-reader", "version-2-hold-reset",
                text(PipelineRecording(recordSession({holdWithReset.end() - 8, holdWithReset.end()}, pipeline)).json()));

    // Hex text as the writer writes it, and as a person might type it.
    seeds.write("fuzz-hex", "image-report", text(Util::hexStringFromBytes(tap.front())));
    seeds.write("fuzz-hex", "reset-report", text(Util::hexStringFromBytes(holdWithReset[15])));
    seeds.write("fuzz-hex", "typed", "0x1F 10\t27\n00 0A ff");

    // JSON: the container, and the dictionaries the algorithm reports.
    seeds.write("fuzz-property-json", "container", container.substr(0, 2048));
    seeds.write("fuzz-property-json", "debug-info", text(pipeline->getState("Algs.DebugInfo").toJSON()));
    seeds.write("fuzz-property-json", "pipeline-debug-info", text(pipeline->getState("DebugInfo").toJSON()));
    seeds.write("fuzz-property-json", "scalars", R"([null,true,false,-1,18446744073709551615,-9223372036854775808,0.1,1e300,-0.0,"\u00e9\ud83d\ude00"])");

    // Service properties: the fuzzer reads its choices from these bytes; key names give it words.
    seeds.write("fuzz-service-properties", "keys",
                "Pipeline.Algs.HoldTimeoutMilliseconds\x01\x02Pipeline.Algs.ActivationThreshold\x03\x04"
                "Pipeline.Algs.VirtualNormalizationFactors.5\x05Recording\x06ServicePluginDebug\x07");
    seeds.write("fuzz-service-properties", "report-bytes", std::span<const uint8_t>(tap[5]));
    return 0;
}

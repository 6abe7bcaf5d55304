// zelto-touch run and devices, as a user runs them: the built binary, with a SOCK_SEQPACKET
// socket pair standing in for the sensor's hidraw node and a sysfs tree in a temporary folder.

#include <gtest/gtest.h>

#include <csignal>
#include <fstream>
#include <sstream>
#include <sys/socket.h>
#include <tuple>
#include <unistd.h>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Tests/Linux/ChildProcess.h"
#include "Tests/Linux/TempFolder.h"

namespace ZeltoTouch {
namespace {

using Testing::ChildProcess;
using Testing::runProgram;
using Testing::TempFolder;

const std::string kBinary = ZELTO_TOUCH_BINARY;

// What identifies a gesture event, whoever printed or produced it.
using EventFields = std::tuple<uint64_t /*phase*/, uint64_t /*eventMask*/, uint64_t /*region*/, uint64_t /*frame*/>;

std::vector<Platform::SimulatedReport> sensorReports(std::string_view script) {
    return Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll();
}

// The events a fresh pipeline makes of the reports: what the plug-in must report live. The
// reports after the one that produced the last event are dropped, so that a test seeing the
// last event knows every report has been through the plug-in.
std::vector<EventFields> pipelineEvents(std::vector<Platform::SimulatedReport>& reports) {
    Pipeline pipeline;
    std::vector<EventFields> events;
    pipeline.hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&](uint64_t, const HIDEventList& list) {
            for (const auto& event : list) {
                events.emplace_back(event->phase(), event->eventMask(), static_cast<uint64_t>(event->y()),
                                    event->integerValue(kHIDEventFieldDigitizerFrameNumber));
            }
        });
    size_t reportsToLastEvent = 0;
    for (size_t i = 0; i < reports.size(); ++i) {
        const size_t eventsBefore = events.size();
        pipeline.handleInputReport(i + 1, reports[i].bytes.data(), reports[i].bytes.size());
        if (events.size() > eventsBefore) reportsToLastEvent = i + 1;
    }
    reports.resize(reportsToLastEvent);
    return events;
}

std::vector<PropertyValue> jsonLines(const std::string& text) {
    std::vector<PropertyValue> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) lines.push_back(PropertyValue::fromJSON(line));
    return lines;
}

size_t occurrences(const std::string& text, const std::string& part) {
    size_t count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + part.size())) ++count;
    return count;
}

size_t lineCount(const std::string& text) { return static_cast<size_t>(std::count(text.begin(), text.end(), '\n')); }

std::string readFile(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

size_t recordedReportCount(const std::filesystem::path& path) {
    const std::string text = readFile(path);
    const PipelineRecording recording(PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(text.data()), text.size())));
    return static_cast<size_t>(std::count_if(recording.frames().begin(), recording.frames().end(), [](const auto& frame) {
        return frame.type == PipelineRecording::Frame::Type::InputReport;
    }));
}

// The binary reading reports from our end of a socket pair.
class StandInSensor : public ::testing::Test {
protected:
    void SetUp() override {
        int fds[2];
        ASSERT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, fds), 0);
        _sensor = fds[0];
        _childEnd = fds[1];
    }
    void TearDown() override {
        if (_sensor >= 0) ::close(_sensor);
        ::close(_childEnd);
    }

    std::unique_ptr<ChildProcess> start(std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), {"run", "--stand-in-fd", std::to_string(_childEnd)});
        return std::make_unique<ChildProcess>(kBinary, arguments, _childEnd);
    }

    void send(const std::vector<Platform::SimulatedReport>& reports) {
        for (const auto& report : reports) {
            ASSERT_EQ(::send(_sensor, report.bytes.data(), report.bytes.size(), MSG_NOSIGNAL),
                      static_cast<ssize_t>(report.bytes.size()));
        }
    }

    void unplug() {
        ::close(_sensor);
        _sensor = -1;
    }

    TempFolder _folder;
    int _sensor = -1;
    int _childEnd = -1;
};

TEST_F(StandInSensor, RunPrintsTheGesturesLiveAndSavesTheRecordingOnSIGUSR1AndOnSIGTERM) {
    auto reports = sensorReports("idle 100ms\ntap play-pause 120ms\nidle 400ms\nhold volume-up 900ms\nidle 300ms\n");
    const auto expected = pipelineEvents(reports);
    ASSERT_TRUE(std::any_of(expected.begin(), expected.end(), [](const EventFields& event) {
        return std::get<1>(event) == 0x20000 && std::get<2>(event) == 1;
    })) << "the script should give a tap on play/pause";
    const auto recordPath = _folder.path() / "live.json";

    auto child = start({"--format", "jsonl", "--record", recordPath.string()});
    send(reports);
    ASSERT_TRUE(child->waitForOutput([&](const std::string& out, const std::string&) {
        return lineCount(out) >= expected.size();
    })) << child->err();

    // The last report made the last event: every report has been recorded, and SIGUSR1 saves them all.
    child->sendSignal(SIGUSR1);
    ASSERT_TRUE(child->waitForOutput([](const std::string&, const std::string& err) {
        return err.find("Saved the recording to") != std::string::npos;
    })) << child->err();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());

    child->sendSignal(SIGTERM);  // what systemd sends to stop the service
    EXPECT_EQ(child->wait(), 0) << child->err();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());
    EXPECT_EQ(occurrences(child->err(), "Saved the recording to " + recordPath.string() + "\n"), 2u) << child->err();

    std::vector<EventFields> printed;
    uint64_t previousTime = 0;
    for (const auto& line : jsonLines(child->out())) {
        ASSERT_TRUE(line.isDictionary());
        printed.emplace_back(line.get("phase").toUInt64(), line.get("eventMask").toUInt64(),
                             line.get("region").toUInt64(), line.get("frameNumber").toUInt64());
        EXPECT_GE(line.get("t").toUInt64(), previousTime);  // arrival times, in order
        previousTime = line.get("t").toUInt64();
    }
    EXPECT_EQ(printed, expected);
    EXPECT_EQ(jsonLines(child->out()).back().get("event").stringView(), "hold-end");
}

TEST_F(StandInSensor, ASensorThatDisappearsEndsTheRunWithAFailureButKeepsTheRecording) {
    const auto reports = sensorReports("idle 100ms\ntap volume-down 120ms\nidle 300ms\n");
    const auto recordPath = _folder.path() / "lost.json";
    auto child = start({"--record", recordPath.string()});
    send(reports);
    unplug();
    EXPECT_EQ(child->wait(), 1) << child->err();
    EXPECT_NE(child->err().find("Lost the sensor at descriptor " + std::to_string(_childEnd) + ": No such device\n"),
              std::string::npos)
        << child->err();
    EXPECT_NE(child->out().find("tap          volume down"), std::string::npos) << child->out();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());
}

TEST_F(StandInSensor, CtrlCEndsTheRunCleanly) {
    auto child = start({});
    ASSERT_TRUE(child->waitForOutput([](const std::string&, const std::string& err) {
        return err.find("Running on") != std::string::npos;
    })) << child->err();
    child->sendSignal(SIGINT);
    EXPECT_EQ(child->wait(), 0) << child->err();
}

TEST_F(StandInSensor, KeysWithoutUinputFailAtStartSayingWhy) {
    auto child = start({"--keys", "--uinput", "/dev/uinput-missing-for-test"});
    EXPECT_EQ(child->wait(), 1);
    EXPECT_EQ(child->err(),
              "/dev/uinput-missing-for-test does not exist: media keys need the uinput kernel module (modprobe uinput)\n");
    EXPECT_EQ(child->out(), "");
}

TEST_F(StandInSensor, AnUnknownHoldKeyIsRefusedBeforeAnythingRuns) {
    auto child = start({"--keys", "--hold-key", "KEY_NOPE"});
    EXPECT_EQ(child->wait(), 1);
    EXPECT_EQ(child->err(), "Unknown key KEY_NOPE for --hold-key (use a name such as KEY_VOICECOMMAND)\n");
}

TEST(RunCommand, AMissingNodeFailsClearly) {
    const auto result = runProgram(kBinary, {"run", "--device", "/dev/hidraw-missing-for-test"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "/dev/hidraw-missing-for-test does not exist: is the sensor plugged in? (`zelto-touch devices` lists the "
              "hidraw nodes)\n");
    EXPECT_EQ(result.out, "");
}

TEST(RunCommand, MatchingNeedsExactlyOneDevice) {
    TempFolder sysfs;
    const auto run = [&](const std::vector<std::string>& extra) {
        std::vector<std::string> arguments{"run", "--sysfs", sysfs.path().string()};
        arguments.insert(arguments.end(), extra.begin(), extra.end());
        return runProgram(kBinary, arguments);
    };
    auto result = run({});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "No hidraw device matches 5a54:0001: is the sensor plugged in? (`zelto-touch devices` "
                          "lists the hidraw devices)\n");

    sysfs.addSysfsHidrawNode("hidraw0", "HID_ID=0003:00005A54:00000001\n");
    sysfs.addSysfsHidrawNode("hidraw7", "HID_ID=0003:0000046D:0000C52B\n");
    sysfs.addSysfsHidrawNode("hidraw2", "HID_ID=0003:00005A54:00000001\n");
    result = run({});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "Several hidraw devices match 5a54:0001 (/dev/hidraw0, /dev/hidraw2): choose one with --device\n");

    result = run({"--match", "046d:c52b"});  // the one match is tried; this machine has no such node
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err.rfind("/dev/hidraw7 ", 0), 0u) << result.err;

    result = run({"--match", "46d-c52b"});
    EXPECT_NE(result.status, 0);
    EXPECT_NE(result.err.find("expected VENDOR:PRODUCT in hex"), std::string::npos) << result.err;
}

TEST(DevicesCommand, ListsEveryNodeAndMarksTheSensor) {
    TempFolder sysfsFolder, devFolder;
    const auto& sysfs = sysfsFolder.path();
    const auto& dev = devFolder.path();
    sysfsFolder.addSysfsHidrawNode("hidraw1", "HID_ID=0003:00005A54:00000001\nHID_NAME=Zelto Touch Sensor\n");
    sysfsFolder.addSysfsHidrawNode("hidraw0", "HID_ID=0005:0000046D:0000B33E\nHID_NAME=Keyboard K\n");
    std::ofstream(dev / "hidraw1") << "";  // only the sensor's node is there to open

    const auto result = runProgram(kBinary, {"devices", "--sysfs", sysfs.string(), "--dev", dev.string()});
    EXPECT_EQ(result.status, 0) << result.err;
    const std::string node0 = (dev / "hidraw0").string(), node1 = (dev / "hidraw1").string();
    const auto row = [](const std::string& node, const char* id, const char* bus, const char* access, const char* sensor,
                        const char* name) {
        char line[256];
        std::snprintf(line, sizeof line, "%-16s %-9s %-10s %-7s %-6s %s\n", node.c_str(), id, bus, access, sensor, name);
        return std::string(line);
    };
    EXPECT_EQ(result.out, row("NODE", "ID", "BUS", "ACCESS", "SENSOR", "NAME") +
                              row(node0, "046d:b33e", "Bluetooth", "missing", "", "Keyboard K") +
                              row(node1, "5a54:0001", "USB", "ok", "yes", "Zelto Touch Sensor"));
}

TEST(DevicesCommand, SaysSoWhenThereAreNoHidrawDevices) {
    TempFolder sysfs;
    const auto result = runProgram(kBinary, {"devices", "--sysfs", sysfs.path().string()});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "No hidraw devices (is a HID device connected and the hidraw driver loaded?)\n");
}

}  // namespace
}  // namespace ZeltoTouch

// zelto-touch run and devices, as a user runs them: the built binary, with a SOCK_SEQPACKET
// socket pair standing in for the sensor's hidraw node and a sysfs tree in a temporary folder.
#include <gtest/gtest.h>

#include <csignal>
#include <sys/socket.h>
#include <tuple>
#include <unistd.h>

#include "Tests/Tools/ToolsTestSupport.h"

namespace ZeltoTouch {
namespace {

using namespace Testing;

// What identifies a gesture event, whoever printed or produced it: phase, mask, region, frame.
using EventFields = std::tuple<uint64_t, uint64_t, uint64_t, uint64_t>;

EventFields fieldsOf(const HIDEvent& event) {
    return {event.phase(), event.eventMask(), static_cast<uint64_t>(event.y()),
            event.integerValue(kHIDEventFieldDigitizerFrameNumber)};
}

size_t recordedReportCount(const std::string& path) {
    const PipelineRecording recording = recordingOf(readText(path));
    const auto& frames = recording.frames();
    return static_cast<size_t>(std::count_if(frames.begin(), frames.end(), [](const auto& frame) {
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
        return std::make_unique<ChildProcess>(ZELTO_TOUCH_BIN, arguments, _childEnd);
    }

    void send(const std::vector<Platform::SimulatedReport>& reports) {
        for (const auto& report : reports) {
            ASSERT_EQ(::send(_sensor, report.bytes.data(), report.bytes.size(), MSG_NOSIGNAL),
                      static_cast<ssize_t>(report.bytes.size()));
        }
    }

    TemporaryDirectory _folder;
    int _sensor = -1;
    int _childEnd = -1;
};

TEST_F(StandInSensor, RunPrintsTheGesturesLiveAndSavesTheRecordingOnSIGUSR1AndOnSIGTERM) {
    auto reports = reportsOf("idle 100ms\ntap play-pause 120ms\nidle 400ms\nhold volume-up 900ms\nidle 300ms\n");
    // What the plug-in must report live. The reports after the one that made the last event are
    // left out, so that seeing the last event means every report has been through the plug-in.
    const auto produced = pipelineEvents(reports);
    std::vector<EventFields> expected;
    for (const auto& [index, event] : produced) expected.push_back(fieldsOf(*event));
    reports.resize(produced.back().reportIndex + 1);
    const std::string recordPath = _folder.path("live.json");

    auto child = start({"--format", "jsonl", "--record", recordPath});
    send(reports);
    ASSERT_TRUE(child->waitForOutput([&](const std::string& out, const std::string&) {
        return static_cast<size_t>(std::count(out.begin(), out.end(), '\n')) >= expected.size();
    })) << child->err();

    // The last report made the last event: every report has been recorded, and SIGUSR1 saves them all.
    const std::string saved = "Saved the recording to " + recordPath + "\n";
    child->sendSignal(SIGUSR1);
    ASSERT_TRUE(child->waitForOutput([&](const std::string&, const std::string& err) {
        return err.find(saved) != std::string::npos;
    })) << child->err();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());

    child->sendSignal(SIGTERM);  // what systemd sends to stop the service
    EXPECT_EQ(child->wait(), 0) << child->err();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());
    EXPECT_NE(child->err().find(saved + saved), std::string::npos) << child->err();

    std::vector<EventFields> printed;
    uint64_t previousTime = 0;
    for (const std::string& text : lines(child->out())) {
        const PropertyValue line = PropertyValue::fromJSON(text);
        ASSERT_TRUE(line.isDictionary()) << text;
        printed.emplace_back(line.get("phase").toUInt64(), line.get("eventMask").toUInt64(),
                             line.get("region").toUInt64(), line.get("frameNumber").toUInt64());
        EXPECT_GE(line.get("t").toUInt64(), previousTime);  // arrival times, in order
        previousTime = line.get("t").toUInt64();
    }
    EXPECT_EQ(printed, expected);
}

TEST_F(StandInSensor, ASensorThatDisappearsEndsTheRunWithAFailureButKeepsTheRecording) {
    const auto reports = reportsOf("idle 100ms\ntap volume-down 120ms\nidle 300ms\n");
    const std::string recordPath = _folder.path("lost.json");
    auto child = start({"--record", recordPath});
    send(reports);
    ::close(std::exchange(_sensor, -1));
    EXPECT_EQ(child->wait(), 1) << child->err();
    EXPECT_NE(child->err().find("Lost the sensor at descriptor " + std::to_string(_childEnd) + ": No such device\n"),
              std::string::npos)
        << child->err();
    EXPECT_NE(child->out().find("tap          volume down"), std::string::npos) << child->out();
    EXPECT_EQ(recordedReportCount(recordPath), reports.size());
}

TEST_F(StandInSensor, KeysWithoutUinputFailAtStartAndCtrlCEndsARunCleanly) {
    auto refused = start({"--keys", "--uinput", "/dev/uinput-missing-for-test"});
    EXPECT_EQ(refused->wait(), 1);
    EXPECT_EQ(refused->err(),
              "/dev/uinput-missing-for-test does not exist: media keys need the uinput kernel module (modprobe uinput)\n");
    EXPECT_EQ(refused->out(), "");

    auto child = start({});
    ASSERT_TRUE(child->waitForOutput([](const std::string&, const std::string& err) {
        return err.find("Running on") != std::string::npos;
    })) << child->err();
    child->sendSignal(SIGINT);
    EXPECT_EQ(child->wait(), 0) << child->err();
}

TEST(RunCommand, RefusesWhatCannotWorkBeforeAnythingRuns) {
    const TemporaryDirectory empty, sysfs;
    sysfs.write("class/hidraw/hidraw0/device/uevent", "HID_ID=0003:00005A54:00000001\n");
    sysfs.write("class/hidraw/hidraw7/device/uevent", "HID_ID=0003:0000046D:0000C52B\n");
    sysfs.write("class/hidraw/hidraw2/device/uevent", "HID_ID=0003:00005A54:00000001\n");
    const struct {
        const TemporaryDirectory& sysfs;
        std::vector<std::string> options;
        std::string message;  // without its line end: only how it begins
    } cases[] = {
        {empty, {"--device", "/dev/hidraw-missing-for-test"},
         "/dev/hidraw-missing-for-test does not exist: is the sensor plugged in? (`zelto-touch devices` lists the "
         "hidraw nodes)\n"},
        {empty, {"--keys", "--hold-key", "KEY_NOPE"},
         "Unknown key KEY_NOPE for --hold-key (use a name such as KEY_VOICECOMMAND)\n"},
        {empty, {},
         "No hidraw device matches 5a54:0001: is the sensor plugged in? (`zelto-touch devices` lists the hidraw "
         "devices)\n"},
        {sysfs, {}, "Several hidraw devices match 5a54:0001 (/dev/hidraw0, /dev/hidraw2): choose one with --device\n"},
        {sysfs, {"--match", "046d:c52b"}, "/dev/hidraw7 "},  // the one match is tried; this machine has no such node
    };
    for (const auto& c : cases) {
        std::vector<std::string> arguments{"run", "--sysfs", c.sysfs.path()};
        arguments.insert(arguments.end(), c.options.begin(), c.options.end());
        const ToolRun run = runTool(arguments);
        EXPECT_EQ(run.status, 1) << c.message;
        EXPECT_EQ(c.message.ends_with('\n') ? run.err : run.err.substr(0, c.message.size()), c.message);
        EXPECT_EQ(run.out, "");
    }
    const ToolRun badMatch = runTool({"run", "--match", "46d-c52b"});
    EXPECT_NE(badMatch.status, 0);
    EXPECT_NE(badMatch.err.find("expected VENDOR:PRODUCT in hex"), std::string::npos) << badMatch.err;
}

TEST(DevicesCommand, ListsEveryNodeAndMarksTheSensor) {
    const TemporaryDirectory sysfs, dev;
    auto result = runTool({"devices", "--sysfs", sysfs.path()});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "No hidraw devices (is a HID device connected and the hidraw driver loaded?)\n");

    sysfs.write("class/hidraw/hidraw1/device/uevent", "HID_ID=0003:00005A54:00000001\nHID_NAME=Zelto Touch Sensor\n");
    sysfs.write("class/hidraw/hidraw0/device/uevent", "HID_ID=0005:0000046D:0000B33E\nHID_NAME=Keyboard K\n");
    dev.write("hidraw1", "");  // only the sensor's node is there to open
    result = runTool({"devices", "--sysfs", sysfs.path(), "--dev", dev.path()});
    EXPECT_EQ(result.status, 0) << result.err;
    // The node column is 16 wide: these paths are longer.
    EXPECT_EQ(result.out, "NODE             ID        BUS        ACCESS  SENSOR NAME\n" + dev.path("hidraw0") +
                              " 046d:b33e Bluetooth  missing        Keyboard K\n" + dev.path("hidraw1") +
                              " 5a54:0001 USB        ok      yes    Zelto Touch Sensor\n");
}

}  // namespace
}  // namespace ZeltoTouch

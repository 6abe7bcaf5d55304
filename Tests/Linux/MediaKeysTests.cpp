#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include "Platform/MediaKeys.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/UinputKeySender.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;

HIDEventRef digitizerEvent(uint32_t mask, uint32_t phase, double region) {
    auto event = HIDEvent::createDigitizerEvent(0, 2, 0, 0, mask, 0, 0.0, region, 0.0, 0.0, 0.0, false, false, 0);
    if (phase != 0) event->setPhase(phase);
    return event;
}

constexpr uint32_t kTap = 0x20000, kHold = 2;
constexpr unsigned kHoldKey = KEY_VOICECOMMAND;
const KeyCommand kNothing{};
const KeyCommand kStop{KeyAction::StopRepeating, 0};
KeyCommand press(unsigned key) { return {KeyAction::Press, key}; }
KeyCommand repeat(unsigned key) { return {KeyAction::PressAndRepeat, key}; }

TEST(MediaKeys, MapsEveryGestureAndRegion) {
    const struct {
        const char* gesture;
        uint32_t mask, phase;
        double region;
        KeyCommand expected;
    } rows[] = {
        {"tap play/pause", kTap, 0, 1, press(KEY_PLAYPAUSE)},
        {"tap volume down", kTap, 0, 2, press(KEY_VOLUMEDOWN)},
        {"tap volume up", kTap, 0, 3, press(KEY_VOLUMEUP)},
        {"tap without region", kTap, 0, 0, kNothing},
        {"hold start play/pause", kHold, 1, 1, press(kHoldKey)},
        {"hold start volume down", kHold, 1, 2, repeat(KEY_VOLUMEDOWN)},
        {"hold start volume up", kHold, 1, 3, repeat(KEY_VOLUMEUP)},
        {"hold start without region", kHold, 1, 0, kNothing},
        {"hold change onto volume up", kHold, 2, 3, repeat(KEY_VOLUMEUP)},
        {"hold change onto play/pause", kHold, 2, 1, kStop},
        {"hold change off every region", kHold, 2, 0, kStop},
        {"hold end on volume", kHold, 4, 3, kStop},
        {"cancel", 0, 8, 0, kStop},
        {"may-begin", 0, 128, 1, kNothing},
        {"unknown hold phase", kHold, 16, 3, kNothing},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(keyCommandForEvent(*digitizerEvent(row.mask, row.phase, row.region), kHoldKey), row.expected)
            << row.gesture;
    }
    // The hold key is configurable, and only the digitizer's events count.
    EXPECT_EQ(keyCommandForEvent(*digitizerEvent(kHold, 1, 1), KEY_MUTE), press(KEY_MUTE));
    EXPECT_EQ(keyCommandForEvent(*digitizerEvent(kHold, 1, 1)), press(KEY_VOICECOMMAND));
    EXPECT_EQ(keyCommandForEvent(*HIDEvent::createVendorDefinedEvent(0, 0xFF60, 2, 0, nullptr, 0, 0)), kNothing);
}

TEST(KeyRepeatSchedule, RepeatsAtASteadyRateUntilStoppedOrSwitched) {
    KeyRepeatSchedule schedule(250ms);
    const auto start = KeyRepeatSchedule::Clock::time_point{} + 10s;
    EXPECT_FALSE(schedule.nextDue());
    EXPECT_EQ(schedule.apply(repeat(KEY_VOLUMEUP), start), std::vector<unsigned>{KEY_VOLUMEUP});
    EXPECT_EQ(schedule.nextDue(), start + 250ms);
    EXPECT_FALSE(schedule.keyDue(start + 249ms));
    EXPECT_EQ(schedule.keyDue(start + 250ms), KEY_VOLUMEUP);
    EXPECT_FALSE(schedule.keyDue(start + 260ms));
    EXPECT_EQ(schedule.keyDue(start + 510ms), KEY_VOLUMEUP);  // a little late: the rate holds
    EXPECT_EQ(schedule.nextDue(), start + 750ms);
    EXPECT_EQ(schedule.apply(press(KEY_PLAYPAUSE), start + 600ms), std::vector<unsigned>{KEY_PLAYPAUSE});
    EXPECT_EQ(schedule.nextDue(), start + 750ms);  // a press leaves the repetition alone
    EXPECT_EQ(schedule.keyDue(start + 2s), KEY_VOLUMEUP);  // a stalled caller gets one press, not a burst
    EXPECT_FALSE(schedule.keyDue(start + 2s));
    EXPECT_EQ(schedule.nextDue(), start + 2250ms);
    EXPECT_TRUE(schedule.apply(kStop, start + 2100ms).empty());
    EXPECT_FALSE(schedule.keyDue(start + 3s));
    EXPECT_FALSE(schedule.nextDue());
    EXPECT_TRUE(schedule.apply(kNothing, start + 3s).empty());

    // A hold change switches the key and restarts the rate.
    schedule.apply(repeat(KEY_VOLUMEDOWN), start + 4s);
    EXPECT_EQ(schedule.apply(repeat(KEY_VOLUMEUP), start + 4150ms), std::vector<unsigned>{KEY_VOLUMEUP});
    EXPECT_FALSE(schedule.keyDue(start + 4250ms));
    EXPECT_EQ(schedule.keyDue(start + 4400ms), KEY_VOLUMEUP);
}

std::string keyboardFailure(const std::string& uinputPath) {
    try {
        const unsigned keys[] = {KEY_PLAYPAUSE, KEY_VOLUMEUP};
        Tools::UinputKeySender sender(keys, uinputPath);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "made a keyboard";
}

TEST(UinputKeySender, SomethingThatIsNotUinputRefusesTheKeyboard) {
    const Testing::TemporaryDirectory folder;
    const std::string notUinput = folder.write("not-uinput", "");
    EXPECT_EQ(keyboardFailure(notUinput),
              "Cannot create a virtual keyboard through " + notUinput + ": Inappropriate ioctl for device");
}

TEST(UinputKeySender, AnUnwritableUinputDeviceSaysHowToGetAccess) {
    if (::geteuid() == 0) GTEST_SKIP() << "root may write anything";
    const Testing::TemporaryDirectory folder;
    const std::string path = folder.write("readonly-uinput", "");
    ::chmod(path.c_str(), 0444);
    EXPECT_EQ(keyboardFailure(path), path + " is not writable: the udev rule 70-zelto-touch.rules gives the zelto-touch "
                                            "group write access; add your user to that group or run as root");
}

TEST(UinputKeySender, KeysAreNamedByNameOrNumber) {
    EXPECT_EQ(Tools::keyCodeFromName("KEY_VOICECOMMAND"), KEY_VOICECOMMAND);
    EXPECT_EQ(Tools::keyCodeFromName("KEY_MUTE"), KEY_MUTE);
    EXPECT_EQ(Tools::keyCodeFromName("164"), KEY_PLAYPAUSE);
    for (const char* bad : {"", "KEY_NOPE", "key_mute", "0", "99999", "REL_X", "12abc"}) {
        EXPECT_FALSE(Tools::keyCodeFromName(bad)) << bad;
    }
    EXPECT_EQ(Tools::keyName(KEY_VOLUMEUP), "KEY_VOLUMEUP");
}

}  // namespace
}  // namespace ZeltoTouch::Platform
